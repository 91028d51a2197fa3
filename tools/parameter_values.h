// Setting a filter's parameters from the texts of the command line.
#ifndef TOV_TOOLS_PARAMETER_VALUES_H
#define TOV_TOOLS_PARAMETER_VALUES_H

#include <vector>

#include "handle.h"
#include "stage.h"

namespace tool {

// Arrays belong to the caller of the library and must outlive the filter's runs.
using FloatArrays = std::vector<std::vector<float>>;

// Sets every assignment of the stage. Throws a usage failure that names the valid parameters or values.
void setParameters(tov_image_filter filter, const Stage& stage, FloatArrays& arrays);

}  // namespace tool

#endif
