// Images: creation, wrapping, queries, mapping.
#include "core/image.h"

#include "api/guard.h"
#include "api/tov/tov.h"
#include "core/opengl.h"

static_assert(sizeof(tov_image_desc) == 28, "the descriptor is seven 32-bit fields without padding");

int32_t tovContextCreateImage(tov_context context, const tov_image_desc* desc, const void* data, tov_image* outImage) {
    return guarded([&] {
        const TovContext& owner = requireContext(context);
        require(outImage != nullptr, TOV_ERROR_INVALID_PARAMETER);
        require(desc != nullptr, TOV_ERROR_INVALID_IMAGE_DESC);
        auto image = std::make_unique<TovImage>(owner.device(), *desc);
        // Whatever stops the upload, the host learns that there is no image.
        require(guarded([&] { image->initialize(data); }) == TOV_SUCCESS, TOV_ERROR_INTERNAL_ERROR);
        handOut(std::move(image), outImage);
    });
}

int32_t tovContextCreateImageFromOpenClMemory(tov_context context, const tov_image_desc* desc, struct _cl_mem* memory,
                                              uint8_t isImage, tov_image* outImage) {
    return guarded([&] {
        const TovContext& owner = require<TovContext>(context);
        require(desc != nullptr && memory != nullptr && outImage != nullptr, TOV_ERROR_INVALID_PARAMETER);
        require(owner.device() != nullptr, TOV_ERROR_INVALID_CONTEXT);
        auto image = std::make_unique<TovImage>(owner.device(), *desc);
        image->wrapOpenClMemory(memory, isImage != 0);
        handOut(std::move(image), outImage);
    });
}

int tovContextCreateImageFromOpenGlTexture(tov_context context, unsigned int glTarget, int mipLevel,
                                           unsigned int glTexture, tov_image* outImage) {
    return guarded([&] {
        const TovContext& owner = require<TovContext>(context);
        require(outImage != nullptr, TOV_ERROR_INVALID_PARAMETER);
        require(owner.device() != nullptr, TOV_ERROR_INVALID_CONTEXT);
        auto image = std::make_unique<TovImage>(owner.device(), describeTexture(glTarget, mipLevel, glTexture));
        image->wrapOpenGlTexture(glTarget, mipLevel, glTexture);
        handOut(std::move(image), outImage);
    });
}

int32_t tovImageGetInfo(tov_image image, uint32_t key, uint64_t size, void* out, uint64_t* outSize) {
    return guarded([&] {
        const TovImage& source = require<TovImage>(image);
        requireQuery(out, size, outSize);
        switch (key) {
            case TOV_IMAGE_DESC:
                return answer(source.desc(), size, out, outSize);
            case TOV_IMAGE_DATA_SIZE:
                return answer(uint64_t{source.getByteSize()}, size, out, outSize);
            default:
                throw TovException{TOV_ERROR_UNSUPPORTED};
        }
    });
}

int32_t tovImageMap(tov_image image, uint32_t /*mapFlags*/, void** outPointer) {
    return guarded([&] {
        TovImage& target = require<TovImage>(image);
        require(outPointer != nullptr, TOV_ERROR_INVALID_PARAMETER);
        *outPointer = target.map();
    });
}

int32_t tovImageUnmap(tov_image image, void* pointer) {
    return guarded([&] {
        TovImage& target = require<TovImage>(image);
        require(pointer != nullptr, TOV_ERROR_INVALID_PARAMETER);
        target.unmap(pointer);
    });
}
