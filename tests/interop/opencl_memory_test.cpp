// The host's OpenCL buffers and images as images of the library, on the real device.
#define CL_TARGET_OPENCL_VERSION 120
#include <CL/cl.h>
#include <dlfcn.h>

#include "fixture.h"

namespace apitest {
namespace {

template <class Function>
Function* cl(const char* name) {
    static void* const library = dlopen("libOpenCL.so.1", RTLD_NOW | RTLD_LOCAL);
    return reinterpret_cast<Function*>(dlsym(library, name));
}
#define CL(name) cl<decltype(::name)>(#name)

// A host with an OpenCL context, device and queue of its own.
class HostMemory : public DeviceTest {
 protected:
    void SetUp() override {
        DeviceTest::SetUp();
        cl_platform_id platform = nullptr;
        ASSERT_EQ(CL(clGetPlatformIDs)(1, &platform, nullptr), CL_SUCCESS);
        ASSERT_EQ(CL(clGetDeviceIDs)(platform, CL_DEVICE_TYPE_CPU, 1, &device_, nullptr), CL_SUCCESS);
        cl_ = CL(clCreateContext)(nullptr, 1, &device_, nullptr, nullptr, nullptr);
        queue_ = CL(clCreateCommandQueue)(cl_, device_, 0, nullptr);
        ASSERT_EQ(tovCreateContextFromOpenClContext(TOV_API_VERSION, cl_, device_, queue_,
                                                    cacheDirectory().string().c_str(), owner_.out()),
                  TOV_SUCCESS);
    }
    void TearDown() override {
        owner_.remove();
        for (cl_mem memory : memories_) {
            cl_uint count = 0;
            EXPECT_EQ(CL(clGetMemObjectInfo)(memory, CL_MEM_REFERENCE_COUNT, sizeof count, &count, nullptr),
                      CL_SUCCESS);
            EXPECT_EQ(count, 1u) << "the library keeps no reference, and releases none";
            CL(clReleaseMemObject)(memory);
        }
        EXPECT_EQ(CL(clFinish)(queue_), CL_SUCCESS) << "the host's queue is untouched";
        CL(clReleaseCommandQueue)(queue_);
        CL(clReleaseContext)(cl_);
    }

    cl_mem buffer(size_t bytes, cl_mem_flags flags = CL_MEM_READ_WRITE) {
        memories_.push_back(CL(clCreateBuffer)(cl_, flags, bytes, nullptr, nullptr));
        return memories_.back();
    }
    cl_mem image2D(size_t width, size_t height, cl_channel_type type = CL_FLOAT,
                   cl_mem_flags flags = CL_MEM_READ_WRITE) {
        const cl_image_format format = {CL_RGBA, type};
        cl_image_desc desc = {};
        desc.image_type = CL_MEM_OBJECT_IMAGE2D;
        desc.image_width = width;
        desc.image_height = height;
        memories_.push_back(CL(clCreateImage)(cl_, flags, &format, &desc, nullptr, nullptr));
        EXPECT_NE(memories_.back(), nullptr);
        return memories_.back();
    }
    int32_t wrap(cl_mem memory, const tov_image_desc& desc, bool isImage, Handle& image) {
        return tovContextCreateImageFromOpenClMemory(owner_, &desc, memory, isImage ? 1 : 0, image.out());
    }
    Handle wrapped(cl_mem memory, const tov_image_desc& desc, bool isImage) {
        Handle image;
        EXPECT_EQ(wrap(memory, desc, isImage, image), TOV_SUCCESS);
        return image;
    }
    void fill(cl_mem image, const Picture& picture) {
        const size_t origin[3] = {};
        const size_t region[3] = {picture.width, picture.height, 1};
        ASSERT_EQ(CL(clEnqueueWriteImage)(queue_, image, CL_TRUE, &origin[0], &region[0], 0, 0, picture.values.data(),
                                          0, nullptr, nullptr),
                  CL_SUCCESS);
    }
    Picture content(cl_mem image, Picture like) {
        const size_t origin[3] = {};
        const size_t region[3] = {like.width, like.height, 1};
        EXPECT_EQ(CL(clEnqueueReadImage)(queue_, image, CL_TRUE, &origin[0], &region[0], 0, 0, like.values.data(), 0,
                                         nullptr, nullptr),
                  CL_SUCCESS);
        return like;
    }
    int32_t executeHere(uint32_t type, const Parameters& parameters, tov_image input, tov_image output) {
        const Handle filter = newFilter(type, parameters, owner_);
        const Handle queue = newQueue(owner_);
        const int32_t code = tovCommandQueueAttachImageFilter(queue, filter, input, output);
        return code != TOV_SUCCESS ? code : tovContextExecuteCommandQueue(owner_, queue, nullptr, nullptr);
    }

