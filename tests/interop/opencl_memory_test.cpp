// The host's OpenCL buffers and images as images of the library, on the real device.
#include <gmock/gmock.h>

#include "fixture.h"
#include "zor/opencl.h"

namespace apitest {
namespace {

// A host with an OpenCL context, device and queue of its own.
class HostMemory : public DeviceTest {
 protected:
    void SetUp() override {
        cl_platform_id platform = nullptr;
        cl_device_id device = nullptr;
        clGetPlatformIDs(1, &platform, nullptr);
        ASSERT_EQ(clGetDeviceIDs(platform, CL_DEVICE_TYPE_CPU, 1, &device, nullptr), CL_SUCCESS);
        for (zor::ContextHandle* context : {&cl_, &other_})
            context->reset(clCreateContext(nullptr, 1, &device, nullptr, nullptr, nullptr));
        queue_.reset(clCreateCommandQueue(cl_.get(), device, 0, nullptr));
        ASSERT_EQ(tovCreateContextFromOpenClContext(TOV_API_VERSION, cl_.get(), device, queue_.get(),
                                                    cacheDirectory().c_str(), owner_.out()),
                  TOV_SUCCESS);
    }
    void TearDown() override {
        owner_.remove();
        for (const zor::MemoryHandle& memory : memories_) {
            cl_uint count = 0;
            EXPECT_EQ(clGetMemObjectInfo(memory.get(), CL_MEM_REFERENCE_COUNT, sizeof count, &count, nullptr), 0);
            EXPECT_EQ(count, 1u) << "the library keeps no reference, and releases none";
        }
        EXPECT_EQ(clFinish(queue_.get()), CL_SUCCESS) << "the host's queue is untouched";
    }

    cl_mem buffer(size_t bytes, cl_mem_flags flags = CL_MEM_READ_WRITE, cl_context owner = nullptr) {
        owner = owner != nullptr ? owner : cl_.get();
        return memories_.emplace_back(clCreateBuffer(owner, flags, bytes, nullptr, nullptr)).get();
    }
    cl_mem image2D(size_t width, size_t height, cl_channel_type type = CL_FLOAT, cl_mem_flags flags = 0) {
        const cl_image_format format = {CL_RGBA, type};
        const cl_image_desc desc = {CL_MEM_OBJECT_IMAGE2D, width, height, 0, 0, 0, 0, 0, 0, nullptr};
        return memories_.emplace_back(clCreateImage(cl_.get(), flags, &format, &desc, nullptr, nullptr)).get();
    }
    Handle wrapped(cl_mem memory, const tov_image_desc& desc, uint8_t isImage, int32_t expected = TOV_SUCCESS) {
        Handle image;
        EXPECT_EQ(tovContextCreateImageFromOpenClMemory(owner_, &desc, memory, isImage, image.out()), expected);
        return image;
    }
    int32_t executeHere(uint32_t type, const Parameters& parameters, tov_image input, tov_image output) {
        return execute(newFilter(type, parameters, owner_), input, output);
    }
    zor::ContextHandle cl_, other_;
    zor::QueueHandle queue_;
    std::vector<zor::MemoryHandle> memories_;
    Handle owner_;
};

TEST_F(HostMemory, ImagesGiveThePictureOfBuffersAlsoInPlace) {
    const Picture picture = noise(21, 11);
    Picture found = picture;
    const size_t box[] = {0, 0, 0, 21, 11, 1};
    const cl_mem source = image2D(21, 11), destination = image2D(21, 11);
    const Handle input = wrapped(source, picture.desc(), 1);
    const Handle output = wrapped(destination, picture.desc(), 1);
    const std::pair<uint32_t, Parameters> filters[] = {
        {TOV_IMAGE_FILTER_SOBEL, {}},
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"radius", 3u}, {"sigma", 1.5f}, {"tiling", 1u}}},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE, {{"radius", 2u}}}};
    for (const auto& [type, parameters] : filters) {
        const Picture expected = run(type, picture, parameters);
        ASSERT_EQ(executeHere(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, newImage(picture, owner_), input), 0) << "a copy";
        for (const auto& [target, memory] : {std::pair{tov_image{output}, destination}, {tov_image{input}, source}}) {
            ASSERT_EQ(executeHere(type, parameters, input, target), TOV_SUCCESS) << type;
            clEnqueueReadImage(queue_.get(), memory, 1, box, box + 3, 0, 0, found.values.data(), 0, nullptr, nullptr);
            // Compiled apart, relaxed mathematics rounds differently.
            EXPECT_LE(maxDifference(found, expected), 1e-6) << type;
        }
    }
}

TEST_F(HostMemory, IsRefusedWhereItDoesNotFitItsDescriptorOrItsUse) {
    const tov_image_desc desc = {16, 16, 1, 0, 0, 4, TOV_COMPONENT_TYPE_UINT8};  // 1024 bytes
    const Handle exact = wrapped(buffer(1024), desc, 0), image = wrapped(image2D(16, 16), desc, 1);
    for (cl_mem memory : {buffer(1024, 0, other_.get()), buffer(1000), buffer(1024, CL_MEM_READ_ONLY), image2D(16, 16)})
        wrapped(memory, desc, 0, TOV_ERROR_INVALID_PARAMETER);
    for (cl_mem memory : {buffer(1024), image2D(17, 16), image2D(16, 15), image2D(16, 16, CL_UNSIGNED_INT8),
                          image2D(16, 16, CL_FLOAT, CL_MEM_WRITE_ONLY)})
        wrapped(memory, desc, 1, TOV_ERROR_INVALID_PARAMETER);
    void* pointer = nullptr;
    EXPECT_EQ(tovImageMap(image, 0, &pointer), TOV_ERROR_UNSUPPORTED);
    EXPECT_EQ(executeHere(TOV_IMAGE_FILTER_MLAA, {}, image, exact), TOV_ERROR_UNSUPPORTED);
}

TEST_F(HostMemory, WrappedTwiceInWholeOrInPartIsOneMemory) {
    const Picture bytes = noise(16, 8, {3, TOV_COMPONENT_TYPE_UINT8});  // whose pixels the wider output overtakes
    Picture floats(16, 8);
    const Picture expected = run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, bytes, {}, floats);
    const cl_mem whole = buffer(4096);
    const cl_buffer_region region = {256, 2048};
    const zor::MemoryHandle part(clCreateSubBuffer(whole, 0, CL_BUFFER_CREATE_TYPE_REGION, &region, nullptr));
    for (cl_mem second : {whole, part.get()}) {
        const Handle narrow = wrapped(whole, bytes.desc(), 0);
        const Handle wide = wrapped(second, floats.desc(), 0);
        EXPECT_EQ(executeHere(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, newImage(bytes, owner_), narrow), TOV_SUCCESS);
        EXPECT_EQ(executeHere(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, narrow, wide), TOV_SUCCESS);
        clEnqueueReadBuffer(queue_.get(), second, 1, 0, 2048, floats.values.data(), 0, nullptr, nullptr);
        EXPECT_EQ(maxDifference(floats, expected), 0);
        const Handle input = newImage(floats, owner_);
        const Parameters outputs = {{"positionsImg", tov_image{input}}, {"outVarianceImg", tov_image{narrow}}};
        EXPECT_EQ(executeHere(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, outputs, input, wide),
                  TOV_ERROR_INVALID_PARAMETER);
    }
}

}  // namespace
}  // namespace apitest
