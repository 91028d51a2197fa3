// The checks of the 27 functions, in their order and with their codes, and what is left alone when one fails.
#include "fixture.h"

namespace apitest {
namespace {

constexpr tov_image_desc kDesc = {7, 5, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};
constexpr int32_t kInvalid = TOV_ERROR_INVALID_PARAMETER;

class InterfaceContract : public DeviceTest {
 protected:
    void TearDown() override {
        EXPECT_EQ(out_, &foreign_) << "a failed call wrote its output";
        EXPECT_EQ(number_ + size_, 77u + 77u);
        EXPECT_EQ(text_[0], '#');
    }

    const Handle image_ = newImage(kDesc);
    const Handle filter_ = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION);
    const Handle queue_ = newQueue();
    void* const deleted_ = newImage(kDesc).remove();
    // A value for each of six setters; "cGamma" is a float.
    const std::vector<Value> values_ = {
        9.0f, 3u, Matrix{9}, tov_image{image_}, std::vector<float>(1), std::vector<tov_image>{image_}};
    uint64_t foreign_[8] = {};
    // Outputs, and what they hold before.
    void* out_ = &foreign_;
    uint32_t number_ = 77;
    uint64_t size_ = 77;
    char text_[128] = {'#'};
};

TEST_F(InterfaceContract, EveryFunctionRefusesEveryHandleThatIsNotOfItsKindBeforeAllElse) {
    for (void* h : {context(), tov_object{queue_}, tov_object{image_}, tov_object{filter_}, tov_object{nullptr},
                    tov_object{&foreign_}, deleted_}) {
        if (h != context()) {
            EXPECT_EQ(tovContextGetDeviceInfo(h, &number_, text_, 0, text_), TOV_ERROR_INVALID_CONTEXT);
            EXPECT_EQ(tovContextCreateImage(h, nullptr, nullptr, &out_), TOV_ERROR_INVALID_CONTEXT);
            EXPECT_EQ(tovContextCreateImageFromOpenClMemory(h, nullptr, nullptr, 0, &out_), TOV_ERROR_INVALID_CONTEXT);
            EXPECT_EQ(tovContextCreateImageFromOpenGlTexture(h, 0, 0, 0, &out_), TOV_ERROR_INVALID_CONTEXT);
            EXPECT_EQ(tovContextCreateImageFilter(h, 99, &out_), TOV_ERROR_INVALID_CONTEXT);
            EXPECT_EQ(tovContextCreateCommandQueue(h, nullptr), TOV_ERROR_INVALID_CONTEXT);
            EXPECT_EQ(tovContextExecuteCommandQueue(h, nullptr, nullptr, nullptr), TOV_ERROR_INVALID_CONTEXT);
        }
        if (h != queue_) {
            EXPECT_EQ(tovCommandQueueAttachImageFilter(h, nullptr, nullptr, nullptr), TOV_ERROR_INVALID_QUEUE);
            EXPECT_EQ(tovCommandQueueDetachImageFilter(h, nullptr), TOV_ERROR_INVALID_QUEUE);
            EXPECT_EQ(tovContextExecuteCommandQueue(context(), h, nullptr, nullptr), TOV_ERROR_INVALID_QUEUE);
        }
        if (h != image_) {
            EXPECT_EQ(tovImageGetInfo(h, 0, 0, nullptr, &size_), TOV_ERROR_INVALID_IMAGE);
            EXPECT_EQ(tovImageMap(h, 0, &out_), TOV_ERROR_INVALID_IMAGE);
            EXPECT_EQ(tovImageUnmap(h, nullptr), TOV_ERROR_INVALID_IMAGE);
        }
        if (h == filter_) continue;
        for (const Value& value : values_)
            EXPECT_EQ(setParameter(h, {nullptr, value}), TOV_ERROR_INVALID_FILTER) << value.index();
        EXPECT_EQ(tovImageFilterSetParameter2u(h, "srcRec", 1, 1), TOV_ERROR_INVALID_FILTER);
        EXPECT_EQ(tovImageFilterSetParameter3f(h, nullptr, 0, 0, 0), TOV_ERROR_INVALID_FILTER);
        EXPECT_EQ(tovImageFilterSetParameter4f(h, nullptr, 0, 0, 0, 0), TOV_ERROR_INVALID_FILTER);
        EXPECT_EQ(tovImageFilterGetInfo(h, 0, 0, nullptr, &size_), TOV_ERROR_INVALID_FILTER);
        EXPECT_EQ(tovParameterGetInfo(h, 0, 0, 8, text_, &size_), TOV_ERROR_INVALID_FILTER);
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue_, h, nullptr, nullptr), TOV_ERROR_INVALID_FILTER);
        EXPECT_EQ(tovCommandQueueDetachImageFilter(queue_, h), TOV_ERROR_INVALID_FILTER);
    }
}

