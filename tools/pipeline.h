// Running filters one after another over a picture.
#ifndef TOV_TOOLS_PIPELINE_H
#define TOV_TOOLS_PIPELINE_H

#include <vector>

#include "handle.h"
#include "parameter_values.h"
#include "picture.h"
#include "stage.h"
#include "streams.h"

namespace tool {

struct PreparedStage {
    Stage stage;
    FloatArrays arrays;  // before the filter, which refers to them
    Handle filter;
};

// Creates the filters and sets their parameters; wrong names and values are usage failures.
std::vector<PreparedStage> prepareStages(tov_context context, const std::vector<Stage>& stages);

// Replaces the picture's pixels by the last stage's output. Throws kFailed.
void runStages(Streams& streams, tov_context context, const std::vector<PreparedStage>& stages, Picture& picture);

}  // namespace tool

#endif
