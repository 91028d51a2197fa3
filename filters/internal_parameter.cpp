#include "filters/internal_parameter.h"

#include <utility>

#include "core/exception.h"
#include "core/image.h"
#include "core/image_filter.h"  // upward: a filter may feed a filter, whose first pass then appends its own arguments
#include "filters/color_tools.h"
#include "kernelgen/pass.h"  // upward, likewise

namespace {

constexpr int32_t kAbsentImage = 0;

void setBuffer(zor::Launcher& launcher, const zor::BufferBase* buffer) {
    // An empty buffer must never stand in for memory that a kernel writes.
    if (buffer == nullptr || !buffer->hasMemory()) throw TovException{TOV_ERROR_INTERNAL_ERROR};
    launcher.arg(*buffer);
}

const zor::BufferBase* memoryOf(const TovFilterParameter& parameter, uint32_t element, const TovImage& image,
                                bool readBack) {
    const zor::BufferBase* standIn = readBack ? parameter.standIn(kReadBackElement) : parameter.standIn(element);
    return standIn != nullptr ? standIn : image.storage();
}

void setImage(zor::Launcher& launcher, const TovFilterParameter& parameter, uint32_t element, bool readBack) {
    TovObject* bound = parameter.boundObject(element);
    if (bound == nullptr) {
        launcher.arg(kAbsentImage);
    } else if (const auto* image = as<TovImage>(bound)) {
        setBuffer(launcher, memoryOf(parameter, element, *image, readBack));
    } else {
        as<TovImageFilter>(bound)->firstPass().SetArguments(launcher, true);
    }
}

}  // namespace

void TovInternalParameter::SetKernelArgument(zor::Launcher& launcher) {
    if (scratch_ != nullptr) return setBuffer(launcher, scratch_->buffer.get());
    if (state_ != nullptr) return setBuffer(launcher, state_->get());
    switch (parameter_->type()) {
        case TOV_PARAMETER_TYPE_FLOAT1:
            launcher.arg(parameter_->asFloat());
            break;
        case TOV_PARAMETER_TYPE_UINT1:
            launcher.arg(parameter_->asUint());
            break;
        case TOV_PARAMETER_TYPE_UINT2:
            launcher.arg(parameter_->asSize());
            break;
        case TOV_PARAMETER_TYPE_FLOAT_ARRAY:
            for (uint32_t i = 0; i < parameter_->count(); ++i) launcher.arg(parameter_->asFloatArray()[i]);
            break;
        case TOV_PARAMETER_TYPE_IMAGE:
        case TOV_PARAMETER_TYPE_IMAGE_ARRAY:
            for (uint32_t i = 0; i < parameter_->imageCount(); ++i) setImage(launcher, *parameter_, i, readBack_);
            break;
        default:
            break;  // vectors and matrices reach kernels through derived arguments only
    }
}

ColorSpaceConvertor::ColorSpaceConvertor(const TovFilterParameter& colorSpace, Direction direction) noexcept
    : TovInternalParameter(colorSpace), direction_(direction) {}

void ColorSpaceConvertor::SetKernelArgument(zor::Launcher& launcher) {
    parameter_->requireType(TOV_PARAMETER_TYPE_UINT1, TOV_ERROR_INVALID_PARAMETER);
    const uint32_t index = parameter_->asUint() - 1;
    const auto gamuts = ColorTools::gamuts();
    if (index >= gamuts.size())
        refuse(TOV_ERROR_INVALID_PARAMETER, std::string(parameter_->name()) + " is " +
                                                std::to_string(parameter_->asUint()) +
                                                ": colour spaces are 1 (sRGB) to 4 (DCI-P3)");
    ColorTools::Matrix3 m = ColorTools::rgbToXyz(gamuts[index]);
    if (direction_ == FROM_XYZ) m = ColorTools::inverse(m);
    launcher.arg(std::array<float, 12>{m[0], m[1], m[2], 0, m[3], m[4], m[5], 0, m[6], m[7], m[8], 0});
}

RatioConverter::RatioConverter(const TovFilterParameter& sourceSize, const TovFilterParameter& destinationSize) noexcept
    : TovInternalParameter(sourceSize), destinationSize_(&destinationSize) {}

void RatioConverter::SetKernelArgument(zor::Launcher& launcher) {
    parameter_->requireType(TOV_PARAMETER_TYPE_UINT2, TOV_ERROR_INVALID_PARAMETER);
    destinationSize_->requireType(TOV_PARAMETER_TYPE_UINT2, TOV_ERROR_INVALID_PARAMETER);
    const Size source = parameter_->asSize();
    const Size destination = destinationSize_->asSize();
    std::array<float, 2> ratio{};
    for (size_t i = 0; i < 2; ++i)
        if (destination[i] != 1) ratio[i] = static_cast<float>(source[i] - 1) / static_cast<float>(destination[i] - 1);
    launcher.arg(ratio);
}

void ViewProjectionSwapper::SetKernelArgument(zor::Launcher& launcher) {
    parameter_->requireType(TOV_PARAMETER_TYPE_FLOAT16, TOV_ERROR_INVALID_PARAMETER);
    launcher.arg(initialised_ ? previous_ : parameter_->asMatrix());
    launcher.arg(parameter_->asMatrix());
}

void ViewProjectionSwapper::filterHasRun() {
    previous_ = parameter_->asMatrix();
    initialised_ = true;
}