    cl_device_id device_ = nullptr;
    cl_context cl_ = nullptr;
    cl_command_queue queue_ = nullptr;
    std::vector<cl_mem> memories_;
    Handle owner_;
};

TEST_F(HostMemory, BuffersAreReadAndWrittenInPlaceOfStorage) {
    const Picture picture = noise(13, 7);
    const cl_mem memory = buffer(picture.values.size() * sizeof(float) + 64);
    Handle image = wrapped(memory, picture.desc(), false);
    void* pointer = nullptr;
    ASSERT_EQ(tovImageMap(image, 0, &pointer), TOV_SUCCESS);
    memcpy(pointer, picture.values.data(), picture.values.size() * sizeof(float));
    ASSERT_EQ(tovImageUnmap(image, pointer), TOV_SUCCESS);
    ASSERT_EQ(executeHere(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 2.0f}}, image, image), TOV_SUCCESS);
    std::vector<float> pixels(picture.values.size());
    ASSERT_EQ(CL(clEnqueueReadBuffer)(queue_, memory, CL_TRUE, 0, pixels.size() * sizeof(float), pixels.data(), 0,
                                      nullptr, nullptr),
              CL_SUCCESS);
    EXPECT_EQ(pixels[0], picture.values[0] * 2);
    EXPECT_EQ(pixels[3], picture.values[3]);
}

TEST_F(HostMemory, ImagesGiveThePictureOfBuffersForEveryFilterThatTakesThem) {
    const Picture picture = noise(21, 11);
    const cl_mem source = image2D(21, 11);
    const cl_mem destination = image2D(21, 11);
    fill(source, picture);
    const Handle input = wrapped(source, picture.desc(), true);
    const Handle output = wrapped(destination, picture.desc(), true);
    const struct {
        uint32_t type;
        Parameters parameters;
    } filters[] = {
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.2f}}},
        {TOV_IMAGE_FILTER_SOBEL, {}},
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"radius", uint32_t{3}}, {"sigma", 1.5f}}},
        {TOV_IMAGE_FILTER_GAUSSIAN_BLUR, {{"radius", uint32_t{3}}, {"sigma", 1.5f}, {"tiling", uint32_t{1}}}},
        {TOV_IMAGE_FILTER_BILATERAL_DENOISE, {{"radius", uint32_t{2}}}},
        {TOV_IMAGE_FILTER_RESAMPLE, {}},
    };
    for (const auto& [type, parameters] : filters) {
        ASSERT_EQ(executeHere(type, parameters, input, output), TOV_SUCCESS) << type;
        EXPECT_LE(maxDifference(content(destination, picture), run(type, picture, parameters)), 1e-6) << type;
    }
}

TEST_F(HostMemory, OneImageAsInputAndOutputGivesThePictureOfTwo) {
    const Picture picture = noise(21, 11);
    const cl_mem memory = image2D(21, 11);
    const Handle image = wrapped(memory, picture.desc(), true);
    for (const uint32_t type : {TOV_IMAGE_FILTER_LINEAR_TONEMAP, TOV_IMAGE_FILTER_SOBEL}) {
        fill(memory, picture);
        ASSERT_EQ(executeHere(type, {}, image, image), TOV_SUCCESS) << type;
        EXPECT_LE(maxDifference(content(memory, picture), run(type, picture)), 1e-6) << type;
    }
}

