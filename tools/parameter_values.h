// Setting a filter's parameters from the texts of the command line.
#ifndef TOV_TOOLS_PARAMETER_VALUES_H
#define TOV_TOOLS_PARAMETER_VALUES_H

#include <string>
#include <string_view>
#include <vector>

#include "handle.h"
#include "stage.h"

namespace tool {

// Arrays belong to the caller of the library and must outlive the filter's runs.
using FloatArrays = std::vector<std::vector<float>>;

// Pictures that a filter reads beside its input, still to be bound.
struct ImageAssignment {
    std::string parameter;
    bool array = false;
    std::vector<std::string> sources;  // files, layers of files, or kStageInput
};

// The picture that the stage itself is given.
inline constexpr std::string_view kStageInput = "@";

struct ParameterData {
    FloatArrays arrays;
    std::vector<ImageAssignment> images;
};

// Sets every assignment of the stage but its images, and the number of a list's inputs where only the list is given.
// Throws a usage failure that names the valid parameters or values.
ParameterData setParameters(tov_image_filter filter, const Stage& stage);

}  // namespace tool

#endif
