// Contexts over the host's own OpenCL objects, and images over its memory.
#ifndef CL_TARGET_OPENCL_VERSION
#define CL_TARGET_OPENCL_VERSION 120
#endif
#ifndef CL_USE_DEPRECATED_OPENCL_1_1_APIS
#define CL_USE_DEPRECATED_OPENCL_1_1_APIS
#endif
#include <CL/cl.h>
#include <dlfcn.h>

#include <algorithm>
#include <cstring>

#include "fixture.h"

namespace apitest {
namespace {

// The host opens OpenCL by name, like the library, instead of linking it.
template <class Function>
Function* opencl(const char* name) {
    static void* const library = dlopen("libOpenCL.so.1", RTLD_NOW | RTLD_LOCAL);
    return reinterpret_cast<Function*>(dlsym(library, name));
}
#define CL(name) opencl<decltype(::name)>(#name)

class AdoptedContexts : public DeviceTest {
 protected:
    void SetUp() override {
        DeviceTest::SetUp();
        ASSERT_EQ(CL(clGetPlatformIDs)(1, &platform_, nullptr), CL_SUCCESS);
        ASSERT_EQ(CL(clGetDeviceIDs)(platform_, CL_DEVICE_TYPE_CPU, 1, &device_, nullptr), CL_SUCCESS);
        clContext_ = CL(clCreateContext)(nullptr, 1, &device_, nullptr, nullptr, nullptr);
        clQueue_ = CL(clCreateCommandQueue)(clContext_, device_, 0, nullptr);
        ASSERT_NE(clQueue_, nullptr);
        ASSERT_EQ(tovCreateContextFromOpenClContext(TOV_API_VERSION, clContext_, device_, clQueue_,
                                                    cacheDirectory().string().c_str(), adopted_.out()),
                  TOV_SUCCESS);
    }
    void TearDown() override {
        adopted_.remove();
        for (cl_mem memory : memories_) CL(clReleaseMemObject)(memory);
        if (clQueue_ != nullptr) CL(clReleaseCommandQueue)(clQueue_);
        if (clContext_ != nullptr) CL(clReleaseContext)(clContext_);
    }

    cl_mem buffer(size_t bytes, const void* data = nullptr) {
        const cl_mem_flags copy = data != nullptr ? CL_MEM_COPY_HOST_PTR : 0;
        memories_.push_back(
            CL(clCreateBuffer)(clContext_, CL_MEM_READ_WRITE | copy, bytes, const_cast<void*>(data), nullptr));
        return memories_.back();
    }
    cl_mem clImage(uint32_t width, uint32_t height, cl_channel_type type = CL_FLOAT, const void* data = nullptr) {
        const cl_image_format format = {CL_RGBA, type};
        cl_image_desc desc = {};
        desc.image_type = CL_MEM_OBJECT_IMAGE2D;
        desc.image_width = width;
        desc.image_height = height;
        const cl_mem_flags copy = data != nullptr ? CL_MEM_COPY_HOST_PTR : 0;
        memories_.push_back(
            CL(clCreateImage)(clContext_, CL_MEM_READ_WRITE | copy, &format, &desc, const_cast<void*>(data), nullptr));
        return memories_.back();
    }
    int32_t wrap(const tov_image_desc& desc, cl_mem memory, bool isImage, tov_image* out) {
        return tovContextCreateImageFromOpenClMemory(adopted_, &desc, memory, isImage ? 1 : 0, out);
    }
    Handle wrapped(const tov_image_desc& desc, cl_mem memory, bool isImage = false) {
        Handle image;
        EXPECT_EQ(wrap(desc, memory, isImage, image.out()), TOV_SUCCESS);
        return image;
    }
    int32_t executeHere(tov_image_filter filter, tov_image input, tov_image output) {
        const Handle queue = newQueue(adopted_);
        const int32_t attached = tovCommandQueueAttachImageFilter(queue, filter, input, output);
        return attached != TOV_SUCCESS ? attached : tovContextExecuteCommandQueue(adopted_, queue, nullptr, nullptr);
    }
    Picture readBuffer(cl_mem memory, Picture like) {
        std::vector<std::byte> bytes(like.encoded().size());
        EXPECT_EQ(
            CL(clEnqueueReadBuffer)(clQueue_, memory, CL_TRUE, 0, bytes.size(), bytes.data(), 0, nullptr, nullptr),
            CL_SUCCESS);
        like.decode(bytes.data());
        return like;
    }
    static cl_uint references(cl_mem memory) {
        cl_uint count = 0;
        EXPECT_EQ(CL(clGetMemObjectInfo)(memory, CL_MEM_REFERENCE_COUNT, sizeof count, &count, nullptr), CL_SUCCESS);
        return count;
    }

