// Denoising without tuning: finds the layers, makes what is missing and chooses the settings.
#ifndef TOV_TOOLS_DENOISE_H
#define TOV_TOOLS_DENOISE_H

#include <cstdint>
#include <optional>
#include <string>

#include "picture.h"
#include "streams.h"
#include "tov/tov.h"

namespace tool {

enum class DenoiseMethod { kWavelet, kRegression };

// Sources are files or layers of files; empty ones are looked for among the layers of the picture's own file.
struct DenoiseOptions {
    std::string albedo = {};
    std::string normal = {};
    std::string depth = {};
    std::string variance = {};
    DenoiseMethod method = DenoiseMethod::kWavelet;
    std::optional<uint32_t> samples = {};  // per pixel, at least 2; for the regression
};

// A picture and what is known about it, all of one size.
struct DenoiseInputs {
    Picture color;
    std::optional<Picture> albedo = {};
    std::optional<Picture> normal = {};
    std::optional<Picture> depth = {};  // 0 where nothing was hit
    std::optional<Picture> variance = {};
};

// Reads them all. Throws kUnreadable; a usage failure where sizes differ.
DenoiseInputs readDenoiseInputs(const std::string& input, const DenoiseOptions& options);

// Replaces the colours, estimating the variance where it is missing; alpha stays. Throws kFailed.
void denoise(Streams& streams, tov_context context, DenoiseInputs& inputs, const DenoiseOptions& options);

}  // namespace tool

#endif
