// Checks of a filter's values when it runs. Each refuses with a line that says what was wrong and what is allowed.
#pragma once

#include <cstdint>

class TovImageFilter;

// Larger windows would hang the host or the device for minutes.
inline constexpr uint32_t kMaxBlurRadius = 4096;
inline constexpr uint32_t kMaxBilateralRadius = 256;
inline constexpr uint32_t kMaxRegressionHalfWindow = 256;

// Everything that the filter's row says of its values: finite numbers, its rules, array counts, its own check.
void checkValues(TovImageFilter& filter);

// ---- The rows' own checks ----

void checkMathTestBuffers(TovImageFilter& filter);     // input and output are buffers of five floats or more
void checkBlurSigma(TovImageFilter& filter);           // twice its square is a number that can divide
void checkDragoLuminances(TovImageFilter& filter);     // their ratio has a logarithm that can divide
void checkBuffersOnly(TovImageFilter& filter);         // input and output are no OpenCL images
void checkAntialiasingImages(TovImageFilter& filter);  // four halves or floats, at their own size
void checkWaveletImages(TovImageFilter& filter);       // nor of different component types or counts
void checkRegressionGroup(TovImageFilter& filter);     // the device runs groups of 8 x 8
