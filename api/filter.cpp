// Filters: creation, parameters, queries.
#include "api/guard.h"
#include "api/tov/tov.h"
#include "core/image_filter.h"

namespace {

// The checks that every setter begins with.
template <class Body>
int32_t setParameter(tov_image_filter filter, const char* name, Body&& body) noexcept {
    return guarded([&] {
        TovImageFilter& target = require<TovImageFilter>(filter);
        require(name != nullptr, TOV_ERROR_INVALID_PARAMETER_NAME);
        body(target);
    });
}

}  // namespace

int32_t tovContextCreateImageFilter(tov_context context, uint32_t filterType, tov_image_filter* outFilter) {
    return guarded([&] {
        TovContext& owner = requireContext(context);
        require(outFilter != nullptr, TOV_ERROR_INVALID_PARAMETER);
        handOut(std::make_unique<TovImageFilter>(owner, filterType), outFilter);
    });
}

int32_t tovImageFilterSetParameter1u(tov_image_filter filter, const char* name, uint32_t x) {
    return setParameter(filter, name, [&](TovImageFilter& target) { target.set1u(name, x); });
}

int32_t tovImageFilterSetParameter2u(tov_image_filter filter, const char* name, uint32_t x, uint32_t y) {
    return setParameter(filter, name, [&](TovImageFilter& target) { target.set2u(name, {x, y}); });
}

int32_t tovImageFilterSetParameter1f(tov_image_filter filter, const char* name, float x) {
    return setParameter(filter, name, [&](TovImageFilter& target) { target.set1f(name, x); });
}

int32_t tovImageFilterSetParameter3f(tov_image_filter filter, const char* name, float x, float y, float z) {
    return setParameter(filter, name, [&](TovImageFilter& target) { target.set3f(name, {x, y, z}); });
}

int32_t tovImageFilterSetParameter4f(tov_image_filter filter, const char* name, float x, float y, float z, float w) {
    return setParameter(filter, name, [&](TovImageFilter& target) { target.set4f(name, {x, y, z, w}); });
}

int32_t tovImageFilterSetParameter16f(tov_image_filter filter, const char* name, const float* matrix) {
    return setParameter(filter, name, [&](TovImageFilter& target) {
        require(matrix != nullptr, TOV_ERROR_INVALID_PARAMETER);
        Matrix copy;
        std::memcpy(copy.data(), matrix, sizeof copy);
        target.set16f(name, copy);
    });
}

int32_t tovImageFilterSetParameterImage(tov_image_filter filter, const char* name, tov_image image) {
    return setParameter(filter, name, [&](TovImageFilter& target) {
        TovObject* object = registry::lookUp(image);
        if (auto* input = as<TovImageFilter>(object)) return target.setFilterAsImage(name, *input);
        TovImage* source = as<TovImage>(object);
        require(source != nullptr, TovImage::kInvalidHandle);
        target.setImage(name, *source);
    });
}

int32_t tovImageFilterSetParameterFloatArray(tov_image_filter filter, const char* name, const float* values,
                                             uint32_t count) {
    return setParameter(filter, name, [&](TovImageFilter& target) {
        require(values != nullptr || count == 0, TOV_ERROR_INVALID_PARAMETER);
        target.setFloatArray(name, values, count);
    });
}

int32_t tovImageFilterSetParameterImageArray(tov_image_filter filter, const char* name, tov_image* images,
                                             uint32_t count) {
    return setParameter(filter, name, [&](TovImageFilter& target) {
        require(images != nullptr || count == 0, TOV_ERROR_INVALID_PARAMETER);
        target.setImageArray(name, images, count);
    });
}

int32_t tovImageFilterGetInfo(tov_image_filter filter, uint32_t key, uint64_t size, void* out, uint64_t* outSize) {
    return guarded([&] {
        const TovImageFilter& source = require<TovImageFilter>(filter);
        requireQuery(out, size, outSize);
        switch (key) {
            case TOV_IMAGE_FILTER_TYPE:
                return answer(source.filterType(), size, out, outSize);
            case TOV_IMAGE_FILTER_PARAMETER_COUNT:
                return answer(static_cast<uint32_t>(source.parameterCount()), size, out, outSize);
            case TOV_IMAGE_FILTER_DESCRIPTION:
                return answer(source.description(), size, out, outSize);
            default:
                throw TovException{TOV_ERROR_UNSUPPORTED};
        }
    });
}

int32_t tovParameterGetInfo(tov_image_filter filter, uint32_t parameterIndex, uint32_t key, uint64_t size, void* out,
                            uint64_t* outSize) {
    return guarded([&] {
        const TovImageFilter& source = require<TovImageFilter>(filter);
        requireQuery(out, size, outSize);
        require(parameterIndex < source.parameterCount(), TOV_ERROR_INVALID_PARAMETER);
        const TovFilterParameter& parameter = source.parameter(parameterIndex);
        switch (key) {
            case TOV_PARAMETER_NAME:
                return answer(parameter.name(), size, out, outSize);
            case TOV_PARAMETER_TYPE:
                return answer(parameter.type(), size, out, outSize);
            case TOV_PARAMETER_DESCRIPTION:
                return answer(parameter.description(), size, out, outSize);
            case TOV_PARAMETER_VALUE:
                return answer(parameter.value(), size, out, outSize);
            default:
                throw TovException{TOV_ERROR_UNSUPPORTED};
        }
    });
}