TEST_F(HostMemory, AccumulationIntoAnImageEqualsThatIntoABuffer) {
    const Picture color = noise(16, 9);
    const Picture positions = noise(16, 9, kFloat4, 4.0, 2);
    const cl_mem destination = image2D(16, 9);
    const Handle output = wrapped(destination, color.desc(), true);
    const Handle input = newImage(color, owner_);
    const Handle places = newImage(positions, owner_);
    const Handle filter =
        newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, {{"positionsImg", tov_image{places}}}, owner_);
    const Handle queue = newQueue(owner_);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);

    const Handle input2 = newImage(color);
    const Handle places2 = newImage(positions);
    const Handle output2 = newImage(color);
    const Handle filter2 = newFilter(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, {{"positionsImg", tov_image{places2}}});
    for (int frame = 0; frame < 3; ++frame) {
        ASSERT_EQ(tovContextExecuteCommandQueue(owner_, queue, nullptr, nullptr), TOV_SUCCESS);
        ASSERT_EQ(execute(filter2, input2, output2), TOV_SUCCESS);
    }
    EXPECT_LE(maxDifference(content(destination, color), read(output2, color)), 1e-6);
}

TEST_F(HostMemory, IsRefusedWhereItDoesNotFit) {
    const tov_image_desc desc = {16, 16, 1, 0, 0, 4, TOV_COMPONENT_TYPE_UINT8};  // 1024 bytes
    const cl_context other = CL(clCreateContext)(nullptr, 1, &device_, nullptr, nullptr, nullptr);
    const cl_mem foreign = CL(clCreateBuffer)(other, CL_MEM_READ_WRITE, 1024, nullptr, nullptr);
    const struct {
        const char* what;
        cl_mem memory;
        bool isImage;
        int32_t code;
    } cases[] = {
        {"a buffer that fits", buffer(1024), false, TOV_SUCCESS},
        {"an image that fits", image2D(16, 16), true, TOV_SUCCESS},
        {"a buffer that is too small", buffer(1000), false, TOV_ERROR_INVALID_PARAMETER},
        {"a buffer as an image", buffer(1024), true, TOV_ERROR_INVALID_PARAMETER},
        {"an image as a buffer", image2D(16, 16), false, TOV_ERROR_INVALID_PARAMETER},
        {"an image of another width", image2D(17, 16), true, TOV_ERROR_INVALID_PARAMETER},
        {"an image of another height", image2D(16, 15), true, TOV_ERROR_INVALID_PARAMETER},
        {"an image of integers", image2D(16, 16, CL_UNSIGNED_INT8), true, TOV_ERROR_INVALID_PARAMETER},
        {"a read-only buffer", buffer(1024, CL_MEM_READ_ONLY), false, TOV_ERROR_INVALID_PARAMETER},
        {"a write-only image", image2D(16, 16, CL_FLOAT, CL_MEM_WRITE_ONLY), true, TOV_ERROR_INVALID_PARAMETER},
        {"memory of another context", foreign, false, TOV_ERROR_INVALID_PARAMETER},
    };
    for (const auto& [what, memory, isImage, code] : cases) {
        Handle image;
        EXPECT_EQ(wrap(memory, desc, isImage, image), code) << what;
    }
    CL(clReleaseMemObject)(foreign);
    CL(clReleaseContext)(other);
}

