#include "filters/define.h"

#include <cmath>
#include <utility>
#include <vector>

#include "core/exception.h"
#include "core/image.h"
#include "kernelgen/option_text.h"

namespace {

std::string imageDefines(const std::string& name, const TovFilterParameter& parameter, uint32_t element) {
    if (const auto& size = parameter.runSize()) return computedImageDefines(name, (*size)[0], (*size)[1]);
    TovObject* bound = parameter.boundObject(element);
    if (bound == nullptr) return absentImageDefines(name);
    if (const auto* image = as<TovImage>(bound)) return GetImageDefines(name, image->desc(), image->isOpenClImage());
    return {};  // a filter: the fused kernel carries its own definitions
}

uint32_t quotient(uint32_t source, uint32_t destination) {
    if (destination == 0) refuse(TOV_ERROR_INVALID_PARAMETER, "The destination has a width or height of 0");
    return source / destination;
}

}  // namespace

TovDefine::TovDefine(std::string name, const TovFilterParameter& parameter)
    : name_(std::move(name)), parameter_(&parameter) {}

std::string TovDefine::GetText() const {
    std::string text;
    switch (parameter_->type()) {
        case TOV_PARAMETER_TYPE_FLOAT1:
            return ::define(name_, sixDigits(parameter_->asFloat()));
        case TOV_PARAMETER_TYPE_UINT1:
            return ::define(name_, decimal(parameter_->asUint()));
        case TOV_PARAMETER_TYPE_IMAGE:
            return imageDefines(name_, *parameter_, 0);
        case TOV_PARAMETER_TYPE_IMAGE_ARRAY:
            for (uint32_t i = 0; i < parameter_->imageCount(); ++i)
                text += imageDefines(name_ + decimal(i), *parameter_, i);
            return text;
        default:
            throw TovException{TOV_ERROR_INVALID_PARAMETER};
    }
}

GaussianCoeffsGenerator::GaussianCoeffsGenerator(const TovFilterParameter& sigma, const TovFilterParameter& radius)
    : TovDefine("", sigma), radius_(&radius) {}

std::string GaussianCoeffsGenerator::GetText() const {
    radius_->requireType(TOV_PARAMETER_TYPE_UINT1, TOV_ERROR_INVALID_PARAMETER);
    parameter_->requireType(TOV_PARAMETER_TYPE_FLOAT1, TOV_ERROR_INVALID_PARAMETER);
    const auto radius = static_cast<int64_t>(radius_->asUint());
    const float denominator = 2.0f * parameter_->asFloat() * parameter_->asFloat();
    std::vector<float> weights;
    weights.reserve(2 * static_cast<size_t>(radius) + 1);
    float sum = 0.0f;
    for (int64_t i = -radius; i <= radius; ++i) {
        weights.push_back(std::exp(-static_cast<float>(i * i) / denominator));
        sum += weights.back();
    }
    std::string text = " -D COEFFS={";
    for (size_t i = 0; i < weights.size(); ++i) {
        text += fixedSixDigits(weights[i] / sum);
        text += i + 1 < weights.size() ? "f," : "f}";
    }
    return text;
}

RatioToDefConverter::RatioToDefConverter(const TovFilterParameter& sourceSize,
                                         const TovFilterParameter& destinationSize)
    : TovDefine("", sourceSize), destinationSize_(&destinationSize) {}

std::string RatioToDefConverter::GetText() const {
    parameter_->requireType(TOV_PARAMETER_TYPE_UINT2, TOV_ERROR_INVALID_PARAMETER);
    destinationSize_->requireType(TOV_PARAMETER_TYPE_UINT2, TOV_ERROR_INVALID_PARAMETER);
    const Size source = parameter_->asSize();
    const Size destination = destinationSize_->asSize();
    return ::define("CRATIO_X", decimal(quotient(source[0], destination[0]))) +
           ::define("CRATIO_Y", decimal(quotient(source[1], destination[1])));
}
