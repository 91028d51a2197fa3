// The edge-avoiding a-trous filter in double, tap by tap from its formulas.
#pragma once

#include "picture.h"

namespace denoisetest {

struct WaveletInputs {
    const apitest::Picture* normal = nullptr;  // absent images read as zeros
    const apitest::Picture* depth = nullptr;
    const apitest::Picture* transition = nullptr;
    const apitest::Picture* variance = nullptr;
    double colorSigma = 0.1;
    double normalSigma = 0.1;
    double depthSigma = 0.1;
    double transSigma = 0.1;
};

// Five levels for usable pixels; what a level writes is rounded to the input's layout, as on the device.
apitest::Picture waveletReference(const apitest::Picture& color, const WaveletInputs& inputs);

}  // namespace denoisetest