TEST_F(InterfaceContract, OtherArgumentsAreCheckedInTheirOrder) {
    const tov_context c = context();
    auto* const cl = reinterpret_cast<_cl_context*>(&foreign_);
    auto* const memory = reinterpret_cast<_cl_mem*>(&foreign_);
    auto* const device = reinterpret_cast<_cl_device_id*>(&foreign_);
    EXPECT_EQ(tovGetDeviceCount(0, 1, nullptr), kInvalid);
    EXPECT_EQ(tovCreateContext(2, 0, 1, 0, "", nullptr), TOV_ERROR_INVALID_API_VERSION);
    EXPECT_EQ(tovCreateContext(1, 0, 1, -1, "", nullptr), kInvalid);
    for (const auto& [backend, index] : {std::pair{0u, -1}, {0u, 4096}, {2u, 0}})
        EXPECT_EQ(tovCreateContext(1, backend, 1, index, "", &out_), TOV_ERROR_INVALID_CONTEXT) << index;
    EXPECT_EQ(tovCreateContextFromOpenClContext(2, cl, device, nullptr, "", &out_), TOV_ERROR_INVALID_API_VERSION);
    EXPECT_EQ(tovCreateContextFromOpenClContext(1, cl, device, nullptr, "", &out_), kInvalid);
    EXPECT_EQ(tovContextGetDeviceInfo(c, nullptr, text_, 0, text_), kInvalid);
    EXPECT_EQ(tovContextGetDeviceInfo(c, &number_, nullptr, 0, text_), kInvalid);
    EXPECT_EQ(tovContextGetDeviceInfo(c, &number_, text_, 0, nullptr), kInvalid);
    EXPECT_EQ(tovContextCreateImage(c, nullptr, nullptr, nullptr), kInvalid);
    EXPECT_EQ(tovContextCreateImage(c, nullptr, nullptr, &out_), TOV_ERROR_INVALID_IMAGE_DESC);
    EXPECT_EQ(tovContextCreateImageFromOpenClMemory(c, nullptr, memory, 0, &out_), kInvalid);
    EXPECT_EQ(tovContextCreateImageFilter(c, 21, nullptr), kInvalid);
    EXPECT_EQ(tovContextCreateImageFilter(c, 21, &out_), TOV_ERROR_INVALID_OPERATION);
    EXPECT_EQ(tovContextCreateCommandQueue(c, nullptr), kInvalid);
    EXPECT_EQ(tovImageMap(image_, 0, nullptr), kInvalid);
    EXPECT_EQ(tovImageUnmap(image_, nullptr), kInvalid);
    EXPECT_EQ(tovParameterGetInfo(filter_, 1, 0, 8, text_, &size_), kInvalid) << "the index before the key";
    for (void* object : {static_cast<void*>(nullptr), deleted_}) EXPECT_EQ(tovObjectDelete(object), kInvalid);
}

TEST_F(InterfaceContract, QueriesWantRoomForTheWholeValueAndWriteNoMore) {
    using Query = std::function<int32_t(uint32_t key, uint64_t size, void* out, uint64_t* outSize)>;
    const Query image = [&](auto... rest) { return tovImageGetInfo(image_, rest...); };
    const Query filter = [&](auto... rest) { return tovImageFilterGetInfo(filter_, rest...); };
    const Query parameter = [&](auto... rest) { return tovParameterGetInfo(filter_, 0, rest...); };
    const std::tuple<const Query&, uint32_t, uint64_t> rows[] = {
        {image, TOV_IMAGE_DESC, 28},        {image, TOV_IMAGE_DATA_SIZE, 8},
        {filter, TOV_IMAGE_FILTER_TYPE, 4}, {filter, TOV_IMAGE_FILTER_PARAMETER_COUNT, 4},
        {parameter, TOV_PARAMETER_NAME, 8}, {filter, TOV_IMAGE_FILTER_DESCRIPTION, 8},
        {parameter, TOV_PARAMETER_TYPE, 4}, {parameter, TOV_PARAMETER_DESCRIPTION, 8},
        {parameter, TOV_PARAMETER_VALUE, 8}};
    for (const auto& [query, key, bytes] : rows) {
        std::string out(40, '#');
        uint64_t size = 0;
        EXPECT_EQ(query(key, bytes - 1, out.data(), &size_), kInvalid) << key;
        EXPECT_EQ(query(key, bytes, nullptr, &size_), kInvalid) << key;
        EXPECT_EQ(query(key, bytes, out.data(), nullptr), kInvalid) << key;
        EXPECT_EQ(query(0x7777, 40, out.data(), &size_), TOV_ERROR_UNSUPPORTED) << key;
        EXPECT_EQ(out, std::string(40, '#')) << key;
        EXPECT_EQ(query(key, UINT64_MAX, out.data(), &size), TOV_SUCCESS) << key;
        EXPECT_EQ(size, bytes);
        EXPECT_EQ(out.substr(bytes), std::string(40 - bytes, '#')) << key;
    }
}

