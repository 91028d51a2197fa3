// Failures of the driver: any call, at any time, gives a code, leaks nothing and leaves the queue usable. And what no
// real machine offers: several platforms, none, devices with little memory.
#include <algorithm>
#include <numeric>

#include "standin_fixture.h"

namespace apitest {
namespace {

using testing::AnyOf;
using testing::Eq;

constexpr tov_image_desc kDesc = {20, 9, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};

const std::vector<const char*> kCalls = {
    "clGetPlatformIDs",
    "clGetPlatformInfo",
    "clGetDeviceIDs",
    "clGetDeviceInfo",
    "clCreateContext",
    "clCreateCommandQueue",
    "clCreateBuffer",
    "clCreateProgramWithSource",
    "clBuildProgram",
    "clGetProgramInfo",
    "clCreateKernel",
    "clSetKernelArg",
    "clEnqueueNDRangeKernel",
    "clEnqueueMapBuffer",
    "clEnqueueUnmapMemObject",
    "clEnqueueCopyBuffer",
    "clFinish",
    "clReleaseMemObject",
    "clReleaseKernel",
    "clReleaseProgram",
    "clReleaseCommandQueue",
    "clReleaseContext",
};

// A host that makes, runs and deletes everything, and goes on where a call fails.
class Session {
 public:
    explicit Session(uint32_t type) {
        const std::vector<unsigned char> pixels(20 * 9 * 16, 1);
        keep(tovCreateContext(TOV_API_VERSION, 0, TOV_DEVICE_TYPE_GPU, 0, kNoCache, &context_));
        keep(tovContextCreateImage(context_, &kDesc, pixels.data(), &image_));
        keep(tovContextCreateImageFilter(context_, type, &filter_));
        keep(tovContextCreateCommandQueue(context_, &queue_));
        if (filter_ == nullptr || queue_ == nullptr || image_ == nullptr) return;
        tovImageFilterSetParameter1f(filter_, "sigma", 1.0f);
        tovImageFilterSetParameterImage(filter_, "positionsImg", image_);
        keep(tovCommandQueueAttachImageFilter(queue_, filter_, image_, image_));
        isReady_ = true;
        execute();
        void* mapped = nullptr;
        keep(tovImageMap(image_, 0, &mapped));
        if (mapped != nullptr) keep(tovImageUnmap(image_, mapped));
    }
    Session(const Session&) = delete;
    Session& operator=(const Session&) = delete;
    ~Session() {
        for (void* object : {queue_, filter_, image_, context_})
            if (object != nullptr) tovObjectDelete(object);
    }

    void execute() { keep(tovContextExecuteCommandQueue(context_, queue_, nullptr, nullptr)); }
    bool isReady() const { return isReady_; }
    int32_t latest() const { return codes_.back(); }
    const std::vector<int32_t>& codes() const { return codes_; }

 private:
    void keep(int32_t code) { codes_.push_back(code); }

