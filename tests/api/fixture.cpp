#include "fixture.h"

#include <unistd.h>

namespace apitest {

namespace {

// Opened once per program, closed and cleaned up before it ends.
struct SharedDevice : testing::Environment {
    std::filesystem::path directory;
    Handle context;

    void SetUp() override {
        directory = std::filesystem::temp_directory_path() / ("tov-api-tests-" + std::to_string(getpid()));
        std::filesystem::create_directories(directory);
        context = open();
    }
    void TearDown() override {
        context.remove();
        std::error_code ignored;
        std::filesystem::remove_all(directory, ignored);
    }
    Handle open() const {
        Handle opened;
        EXPECT_EQ(tovCreateContext(TOV_API_VERSION, TOV_BACKEND_API_OPENCL, TOV_DEVICE_TYPE_CPU, 0,
                                   directory.string().c_str(), opened.out()),
                  TOV_SUCCESS);
        return opened;
    }
};
auto* const shared = static_cast<SharedDevice*>(testing::AddGlobalTestEnvironment(new SharedDevice));

struct Setter {
    tov_image_filter filter;
    const char* name;
    int32_t operator()(uint32_t value) const { return tovImageFilterSetParameter1u(filter, name, value); }
    int32_t operator()(float value) const { return tovImageFilterSetParameter1f(filter, name, value); }
    int32_t operator()(const Matrix& value) const { return tovImageFilterSetParameter16f(filter, name, value.data()); }
    int32_t operator()(tov_image value) const { return tovImageFilterSetParameterImage(filter, name, value); }
    int32_t operator()(const std::vector<float>& value) const {
        return tovImageFilterSetParameterFloatArray(filter, name, value.data(), static_cast<uint32_t>(value.size()));
    }
    int32_t operator()(const std::vector<tov_image>& value) const {
        auto* images = const_cast<tov_image*>(value.data());  // the interface takes them without const
        return tovImageFilterSetParameterImageArray(filter, name, images, static_cast<uint32_t>(value.size()));
    }
};

}  // namespace

int32_t setParameter(tov_image_filter filter, const Parameter& parameter) {
    return std::visit(Setter{filter, parameter.name}, parameter.value);
}

tov_context DeviceTest::context() {
    return shared->context;
}

const std::filesystem::path& DeviceTest::cacheDirectory() {
    return shared->directory;
}

Handle DeviceTest::newContext() {
    return shared->open();
}

Handle DeviceTest::newImage(const tov_image_desc& desc, const void* data, tov_context owner) {
    Handle image;
    EXPECT_EQ(tovContextCreateImage(owner, &desc, data, image.out()), TOV_SUCCESS);
    return image;
}

Handle DeviceTest::newImage(const Picture& picture, tov_context owner) {
    return newImage(picture.desc(), picture.encoded().data(), owner);
}

Handle DeviceTest::newFilter(uint32_t type, const Parameters& parameters, tov_context owner) {
    Handle filter;
    EXPECT_EQ(tovContextCreateImageFilter(owner, type, filter.out()), TOV_SUCCESS) << "type " << type;
    for (const Parameter& parameter : parameters)
        EXPECT_EQ(setParameter(filter, parameter), TOV_SUCCESS) << parameter.name;
    return filter;
}

Handle DeviceTest::newQueue(tov_context owner) {
    Handle queue;
    EXPECT_EQ(tovContextCreateCommandQueue(owner, queue.out()), TOV_SUCCESS);
    return queue;
}

Picture DeviceTest::read(tov_image image, Picture like) {
    void* pixels = nullptr;
    EXPECT_EQ(tovImageMap(image, 0, &pixels), TOV_SUCCESS);
    if (pixels == nullptr) return {};
    like.decode(static_cast<const std::byte*>(pixels));
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
    return like;
}

int32_t DeviceTest::execute(tov_image_filter filter, tov_image input, tov_image output) {
    const Handle queue = newQueue();
    const int32_t attached = tovCommandQueueAttachImageFilter(queue, filter, input, output);
    return attached != TOV_SUCCESS ? attached : tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr);
}

Picture DeviceTest::run(uint32_t type, const Picture& input, const Parameters& parameters,
                        const std::optional<Picture>& before) {
    const Picture like = before.value_or(Picture(input.width, input.height, input.layout));
    const Handle source = newImage(input);
    const Handle destination = newImage(like);
    EXPECT_EQ(execute(newFilter(type, parameters), source, destination), TOV_SUCCESS) << "filter type " << type;
    return read(destination, like);
}

Picture DeviceTest::runInPlace(uint32_t type, const Picture& input, const Parameters& parameters) {
    const Handle image = newImage(input);
    EXPECT_EQ(execute(newFilter(type, parameters), image, image), TOV_SUCCESS) << "filter type " << type;
    return read(image, input);
}

}  // namespace apitest