    cl_platform_id platform_ = nullptr;
    cl_device_id device_ = nullptr;
    cl_context clContext_ = nullptr;
    cl_command_queue clQueue_ = nullptr;
    std::vector<cl_mem> memories_;
    Handle adopted_;
};

TEST_F(AdoptedContexts, RunFiltersOnTheHostsBuffersAndLeaveEverythingToTheHost) {
    const Picture input = noise(7, 5);
    const cl_mem source = buffer(7 * 5 * 16, input.encoded().data());
    const cl_mem destination = buffer(7 * 5 * 16 + 100);
    {
        const Handle from = wrapped(input.desc(), source);
        const Handle to = wrapped(input.desc(), destination);
        const Handle filter = newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 1.0f}}, adopted_);
        ASSERT_EQ(executeHere(filter, from, to), TOV_SUCCESS);
        EXPECT_EQ(maxDifference(read(to, input), input), 0.0) << "through a mapping";
    }
    EXPECT_EQ(references(source), 1u);
    adopted_.remove();
    EXPECT_EQ(maxDifference(readBuffer(destination, input), input), 0.0) << "the host's queue is in use as before";
    cl_uint count = 0;
    EXPECT_EQ(CL(clGetContextInfo)(clContext_, CL_CONTEXT_NUM_DEVICES, sizeof count, &count, nullptr), CL_SUCCESS);
}

TEST_F(AdoptedContexts, WrappingChecksTheMemoryAgainstTheDescriptor) {
    const tov_image_desc bytes = {16, 16, 1, 0, 0, 4, TOV_COMPONENT_TYPE_UINT8};
    const tov_image_desc floats = {7, 5, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
    const cl_context other = CL(clCreateContext)(nullptr, 1, &device_, nullptr, nullptr, nullptr);
    const cl_mem foreign = CL(clCreateBuffer)(other, CL_MEM_READ_WRITE, 4096, nullptr, nullptr);
    struct Row {
        const char* what;
        tov_image_desc desc;
        cl_mem memory;
        bool isImage;
        int32_t expected;
    };
    const Row rows[] = {
        {"1000 bytes for 1024", bytes, buffer(1000), false, TOV_ERROR_INVALID_PARAMETER},
        {"1024 bytes for 1024", bytes, buffer(1024), false, TOV_SUCCESS},
        {"more than enough", bytes, buffer(4096), false, TOV_SUCCESS},
        {"a buffer as an image", floats, buffer(4096), true, TOV_ERROR_INVALID_PARAMETER},
        {"an image as a buffer", floats, clImage(7, 5), false, TOV_ERROR_INVALID_PARAMETER},
        {"an image", floats, clImage(7, 5), true, TOV_SUCCESS},
        {"an image of another size", floats, clImage(8, 5), true, TOV_ERROR_INVALID_PARAMETER},
        {"an image of integers", floats, clImage(7, 5, CL_UNSIGNED_INT32), true, TOV_ERROR_INVALID_PARAMETER},
        {"another context's memory", bytes, foreign, false, TOV_ERROR_INVALID_PARAMETER},
    };
    for (const Row& row : rows) {
        Handle image;
        EXPECT_EQ(wrap(row.desc, row.memory, row.isImage, image.out()), row.expected) << row.what;
    }
    CL(clReleaseMemObject)(foreign);
    CL(clReleaseContext)(other);
}

TEST_F(AdoptedContexts, OpenClImagesAreReadAndWrittenThroughASampler) {
    const Picture input = noise(7, 5);
    const cl_mem source = clImage(7, 5, CL_FLOAT, input.encoded().data());
    const cl_mem destination = clImage(7, 5);
    const Handle from = wrapped(input.desc(), source, true);
    const Handle to = wrapped(input.desc(), destination, true);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_SOBEL, {}, adopted_);
    ASSERT_EQ(executeHere(filter, from, to), TOV_SUCCESS);
    std::vector<std::byte> bytes(7 * 5 * 16);
    const size_t origin[] = {0, 0, 0};
    const size_t region[] = {7, 5, 1};
    ASSERT_EQ(
        CL(clEnqueueReadImage)(clQueue_, destination, CL_TRUE, origin, region, 0, 0, bytes.data(), 0, nullptr, nullptr),
        CL_SUCCESS);
    Picture output(7, 5);
    output.decode(bytes.data());
    EXPECT_LT(maxDifference(output, run(TOV_IMAGE_FILTER_SOBEL, input)), 1e-6);
    void* pixels = nullptr;
    EXPECT_EQ(tovImageMap(from, 0, &pixels), TOV_ERROR_UNSUPPORTED);
}

