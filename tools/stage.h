// One -f argument taken apart: NAME[:param=value[,param=value...]].
#ifndef TOV_TOOLS_STAGE_H
#define TOV_TOOLS_STAGE_H

#include <string>
#include <string_view>
#include <vector>

namespace tool {

struct Assignment {
    std::string parameter;
    std::string value;
};

struct Stage {
    std::string filter;
    std::vector<Assignment> assignments;

    bool sets(std::string_view parameter) const noexcept;
};

// Splits only; whether the names exist is decided elsewhere. Throws a usage failure for what cannot be split: an empty
// name or value, a missing '=', a parameter given twice.
Stage parseStage(std::string_view text);

}  // namespace tool

#endif
