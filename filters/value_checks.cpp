#include "filters/value_checks.h"

#include <cmath>
#include <cstring>
#include <string>

#include "core/exception.h"
#include "core/image_filter.h"  // upward: the values are a filter's
#include "kernelgen/option_text.h"
#include "zor/device_cl.h"

namespace {

constexpr uint64_t kMathTestBytes = 5 * sizeof(float);
constexpr uint64_t kRegressionGroup = 64;

[[noreturn]] void refuseValue(const TovFilterParameter& parameter, const std::string& value, const std::string& rule) {
    refuse(TOV_ERROR_INVALID_PARAMETER, std::string(parameter.name()) + " is " + value + ": it must be " + rule);
}

// The float values of a parameter, whatever form it has.
struct Floats {
    const float* first;
    size_t count;
};
Floats floatsOf(const TovFilterParameter& parameter) {
    switch (parameter.type()) {
        case TOV_PARAMETER_TYPE_FLOAT1:
            return {static_cast<const float*>(parameter.value()), 1};
        case TOV_PARAMETER_TYPE_FLOAT16:
            return {parameter.asMatrix().data(), parameter.asMatrix().size()};
        case TOV_PARAMETER_TYPE_FLOAT_ARRAY:
            return {parameter.asFloatArray(), parameter.count()};
        default:
            return {nullptr, 0};
    }
}

void requireFinite(const TovFilterParameter& parameter) {
    const Floats floats = floatsOf(parameter);
    for (size_t i = 0; i < floats.count; ++i)
        if (!std::isfinite(floats.first[i])) refuseValue(parameter, sixDigits(floats.first[i]), "a finite number");
}

void applyRule(const ValueRule& rule, const TovFilterParameter& parameter) {
    if (rule.kind == ValueRule::Range) {
        const uint32_t value = parameter.asUint();
        if (value < rule.least || value > rule.most)
            refuseValue(parameter, decimal(value), decimal(rule.least) + " to " + decimal(rule.most));
        return;
    }
    const Floats floats = floatsOf(parameter);
    for (size_t i = 0; i < floats.count; ++i) {
        const float value = floats.first[i];
        if (rule.kind == ValueRule::NonZero && value == 0.0f) refuseValue(parameter, "0", "another number than 0");
        if (rule.kind == ValueRule::Positive && !(value > 0.0f))
            refuseValue(parameter, sixDigits(value), "greater than 0");
    }
}

void requireCounts(TovImageFilter& filter) {
    const TovFilterParameter* inputsNum = filter.find("inputsNum");
    if (inputsNum == nullptr) return;
    for (size_t i = 0; i < filter.parameterCount(); ++i) {
        const TovFilterParameter& array = filter.parameter(i);
        const bool isArray =
            array.type() == TOV_PARAMETER_TYPE_FLOAT_ARRAY || array.type() == TOV_PARAMETER_TYPE_IMAGE_ARRAY;
        if (isArray && array.count() != inputsNum->asUint())
            refuse(TOV_ERROR_INVALID_PARAMETER, std::string(array.name()) + " has " + decimal(array.count()) +
                                                    " elements, inputsNum is " + decimal(inputsNum->asUint()));
    }
}

}  // namespace

void checkValues(TovImageFilter& filter) {
    requireCounts(filter);
    for (size_t i = 0; i < filter.parameterCount(); ++i) requireFinite(filter.parameter(i));
    for (const ValueRule& rule : filter.spec().rules) applyRule(rule, *filter.find(rule.parameter));
    if (filter.spec().check != nullptr) filter.spec().check(filter);
}

void checkMathTestBuffers(TovImageFilter& filter) {
    for (const char* name : {"srcBuffer", "dstBuffer"}) {
        const TovImage* image = filter.find(name)->boundImage();
        if (image == nullptr || image->isOpenClImage() || !image->hasStorage() ||
            image->storage()->size() < kMathTestBytes)
            refuse(TOV_ERROR_INVALID_PARAMETER,
                   std::string(name) + " of the self-test must be a buffer of at least 20 bytes");
    }
}

void checkBlurSigma(TovImageFilter& filter) {
    const TovFilterParameter& sigma = *filter.find("sigma");
    const float denominator = 2.0f * sigma.asFloat() * sigma.asFloat();
    if (!(denominator > 0.0f)) refuseValue(sigma, sixDigits(sigma.asFloat()), "farther from 0");
}

void checkDragoLuminances(TovImageFilter& filter) {
    const float maximum = filter.find("maxLum")->asFloat();
    const float ratio = maximum / filter.find("avLum")->asFloat();
    if (!std::isfinite(ratio) || !(std::log10(ratio + 1.0f) > 0.0f))
        refuse(TOV_ERROR_INVALID_PARAMETER, "maxLum / avLum is " + sixDigits(ratio) +
                                                ": the maximum luminance must be of the average's order or above it");
}

void checkBuffersOnly(TovImageFilter& filter) {
    for (const char* name : {"srcBuffer", "dstBuffer"}) {
        const TovImage* image = filter.find(name)->boundImage();
        if (image != nullptr && image->isOpenClImage())
            refuse(TOV_ERROR_UNSUPPORTED, std::string(name) + " of this filter must be a buffer, not an OpenCL image");
    }
}

void checkAntialiasingImages(TovImageFilter& filter) {
    checkBuffersOnly(filter);
    const TovImage* input = filter.find("srcBuffer")->boundImage();
    if (input == nullptr) return;  // an unbound image is refused with the images
    if (input->desc().num_components != 4 || input->desc().type == TOV_COMPONENT_TYPE_UINT8)
        refuse(TOV_ERROR_INTERNAL_ERROR, "The input of antialiasing must have four components of half or float");
    // The middle pass knows the picture by this size alone.
    const Size size = filter.find("srcBufferSize")->asSize();
    if (size[0] != input->width() || size[1] != input->height())
        refuse(TOV_ERROR_INVALID_PARAMETER, "srcRec of antialiasing must be the size of the input");
}

void checkWaveletImages(TovImageFilter& filter) {
    checkBuffersOnly(filter);
    const TovImage* input = filter.find("srcBuffer")->boundImage();
    const TovImage* output = filter.find("dstBuffer")->boundImage();
    if (input == nullptr || output == nullptr) return;  // an unbound image is refused with the images
    if (input->desc().type != output->desc().type || input->desc().num_components != output->desc().num_components)
        refuse(TOV_ERROR_INVALID_OPERATION, "Input and output of this filter must have one component type and count");
}

void checkRegressionGroup(TovImageFilter& filter) {
    const auto* device = dynamic_cast<const zor::DeviceCL*>(filter.device().get());
    if (device == nullptr || device->maxWorkItemSize(0) < 8 || device->maxWorkItemSize(1) < 8 ||
        device->maxWorkGroupSize() < kRegressionGroup)
        refuse(TOV_ERROR_INTERNAL_ERROR, "The regression filter needs a device that runs groups of 8 x 8 items");
}