TEST_F(AdoptedContexts, TwoWrapsOfOneBufferGiveTheSamePictureAsTwoBuffers) {
    const Picture input = noise(7, 5);
    const Layout byte3 = {3, TOV_COMPONENT_TYPE_UINT8};
    for (const uint32_t type : {TOV_IMAGE_FILTER_LINEAR_TONEMAP, TOV_IMAGE_FILTER_SOBEL}) {
        const Picture expected = run(type, input, {}, Picture(7, 5, byte3));
        const cl_mem shared = buffer(7 * 5 * 16, input.encoded().data());
        const Handle from = wrapped(input.desc(), shared);
        const Handle to = wrapped(expected.desc(), shared);
        ASSERT_EQ(executeHere(newFilter(type, {}, adopted_), from, to), TOV_SUCCESS);
        EXPECT_EQ(maxDifference(readBuffer(shared, expected), expected), 0.0) << "filter type " << type;
    }
}

TEST_F(AdoptedContexts, OverlappingSubBuffersAreOneMemory) {
    const Picture input = noise(16, 4);  // 1024 bytes, a multiple of any alignment of sub-buffers here
    cl_uint alignmentBits = 0;
    ASSERT_EQ(
        CL(clGetDeviceInfo)(device_, CL_DEVICE_MEM_BASE_ADDR_ALIGN, sizeof alignmentBits, &alignmentBits, nullptr),
        CL_SUCCESS);
    ASSERT_LE(alignmentBits, 2048u) << "rows of 256 bytes are not aligned on this device";
    std::vector<std::byte> bytes = input.encoded();
    bytes.resize(1280);
    const cl_mem parent = buffer(1280, bytes.data());
    const auto part = [&](size_t offset) {
        const cl_buffer_region region = {offset, 1024};
        memories_.push_back(
            CL(clCreateSubBuffer)(parent, CL_MEM_READ_WRITE, CL_BUFFER_CREATE_TYPE_REGION, &region, nullptr));
        return memories_.back();
    };
    const cl_mem lower = part(0);
    const cl_mem upper = part(256);
    const Handle from = wrapped(input.desc(), lower);
    const Handle to = wrapped(input.desc(), upper);
    ASSERT_EQ(executeHere(newFilter(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, adopted_), from, to), TOV_SUCCESS);
    EXPECT_EQ(maxDifference(readBuffer(upper, input), input), 0.0) << "rows were overwritten before they were read";
}

TEST_F(AdoptedContexts, TwoOutputsOnOneBufferAreRefused) {
    const Picture input = noise(7, 5);
    const Handle from = wrapped(input.desc(), buffer(7 * 5 * 16, input.encoded().data()));
    const cl_mem shared = buffer(7 * 5 * 16);
    const Handle output = wrapped(input.desc(), shared);
    const Handle variance = wrapped(input.desc(), shared);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, {}, adopted_);
    ASSERT_EQ(setParameter(filter, {"positionsImg", tov_image{from}}), TOV_SUCCESS);
    ASSERT_EQ(setParameter(filter, {"outVarianceImg", tov_image{variance}}), TOV_SUCCESS);
    EXPECT_EQ(executeHere(filter, from, output), TOV_ERROR_INVALID_PARAMETER);
}

TEST_F(AdoptedContexts, ReportTheirDevice) {
    uint32_t type = 77;
    std::array<char, 128> name{};
    std::array<char, 128> sharedName{};
    std::array<char, 128> vendor{};
    ASSERT_EQ(tovContextGetDeviceInfo(adopted_, &type, name.data(), 0, vendor.data()), TOV_SUCCESS);
    EXPECT_EQ(type, TOV_DEVICE_TYPE_GPU) << "the type that the creation stands for";
    ASSERT_EQ(tovContextGetDeviceInfo(context(), &type, sharedName.data(), 0, vendor.data()), TOV_SUCCESS);
    EXPECT_STREQ(name.data(), sharedName.data());
}

}  // namespace
}  // namespace apitest
