// Command queues: attaching, detaching, executing.
#include "core/queue.h"

#include "api/guard.h"
#include "api/tov/tov.h"
#include "core/image_filter.h"

namespace {

void bind(tov_image_filter filter, const char* name, tov_image image) {
    const int32_t code = tovImageFilterSetParameterImage(filter, name, image);
    require(code == TOV_SUCCESS, code);
}

bool areCompatible(const TovImageFilter& filter, tov_image input, tov_image output) {
    const auto* inputImage = as<TovImage>(registry::lookUp(input));
    const auto* outputImage = as<TovImage>(registry::lookUp(output));
    return inputImage == nullptr || outputImage == nullptr || filter.isCompatible(*inputImage, *outputImage);
}

}  // namespace

int32_t tovContextCreateCommandQueue(tov_context context, tov_command_queue* outQueue) {
    return guarded([&] {
        const TovContext& owner = require<TovContext>(context);
        require(outQueue != nullptr, TOV_ERROR_INVALID_PARAMETER);
        require(owner.device() != nullptr, TOV_ERROR_INVALID_CONTEXT);
        handOut(std::make_unique<TovQueue>(owner.device()), outQueue);
    });
}

int32_t tovCommandQueueAttachImageFilter(tov_command_queue queue, tov_image_filter filter, tov_image input,
                                         tov_image output) {
    return guarded([&] {
        TovQueue& target = require<TovQueue>(queue);
        TovImageFilter& attached = require<TovImageFilter>(filter);
        bind(filter, "srcBuffer", input);
        bind(filter, "dstBuffer", output);
        require(areCompatible(attached, input, output), TOV_ERROR_INVALID_OPERATION);
        target.attach(attached);
    });
}

int32_t tovCommandQueueDetachImageFilter(tov_command_queue queue, tov_image_filter filter) {
    return guarded([&] {
        TovQueue& target = require<TovQueue>(queue);
        target.detach(require<TovImageFilter>(filter));
    });
}

int32_t tovContextExecuteCommandQueue(tov_context context, tov_command_queue queue, tov_callback callback,
                                      void* userData) {
    return guarded([&] {
        require<TovContext>(context);
        require<TovQueue>(queue).execute();
        if (callback != nullptr) callback(userData);
    });
}