TEST_F(InterfaceContract, SettersTakeTheirOwnTypeExactNamesAndLiveImagesAndLeaveOtherValuesAlone) {
    const Handle sum = newFilter(TOV_IMAGE_FILTER_WEIGHTED_SUM);
    const Handle motion = newFilter(TOV_IMAGE_FILTER_MOTION_BUFFER);
    tov_image good[] = {image_, nullptr, motion};
    EXPECT_EQ(tovImageFilterSetParameterImageArray(sum, "inputs", good, 3), TOV_SUCCESS);
    for (const Value& value : values_) {
        const int32_t code = value.index() == 1 ? TOV_SUCCESS : TOV_ERROR_UNSUPPORTED;
        EXPECT_EQ(setParameter(filter_, {"cGamma", value}), code) << value.index();
        for (const char* name : {"", "cgamma", "cGamma ", "srcRec", "srcBufferSize"})
            EXPECT_EQ(setParameter(filter_, {name, value}), TOV_ERROR_INVALID_PARAMETER_NAME) << name << value.index();
    }
    EXPECT_EQ(tovImageFilterSetParameter2u(filter_, nullptr, 1, 1), TOV_ERROR_INVALID_PARAMETER_NAME);
    EXPECT_EQ(tovImageFilterSetParameter2u(filter_, "dstBufferSize", 1, 2), TOV_ERROR_INVALID_PARAMETER_NAME);
    EXPECT_EQ(tovImageFilterSetParameter16f(motion, "viewProjMatrix", nullptr), kInvalid);
    EXPECT_EQ(tovImageFilterSetParameterFloatArray(sum, "weights", nullptr, 1), kInvalid);
    EXPECT_EQ(tovImageFilterSetParameterImageArray(sum, "inputs", nullptr, 2), kInvalid);
    EXPECT_EQ(tovImageFilterSetParameterImage(sum, "dstBuffer", motion), kInvalid) << "a filter as output";
    for (tov_object handle : {tov_object{queue_}, deleted_, tov_object{&foreign_}}) {
        tov_image bad[] = {image_, handle};
        EXPECT_EQ(tovImageFilterSetParameterImageArray(sum, "inputs", bad, 2), kInvalid);
        EXPECT_EQ(tovImageFilterSetParameterImage(sum, "no such name", handle), TOV_ERROR_INVALID_IMAGE);
    }
    tov_image* const* kept = nullptr;
    const float* value = nullptr;
    uint64_t size = 0;
    EXPECT_EQ(tovParameterGetInfo(filter_, 0, TOV_PARAMETER_VALUE, 8, &value, &size), TOV_SUCCESS);
    EXPECT_EQ(*value, 9.0f);
    EXPECT_EQ(tovParameterGetInfo(sum, 0, TOV_PARAMETER_VALUE, 8, &kept, &size), TOV_SUCCESS);
    EXPECT_EQ(*kept, good);
}

TEST_F(InterfaceContract, ACircleIsFoundAlsoBehindMoreWaysThanCanBeWalked) {
    const Handle first = newFilter(TOV_IMAGE_FILTER_MULTIPLY);
    std::vector<Handle> chain;
    tov_image last = first;
    for (int i = 0; i < 40; ++i) {
        tov_image both[] = {last, last};  // two edges each: 2^40 paths; hosts may reuse the array where nothing runs
        last = chain.emplace_back(newFilter(TOV_IMAGE_FILTER_MULTIPLY));
        ASSERT_EQ(tovImageFilterSetParameterImageArray(last, "inputs", both, 2), TOV_SUCCESS);
    }
    EXPECT_EQ(tovImageFilterSetParameterImage(first, "srcBuffer", last), kInvalid);
}

}  // namespace
}  // namespace apitest
