// The host's OpenCL buffers and images as images of the library, on the real device.
#include <gmock/gmock.h>

#include "../api/fixture.h"
#include "zor/opencl.h"

namespace apitest {
namespace {

// A host with an OpenCL context, device and queue of its own.
class HostMemory : public DeviceTest {
 protected:
    void SetUp() override {
        cl_platform_id platform = nullptr;
        cl_device_id device = nullptr;
        ASSERT_EQ(clGetPlatformIDs(1, &platform, nullptr), CL_SUCCESS);
        ASSERT_EQ(clGetDeviceIDs(platform, CL_DEVICE_TYPE_CPU, 1, &device, nullptr), CL_SUCCESS);
        cl_.reset(clCreateContext(nullptr, 1, &device, nullptr, nullptr, nullptr));
        other_.reset(clCreateContext(nullptr, 1, &device, nullptr, nullptr, nullptr));
        queue_.reset(clCreateCommandQueue(cl_.get(), device, 0, nullptr));
        const std::string cache = cacheDirectory();
        ASSERT_EQ(tovCreateContextFromOpenClContext(TOV_API_VERSION, cl_.get(), device, queue_.get(), cache.c_str(),
                                                    owner_.out()),
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

    cl_mem keep(cl_mem memory) { return memories_.emplace_back(memory).get(); }
    cl_mem buffer(size_t bytes, cl_mem_flags flags = CL_MEM_READ_WRITE) {
        return keep(clCreateBuffer(cl_.get(), flags, bytes, nullptr, nullptr));
    }
    cl_mem image2D(size_t width, size_t height, cl_channel_type type = CL_FLOAT, cl_mem_flags flags = 0) {
        const cl_image_format format = {CL_RGBA, type};
        const cl_image_desc desc = {CL_MEM_OBJECT_IMAGE2D, width, height, 0, 0, 0, 0, 0, 0, nullptr};
        return keep(clCreateImage(cl_.get(), flags, &format, &desc, nullptr, nullptr));
    }
    Handle wrapped(cl_mem memory, const tov_image_desc& desc, bool isImage, int32_t expected = TOV_SUCCESS) {
        Handle image;
        EXPECT_EQ(tovContextCreateImageFromOpenClMemory(owner_, &desc, memory, isImage ? 1 : 0, image.out()), expected);
        return image;
    }
    int32_t executeHere(uint32_t type, const Parameters& parameters, tov_image input, tov_image output) {
        return execute(newFilter(type, parameters, owner_), input, output);
    }
    Picture content(cl_mem image, Picture like) {
        const size_t box[] = {0, 0, 0, like.width, like.height, 1};
        float* const values = like.values.data();
        EXPECT_EQ(clEnqueueReadImage(queue_.get(), image, 1, box, box + 3, 0, 0, values, 0, nullptr, nullptr), 0);
        return like;
    }

    zor::ContextHandle cl_;
    zor::ContextHandle other_;
    zor::QueueHandle queue_;
    std::vector<zor::MemoryHandle> memories_;
    Handle owner_;
};

TEST_F(HostMemory, ImagesGiveThePictureOfBuffersForEveryFilterThatTakesThemAlsoInPlace) {
    const Picture picture = noise(21, 11);
    const cl_mem source = image2D(21, 11);
    const cl_mem destination = image2D(21, 11);
    const Handle input = wrapped(source, picture.desc(), true);
    const Handle output = wrapped(destination, picture.desc(), true);
    const Handle buffer = newImage(picture, owner_);
    const std::pair<uint32_t, Parameters> filters[] = {
        {TOV_IMAGE_FILTER_SOBEL, {}},
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"radius", 3u}, {"sigma", 1.5f}, {"tiling", 1u}}},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE, {{"radius", 2u}}},
        {TOV_IMAGE_FILTER_RESAMPLE, {}},
        {TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, {{"positionsImg", tov_image{buffer}}}}};
    for (const auto& [type, parameters] : filters) {
        const Handle expected = newImage(picture, owner_);
        ASSERT_EQ(executeHere(type, parameters, buffer, expected), TOV_SUCCESS) << type;
        ASSERT_EQ(executeHere(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, buffer, input), TOV_SUCCESS) << "a copy";
        ASSERT_EQ(executeHere(type, parameters, input, output), TOV_SUCCESS) << type;
        // Compiled apart, relaxed mathematics rounds differently.
        EXPECT_LE(maxDifference(content(destination, picture), read(expected, picture)), 1e-6) << type;
        if (type == TOV_IMAGE_FILTER_RESAMPLE) continue;  // does not run in place
        ASSERT_EQ(executeHere(type, parameters, input, input), TOV_SUCCESS) << type;
        EXPECT_LE(maxDifference(content(source, picture), read(expected, picture)), 1e-6) << type;
    }
}