    tov_context context_ = nullptr;
    tov_image image_ = nullptr;
    tov_image_filter filter_ = nullptr;
    tov_command_queue queue_ = nullptr;
    bool isReady_ = false;
    std::vector<int32_t> codes_;
};

class DriverFailures : public StandinTest, public testing::WithParamInterface<const char*> {};

TEST_P(DriverFailures, GiveACodeLeakNothingAndLeaveTheQueueUsable) {
    const std::string call = GetParam();
    const bool releases = call.find("clRelease") == 0;
    size_t failures = 0;
    for (const uint32_t type :
         {TOV_IMAGE_FILTER_GAMMA_CORRECTION, TOV_IMAGE_FILTER_GAUSSIAN_BLUR, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION}) {
        for (uint32_t at = 1; at < 200; ++at) {
            driver().reset();
            driver().fail(call, CL_OUT_OF_RESOURCES, at);
            testing::internal::CaptureStdout();  // the lines that name each failure
            {
                const Session session(type);
                const size_t happened = driver().callCount(call);
                for (const int32_t code : session.codes())
                    EXPECT_THAT(code,
                                AnyOf(Eq(TOV_SUCCESS), Eq(TOV_ERROR_INTERNAL_ERROR), Eq(TOV_ERROR_INVALID_CONTEXT)))
                        << call << " number " << at;
                if (session.isReady() && happened >= at) {
                    const_cast<Session&>(session).execute();
                    EXPECT_EQ(session.latest(), TOV_SUCCESS) << "after a failure of " << call << " number " << at;
                }
            }
            const std::string printed = testing::internal::GetCapturedStdout();
            if (driver().callCount(call) < at) break;  // the whole session has fewer such calls
            ++failures;
            // A driver that fails to release an object keeps it; whatever else we leave behind is our leak.
            EXPECT_LE(driver().liveObjects(), releases ? 1u : 0u) << call << " number " << at;
            driver().live.clear();
            driver().maps.clear();
        }
    }
    EXPECT_GT(failures, 0u) << call << " is never made";
    EXPECT_THAT(driver().misuse, testing::IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(All, DriverFailures, testing::ValuesIn(kCalls),
                         [](const auto& row) { return std::string(row.param); });

class DriverOffers : public StandinTest {
 protected:
    static uint32_t count(uint32_t type) {
        uint32_t devices = 77;
        EXPECT_EQ(tovGetDeviceCount(0, type, &devices), TOV_SUCCESS);
        return devices;
    }
    static std::string deviceName(int32_t index) {
        tov_context context = nullptr;
        const int32_t code = tovCreateContext(1, 0, TOV_DEVICE_TYPE_GPU, index, kNoCache, &context);
        if (code != TOV_SUCCESS) return "code " + std::to_string(code);
        std::array<char, 128> name{};
        std::array<char, 128> vendor{};
        uint32_t type = 77;
        EXPECT_EQ(tovContextGetDeviceInfo(context, &type, name.data(), 0, vendor.data()), TOV_SUCCESS);
        EXPECT_EQ(type, TOV_DEVICE_TYPE_GPU);
        EXPECT_EQ(tovObjectDelete(context), TOV_SUCCESS);
        return name.data();
    }
};

TEST_F(DriverOffers, DevicesAreIndexedAcrossPlatformsInPlatformOrder) {
    driver().platforms = {{.vendor = "Apple", .devices = {standin::gpu("A0"), standin::cpu("C"), standin::gpu("A1")}},
                          {.vendor = "nobody", .devices = {}},
                          {.vendor = "Intel(R) Corporation", .devices = {standin::gpu("   B0")}}};
    EXPECT_EQ(count(TOV_DEVICE_TYPE_GPU), 3u);
    EXPECT_EQ(count(TOV_DEVICE_TYPE_CPU), 1u);
    EXPECT_EQ(deviceName(0), "A0");
    EXPECT_EQ(deviceName(1), "A1");
    EXPECT_EQ(deviceName(2), "B0");
    EXPECT_EQ(deviceName(3), "code " + std::to_string(TOV_ERROR_INVALID_CONTEXT));
}

TEST_F(DriverOffers, NoPlatformMeansNoDevicesAndNoError) {
    driver().platforms = {};
    EXPECT_EQ(count(TOV_DEVICE_TYPE_GPU), 0u);
    EXPECT_EQ(deviceName(0), "code " + std::to_string(TOV_ERROR_INVALID_CONTEXT));
}

TEST_F(DriverOffers, LongDeviceTextsAreCutToTheCallersBuffers) {
    driver().platforms.at(0).devices.at(0).name = "  " + std::string(300, 'n');
    driver().platforms.at(0).devices.at(0).vendor = std::string(300, 'v');
    tov_context context = newContext();
    std::array<char, 129> name;
    std::array<char, 129> vendor;
    name.fill('#');
    vendor.fill('#');
    uint32_t type = 0;
    ASSERT_EQ(tovContextGetDeviceInfo(context, &type, name.data(), 0, vendor.data()), TOV_SUCCESS);
    EXPECT_EQ(std::string(name.data()), std::string(127, 'n'));
    EXPECT_EQ(std::string(vendor.data()), std::string(127, 'v'));
    EXPECT_EQ(name[128], '#');
    EXPECT_EQ(vendor[128], '#');
    EXPECT_EQ(tovObjectDelete(context), TOV_SUCCESS);
}

TEST_F(DriverOffers, LittleMemoryRefusesImagesScratchAndStateAndThenTriesAgain) {
    standin::Device& device = driver().platforms.at(0).devices.at(0);
    device.globalMemory = (uint64_t{256} << 20) + 20000;  // 20000 bytes beyond what is kept free
    tov_context context = newContext();
    const tov_image_desc quarter = {16, 16, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};  // 4096 bytes
    const tov_image_desc large = {16, 78, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};    // 19968 bytes
    const std::vector<unsigned char> pixels(20000, 1);
    tov_image input = newImage(context, quarter, SOURCE);
    tov_image output = newImage(context, quarter, DESTINATION);
    tov_image refused = nullptr;
    EXPECT_EQ(tovContextCreateImage(context, &large, pixels.data(), &refused), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(refused, nullptr);
    tov_image filler = newImage(context, {16, 32, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32}, AUXILIARY);  // 8192

    tov_image_filter blur = nullptr;          // needs 4096 bytes of scratch
    tov_image_filter accumulation = nullptr;  // needs 28672 bytes of state
    tov_command_queue queue = nullptr;
    ASSERT_EQ(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_GAUSSIAN_BLUR, &blur), TOV_SUCCESS);
    ASSERT_EQ(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, &accumulation), TOV_SUCCESS);
    ASSERT_EQ(tovContextCreateCommandQueue(context, &queue), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter1f(blur, "sigma", 1.0f), TOV_SUCCESS);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, blur, input, output), TOV_SUCCESS);
    const auto execute = [&] { return tovContextExecuteCommandQueue(context, queue, nullptr, nullptr); };
    EXPECT_EQ(execute(), TOV_ERROR_INTERNAL_ERROR) << "16384 bytes and 1 are used, 4096 more do not fit";
    EXPECT_THAT(driver().launches, testing::IsEmpty());
    EXPECT_EQ(tovObjectDelete(filler), TOV_SUCCESS);
    EXPECT_EQ(execute(), TOV_SUCCESS) << "the next run tries again";
    EXPECT_EQ(driver().launches.size(), 2u);

