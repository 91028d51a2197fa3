// Running filters one after another over a picture.
#ifndef TOV_TOOLS_PIPELINE_H
#define TOV_TOOLS_PIPELINE_H

#include <string>
#include <vector>

#include "auxiliary_images.h"
#include "handle.h"
#include "parameter_values.h"
#include "picture.h"
#include "stage.h"
#include "streams.h"

namespace tool {

struct PreparedStage {
    Stage stage;
    ParameterData data;                          // before the filter, which refers to it
    std::vector<std::vector<tov_image>> images;  // for each of data.images; null: the stage's input
    Handle filter;
};

// Creates the filters and sets their parameters; wrong names and values are usage failures.
std::vector<PreparedStage> prepareStages(tov_context context, const std::vector<Stage>& stages);

// Reads what the stages want beside their input; `size` and `name` are those of the picture. Throws as
// AuxiliaryImages::get.
void readImages(std::vector<PreparedStage>& stages, AuxiliaryImages& auxiliary, PixelSize size,
                const std::string& name);

// Replaces the picture's pixels by the last stage's output; with `fuse`, neighbouring stages that can be are computed
// by one kernel. Throws kFailed.
void runStages(Streams& streams, tov_context context, std::vector<PreparedStage>& stages, bool fuse, Picture& picture);

}  // namespace tool

#endif
