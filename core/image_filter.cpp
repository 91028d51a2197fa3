// Parameters and bindings of a filter. Its run is image_filter_run.cpp.
#include "core/image_filter.h"

#include <algorithm>
#include <cstring>
#include <set>

#include "core/exception.h"

namespace {

Size sizeOf(const TovImage& image) {
    return {image.width(), image.height()};
}

void requireElements(void* const* images, uint32_t count) {
    if (count > kMaxArrayElements)
        refuse(TOV_ERROR_INVALID_PARAMETER, "An image array has at most " + std::to_string(kMaxArrayElements) +
                                                " elements, not " + std::to_string(count));
    for (uint32_t i = 0; i < count; ++i) {
        if (images[i] == nullptr) continue;  // an absent image
        TovObject* object = registry::lookUp(images[i]);
        if (as<TovImage>(object) == nullptr && as<TovImageFilter>(object) == nullptr)
            throw TovException{TOV_ERROR_INVALID_PARAMETER};
    }
}

// The filters that a filter reads directly and that are still alive. Callers may have freed their arrays since the last
// run, so what they held when they were set counts; a run looks for circles once more.
std::vector<const TovImageFilter*> directInputs(const TovImageFilter& filter) {
    std::vector<const TovImageFilter*> inputs;
    for (const TovFilterParameter* parameter : filter.imageParameters())
        for (uint32_t i = 0; i < parameter->imageCount(); ++i)
            if (const auto* input = as<TovImageFilter>(parameter->objectWhenSet(i))) inputs.push_back(input);
    return inputs;
}

}  // namespace

TovImageFilter::TovImageFilter(TovContext& context, uint32_t filterType)
    : TovObject(kType),
      device_(context.device()),
      context_(&context),
      filterType_(filterType),
      spec_(filterSpec(filterType)) {
    imageParameters_ = {&srcBuffer_, &dstBuffer_};
    populate(*this);
}

TovFilterParameter& TovImageFilter::addParameter(const ParameterSpec& spec) {
    static constexpr Matrix kIdentity = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};
    auto parameter = std::make_unique<TovFilterParameter>(spec.type, spec.name, spec.description);
    if (spec.type == TOV_PARAMETER_TYPE_FLOAT1) parameter->set1f(spec.floatDefault);
    if (spec.type == TOV_PARAMETER_TYPE_UINT1) parameter->set1u(spec.uintDefault);
    if (spec.type == TOV_PARAMETER_TYPE_FLOAT16) parameter->set16f(kIdentity);
    if (parameter->isImageLike()) imageParameters_.push_back(parameter.get());
    parameters_.push_back(std::move(parameter));
    return *parameters_.back();
}

TovFilterPass& TovImageFilter::addPass(const char* sourceName, const char* kernelName, bool grid2D) {
    passes_.push_back(std::make_unique<TovFilterPass>(*context(), sourceName, kernelName, grid2D));
    return *passes_.back();
}

TovFilterParameter* TovImageFilter::find(std::string_view name) noexcept {
    for (TovFilterParameter* builtIn : {&srcBuffer_, &srcBufferSize_, &dstBuffer_, &dstBufferSize_})
        if (name == builtIn->name()) return builtIn;
    for (const auto& parameter : parameters_)
        if (name == parameter->name()) return parameter.get();
    return nullptr;
}

TovFilterParameter& TovImageFilter::byName(std::string_view name) {
    const auto parameter = std::find_if(parameters_.begin(), parameters_.end(),
                                        [&](const auto& candidate) { return name == candidate->name(); });
    if (parameter == parameters_.end()) throw TovException{TOV_ERROR_INVALID_PARAMETER_NAME};
    return **parameter;
}

void TovImageFilter::set2u(std::string_view name, const Size& value) {
    if (name == "srcRec") return srcBufferSize_.set2u(value);
    if (name == "dstRec") {
        explicitOutputSize_ = value;
        return dstBufferSize_.set2u(value);
    }
    byName(name).set2u(value);
}

void TovImageFilter::setFloatArray(std::string_view name, const float* values, uint32_t count) {
    byName(name).setFloatArray(values, count);
}

void TovImageFilter::setImage(std::string_view name, TovImage& image) {
    if (name == "srcBuffer") {
        srcBufferSize_.set2u(sizeOf(image));
        srcBuffer_.setImage(&image);
    } else if (name == "dstBuffer") {
        explicitOutputSize_.reset();
        dstBufferSize_.set2u(sizeOf(image));
        dstBuffer_.setImage(&image);
    } else {
        byName(name).setImage(&image);
    }
}

bool TovImageFilter::isFedBy(const TovImageFilter& filter) const {
    std::set<const TovImageFilter*> visited;
    std::vector<const TovImageFilter*> open = {this};
    while (!open.empty()) {
        const TovImageFilter* next = open.back();
        open.pop_back();
        if (next == &filter) return true;
        if (!visited.insert(next).second) continue;
        for (const TovImageFilter* input : directInputs(*next)) open.push_back(input);
    }
    return false;
}

void TovImageFilter::requireNoCircle(const TovImageFilter& input) const {
    if (input.isFedBy(*this)) refuse(TOV_ERROR_INVALID_PARAMETER, "A filter cannot be its own input");
}

void TovImageFilter::setFilterAsImage(std::string_view name, TovImageFilter& filter) {
    if (name == "dstBuffer") throw TovException{TOV_ERROR_INVALID_PARAMETER};
    TovFilterParameter& parameter = name == "srcBuffer" ? srcBuffer_ : byName(name);
    if (parameter.isImageLike()) requireNoCircle(filter);
    parameter.setImage(&filter);
}

void TovImageFilter::setImageArray(std::string_view name, void* const* images, uint32_t count) {
    requireElements(images, count);
    TovFilterParameter& parameter = byName(name);
    for (uint32_t i = 0; parameter.isImageLike() && i < count; ++i)
        if (const auto* filter = as<TovImageFilter>(registry::lookUp(images[i]))) requireNoCircle(*filter);
    parameter.setImageArray(images, count);
}

bool TovImageFilter::isCompatible(const TovImage& input, const TovImage& output) const noexcept {
    if (!spec_.inPlaceAllowed && &input == &output) return false;
    return spec_.anySizeAllowed || sameGeometry(input.desc(), output.desc());
}

void TovImageFilter::createStateBuffer(const void* data, uint64_t size) {
    stateBuffer_.reset();
    stateBufferSize_ = 0;
    if (size > UINT32_MAX)
        refuse(TOV_ERROR_INTERNAL_ERROR,
               "The filter's state would need " + std::to_string(size) + " bytes, 4 GiB or more");
    auto buffer = std::make_unique<zor::Buffer<char>>(*device_, size, zor::BUFFER_DEFAULT);
    if (!buffer->hasMemory()) throw TovException{TOV_ERROR_INTERNAL_ERROR};
    void* pointer = buffer->map();
    if (data != nullptr) {
        std::memcpy(pointer, data, size);
    } else {
        std::memset(pointer, 0, size);
    }
    buffer->unmap(pointer);
    stateBuffer_ = std::move(buffer);
    stateBufferSize_ = static_cast<uint32_t>(size);
}