    ASSERT_EQ(tovCommandQueueDetachImageFilter(queue, blur), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameterImage(accumulation, "positionsImg", input), TOV_SUCCESS);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, accumulation, input, output), TOV_SUCCESS);
    EXPECT_EQ(execute(), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(execute(), TOV_ERROR_INTERNAL_ERROR) << "a size recorded without its buffer would run now";
    EXPECT_EQ(driver().launches.size(), 2u);
    for (void* object : {queue, accumulation, blur, output, input, context})
        EXPECT_EQ(tovObjectDelete(object), TOV_SUCCESS);
}

TEST_F(DriverOffers, HistoryIsClearedWhenItGrowsAndKeptOtherwise) {
    tov_context context = newContext();
    std::vector<void*> objects = {context};
    const auto image = [&](uint32_t width) {
        objects.push_back(newImage(context, {width, 10, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32}, SOURCE));
        return objects.back();
    };
    tov_image_filter filter = nullptr;
    tov_command_queue queue = nullptr;
    ASSERT_EQ(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_TEMPORAL_ACCUMULATION, &filter), TOV_SUCCESS);
    ASSERT_EQ(tovContextCreateCommandQueue(context, &queue), TOV_SUCCESS);
    objects.insert(objects.end(), {filter, queue});
    std::vector<std::pair<size_t, int>> seen;  // bytes of the state buffer and its first byte, at the last pass
    driver().onLaunch = [&](const standin::Launch& launch) {
        if (launch.kernel != "SwapOutToIn") return;
        size_t bytes = 0;
        unsigned char* state = standin::bytesOf(launch.arguments.at(3).as<cl_mem>(), &bytes);
        seen.emplace_back(bytes, std::accumulate(state, state + bytes, 0));
        *state = 1;
    };
    for (const uint32_t width : {10u, 10u, 20u, 5u}) {
        const tov_image bound = image(width);
        ASSERT_EQ(tovImageFilterSetParameterImage(filter, "positionsImg", bound), TOV_SUCCESS);
        tovCommandQueueAttachImageFilter(queue, filter, bound, bound);  // from the second time on only rebinds
        ASSERT_EQ(tovContextExecuteCommandQueue(context, queue, nullptr, nullptr), TOV_SUCCESS);
    }
    using Seen = std::vector<std::pair<size_t, int>>;
    EXPECT_EQ(seen, (Seen{{11200, 0}, {11200, 1}, {22400, 0}, {22400, 1}}));
    driver().onLaunch = nullptr;
    for (auto object = objects.rbegin(); object != objects.rend(); ++object)
        EXPECT_EQ(tovObjectDelete(*object), TOV_SUCCESS);
}

TEST_F(DriverOffers, ADeviceThatRunsOnlySmallGroupsGetsSmallGroups) {
    driver().platforms.at(0).devices.at(0).workItemSizes = {4, 2, 1};
    const Session session(TOV_IMAGE_FILTER_GAMMA_CORRECTION);
    EXPECT_EQ(session.codes(), std::vector<int32_t>(session.codes().size(), TOV_SUCCESS));
    ASSERT_EQ(driver().launches.size(), 1u);
    EXPECT_EQ(driver().launches[0].local, (std::vector<size_t>{4, 2}));
    EXPECT_EQ(driver().launches[0].global, (std::vector<size_t>{20, 10}));
}

TEST_F(DriverOffers, ObjectsAreDeletedInAnyOrderWithoutALeakOrAUseAfterwards) {
    std::array<int, 5> order = {0, 1, 2, 3, 4};
    do {
        std::array<void*, 5> objects{};
        auto& [context, input, output, filter, queue] = objects;
        context = newContext();
        input = newImage(context, kDesc, SOURCE);
        output = newImage(context, kDesc, DESTINATION);
        ASSERT_EQ(tovContextCreateImageFilter(context, TOV_IMAGE_FILTER_MLAA, &filter), TOV_SUCCESS);
        ASSERT_EQ(tovContextCreateCommandQueue(context, &queue), TOV_SUCCESS);
        ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
        ASSERT_EQ(tovContextExecuteCommandQueue(context, queue, nullptr, nullptr), TOV_SUCCESS);
        void* pixels = nullptr;
        ASSERT_EQ(tovImageMap(output, 0, &pixels), TOV_SUCCESS);
        for (const int index : order) {
            EXPECT_EQ(tovObjectDelete(objects[static_cast<size_t>(index)]), TOV_SUCCESS);
            const int32_t code = tovContextExecuteCommandQueue(context, queue, nullptr, nullptr);
            EXPECT_LT(code, 0) << "something that it needs is gone";
        }
        ASSERT_EQ(driver().liveObjects(), 0u) << testing::PrintToString(order);
        ASSERT_TRUE(driver().maps.empty()) << testing::PrintToString(order);
    } while (std::next_permutation(order.begin(), order.end()));
}

}  // namespace
}  // namespace apitest
