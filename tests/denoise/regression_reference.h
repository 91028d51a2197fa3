// The local weighted regression filter in double, walk by walk from its formulas.
#pragma once

#include "picture.h"

namespace denoisetest {

struct RegressionInputs {
    const apitest::Picture* variance = nullptr;  // absent images read as zeros
    const apitest::Picture* transition = nullptr;
    const apitest::Picture* transitionVariance = nullptr;
    const apitest::Picture* normal = nullptr;
    const apitest::Picture* normalVariance = nullptr;
    const apitest::Picture* depth = nullptr;
    const apitest::Picture* depthVariance = nullptr;
    uint32_t samples = 4;
    uint32_t halfWindow = 4;
    double bandwidth = 1.0;
};

// For usable pixels. `fallbacks` counts the fits that gave a negative colour.
apitest::Picture regressionReference(const apitest::Picture& color, const RegressionInputs& inputs,
                                     uint32_t* fallbacks = nullptr);

}  // namespace denoisetest
