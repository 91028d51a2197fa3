// One -f argument taken apart: NAME[:param=value[,param=value...]].
#ifndef TOV_TOOLS_STAGE_H
#define TOV_TOOLS_STAGE_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace tool {

struct Assignment {
    std::string parameter;
    std::string value;
};

struct PixelSize {
    uint32_t width = 0;
    uint32_t height = 0;
    bool operator==(const PixelSize&) const = default;
};

// The only filter whose output may have another size than its input.
inline constexpr std::string_view kResampleFilter = "resample";

struct Stage {
    std::string filter;
    std::vector<Assignment> assignments;
    std::optional<PixelSize> size = {};  // of the output of a resample stage; none: that of its input

    bool sets(std::string_view parameter) const noexcept;
};

// Splits only; whether the names exist is decided elsewhere. Throws a usage failure for what cannot be split: an empty
// name or value, a missing '=', a parameter given twice.
Stage parseStage(std::string_view text);

// "1920x1080". Throws a usage failure that begins with `what` for anything else, for zero, and for more pixels than an
// image can have.
PixelSize parsePixelSize(std::string_view text, const std::string& what);

// "1920 x 1080"
std::string describe(const PixelSize& size);

}  // namespace tool

#endif
