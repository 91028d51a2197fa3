#include "fixture.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdlib>

namespace apitest {
namespace {

// Opened by the first test that needs it, closed and cleaned up before the program ends.
struct SharedDevice : testing::Environment {
    const std::filesystem::path directory =
        std::filesystem::temp_directory_path() / ("tov-api-tests-" + std::to_string(getpid()));
    Handle context;

    void TearDown() override {
        context.remove();
        std::filesystem::remove_all(directory);
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

void setAll(tov_image_filter filter, const std::vector<tov_image>& auxiliary) {
    static const std::vector<float> floats = {0.25f, 0.75f};  // read when the filter runs
    for (const auto& [name, value] : {std::pair{"sigma", 1.0f}, {"avLum", 0.5f}, {"maxLum", 4.0f}})
        setParameter(filter, {name, value});
    for (const char* name : {"weights", "sigmas"}) Setter{filter, name}(floats);
    for (const char* name : {"normalsImg", "positionsImg"}) setParameter(filter, {name, auxiliary[0]});
    Setter{filter, "inputs"}(auxiliary);
    setParameter(filter, {"inputsNum", 2u});
}

void DeviceTest::SetUp() {
    ASSERT_NE(context(), nullptr) << "these tests need an OpenCL device of type CPU";
    const char* const wanted = std::getenv("TOV_TEST_DEVICE");
    if (wanted == nullptr) return;
    uint32_t type = 0;
    std::array<char, 256> texts = {};  // name and vendor
    ASSERT_EQ(tovContextGetDeviceInfo(context(), &type, &texts[0], 0, &texts[128]), TOV_SUCCESS);
    ASSERT_THAT(texts.data(), testing::HasSubstr(wanted));
}

tov_context DeviceTest::context() {
    if (shared->context == nullptr) shared->context = newContext();
    return shared->context;
}

const std::filesystem::path& DeviceTest::cacheDirectory() {
    return shared->directory;
}

Handle DeviceTest::newContext() {
    return created(tovCreateContext, 1u, 0u, uint32_t{TOV_DEVICE_TYPE_CPU}, 0, cacheDirectory().c_str());
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

}  // namespace apitest