TEST_F(HostMemory, IsRefusedWhereItDoesNotFitItsDescriptorOrItsUse) {
    const tov_image_desc desc = {16, 16, 1, 0, 0, 4, TOV_COMPONENT_TYPE_UINT8};  // 1024 bytes
    const Handle exact = wrapped(buffer(1024), desc, false);
    const Handle image = wrapped(image2D(16, 16), desc, true);
    const cl_mem foreign = keep(clCreateBuffer(other_.get(), CL_MEM_READ_WRITE, 1024, nullptr, nullptr));
    for (cl_mem memory : {foreign, buffer(1000), buffer(1024, CL_MEM_READ_ONLY), image2D(16, 16)})
        wrapped(memory, desc, false, TOV_ERROR_INVALID_PARAMETER);
    for (cl_mem memory : {buffer(1024), image2D(17, 16), image2D(16, 15), image2D(16, 16, CL_UNSIGNED_INT8),
                          image2D(16, 16, CL_FLOAT, CL_MEM_WRITE_ONLY)})
        wrapped(memory, desc, true, TOV_ERROR_INVALID_PARAMETER);
    void* pointer = nullptr;
    EXPECT_EQ(tovImageMap(image, 0, &pointer), TOV_ERROR_UNSUPPORTED);
    for (const uint32_t type : {TOV_IMAGE_FILTER_EAW_DENOISE, TOV_IMAGE_FILTER_MLAA}) {
        const auto refused = [&] { EXPECT_EQ(executeHere(type, {}, image, exact), TOV_ERROR_UNSUPPORTED) << type; };
        EXPECT_THAT(printedBy(refused), testing::HasSubstr("must be a buffer"));
    }
}

TEST_F(HostMemory, WrappedTwiceInWholeOrInPartIsOneMemory) {
    const Picture bytes = noise(16, 8, {3, TOV_COMPONENT_TYPE_UINT8});  // whose pixels the wider output overtakes
    Picture floats(16, 8);
    const Picture expected = run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, bytes, {}, floats);
    const cl_mem whole = buffer(4096);
    const cl_buffer_region region = {256, 2048};
    const zor::MemoryHandle part(clCreateSubBuffer(whole, 0, CL_BUFFER_CREATE_TYPE_REGION, &region, nullptr));
    for (cl_mem second : {whole, part.get()}) {
        const Handle narrow = wrapped(whole, bytes.desc(), false);
        const Handle wide = wrapped(second, floats.desc(), false);
        EXPECT_EQ(executeHere(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, newImage(bytes, owner_), narrow), TOV_SUCCESS);
        EXPECT_EQ(executeHere(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, narrow, wide), TOV_SUCCESS);
        EXPECT_EQ(clEnqueueReadBuffer(queue_.get(), second, 1, 0, 2048, floats.values.data(), 0, nullptr, nullptr), 0);
        EXPECT_EQ(maxDifference(floats, expected), 0);
        const Handle input = newImage(floats, owner_);
        const Parameters outputs = {{"positionsImg", tov_image{input}}, {"outVarianceImg", tov_image{narrow}}};
        EXPECT_EQ(executeHere(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, outputs, input, wide),
                  TOV_ERROR_INVALID_PARAMETER);
    }
}

}  // namespace
}  // namespace apitest