TEST_F(HostMemory, IsNotMappedWhereItIsAnImageNorDenoisedOrAntialiased) {
    const Picture picture(16, 16);
    const Handle image = wrapped(image2D(16, 16), picture.desc(), true);
    const Handle output = wrapped(image2D(16, 16), picture.desc(), true);
    void* pointer = nullptr;
    EXPECT_EQ(tovImageMap(image, 0, &pointer), TOV_ERROR_UNSUPPORTED);
    for (const uint32_t type : {TOV_IMAGE_FILTER_EAW_DENOISE, TOV_IMAGE_FILTER_MLAA}) {
        int32_t code = 0;
        const std::string printed = printedBy([&] { code = executeHere(type, {}, image, output); });
        EXPECT_EQ(code, TOV_ERROR_UNSUPPORTED) << type;
        EXPECT_NE(printed.find("must be a buffer"), std::string::npos) << printed;
    }
}

TEST_F(HostMemory, OfPartsOfOneBufferIsKnownToOverlap) {
    const Picture picture = noise(16, 8);
    const size_t bytes = picture.values.size() * sizeof(float);
    const cl_mem whole = buffer(2 * bytes);
    const cl_buffer_region region = {bytes / 2, bytes};
    const cl_mem part = CL(clCreateSubBuffer)(whole, 0, CL_BUFFER_CREATE_TYPE_REGION, &region, nullptr);
    ASSERT_NE(part, nullptr);
    memories_.insert(memories_.begin(), part);  // released before the whole
    const Handle input = wrapped(whole, picture.desc(), false);
    const Handle output = wrapped(part, picture.desc(), false);
    ASSERT_EQ(CL(clEnqueueWriteBuffer)(queue_, whole, CL_TRUE, 0, bytes, picture.values.data(), 0, nullptr, nullptr),
              CL_SUCCESS);
    ASSERT_EQ(executeHere(TOV_IMAGE_FILTER_SOBEL, {}, input, output), TOV_SUCCESS);
    EXPECT_EQ(maxDifference(read(output, picture), run(TOV_IMAGE_FILTER_SOBEL, picture)), 0);
}

TEST_F(HostMemory, WrappedTwiceIsOneMemory) {
    const Picture bytes = noise(16, 8, {3, TOV_COMPONENT_TYPE_UINT8});  // whose pixels the wider output overtakes
    const Picture floats(16, 8);
    const cl_mem memory = buffer(floats.values.size() * sizeof(float));
    const Handle narrow = wrapped(memory, bytes.desc(), false);
    const Handle wide = wrapped(memory, floats.desc(), false);
    const std::vector<std::byte> pixels = bytes.encoded();
    ASSERT_EQ(CL(clEnqueueWriteBuffer)(queue_, memory, CL_TRUE, 0, pixels.size(), pixels.data(), 0, nullptr, nullptr),
              CL_SUCCESS);
    ASSERT_EQ(executeHere(TOV_IMAGE_FILTER_LINEAR_TONEMAP, {}, narrow, wide), TOV_SUCCESS);
    EXPECT_EQ(maxDifference(read(wide, floats), run(TOV_IMAGE_FILTER_LINEAR_TONEMAP, bytes, {}, floats)), 0);
    const Handle input = newImage(floats, owner_);
    const Parameters outputs = {{"positionsImg", tov_image{input}}, {"outVarianceImg", tov_image{narrow}}};
    EXPECT_EQ(executeHere(TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, outputs, input, wide), TOV_ERROR_INVALID_PARAMETER);
}

TEST_F(HostMemory, BelongsToADeviceThatIsReportedByItsOwnName) {
    uint32_t type = 77;
    std::array<char, 128> name{};
    std::array<char, 128> vendor{};
    ASSERT_EQ(tovContextGetDeviceInfo(owner_, &type, name.data(), 0, vendor.data()), TOV_SUCCESS);
    EXPECT_EQ(type, TOV_DEVICE_TYPE_GPU) << "what an adopted device counts as";
    const std::array<char, 128> adopted = name;
    ASSERT_EQ(tovContextGetDeviceInfo(context(), &type, name.data(), 0, vendor.data()), TOV_SUCCESS);
    EXPECT_STREQ(name.data(), adopted.data());
}

}  // namespace
}  // namespace apitest
