#include "zor/image.h"

#include "zor/device_cl.h"

namespace zor {

namespace {

template <class Value>
Value imageInfo(cl_mem image, cl_image_info key) {
    Value value{};
    check(cl().clGetImageInfo(image, key, sizeof value, &value, nullptr), "clGetImageInfo");
    return value;
}

}  // namespace

MemoryHandle createImageLike(Device& device, cl_mem image) {
    const auto format = imageInfo<cl_image_format>(image, CL_IMAGE_FORMAT);
    cl_image_desc desc = {};
    desc.image_type = CL_MEM_OBJECT_IMAGE2D;
    desc.image_width = imageInfo<size_t>(image, CL_IMAGE_WIDTH);
    desc.image_height = imageInfo<size_t>(image, CL_IMAGE_HEIGHT);
    int32_t status = CL_SUCCESS;
    MemoryHandle copy(cl().clCreateImage(device.getContext(), CL_MEM_READ_WRITE, &format, &desc, nullptr, &status));
    check(status, "clCreateImage");
    return copy;
}

void copyImage(Device& device, cl_mem from, cl_mem to) {
    const size_t origin[3] = {0, 0, 0};
    const size_t region[3] = {imageInfo<size_t>(from, CL_IMAGE_WIDTH), imageInfo<size_t>(from, CL_IMAGE_HEIGHT), 1};
    auto* const queue = requireOpenCL(device, "copyImage").queue();
    check(cl().clEnqueueCopyImage(queue, from, to, &origin[0], &origin[0], &region[0], 0, nullptr, nullptr),
          "clEnqueueCopyImage");
    device.finish();
}

}  // namespace zor
