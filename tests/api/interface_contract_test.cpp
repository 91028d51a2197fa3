// The checks of the 27 functions, in their order and with their codes, and what is left alone when one fails.
#include <cstring>

#include "fixture.h"

namespace apitest {
namespace {

struct Case {
    const char* what;
    int32_t code;
    int32_t expected;
};

void expectCodes(const std::vector<Case>& cases) {
    for (const Case& row : cases) EXPECT_EQ(row.code, row.expected) << row.what;
}

constexpr tov_image_desc kDesc = {7, 5, 1, 0, 0, 4, TOV_COMPONENT_TYPE_FLOAT32};

class InterfaceContract : public DeviceTest {
 protected:
    void SetUp() override {
        DeviceTest::SetUp();
        image_ = newImage(kDesc);
        filter_ = newFilter(TOV_IMAGE_FILTER_GAMMA_CORRECTION);
        queue_ = newQueue();
        Handle other = newImage(kDesc);
        deleted_ = other.remove();
    }

    // Everything that is not a live handle of the tag: null, foreign memory, deleted, and the other kinds.
    std::vector<void*> wrongHandles(uint32_t tag) {
        std::vector<void*> handles = {nullptr, &foreign_, deleted_};
        const std::array<void*, 4> live = {context(), queue_, image_, filter_};
        for (uint32_t i = 0; i < live.size(); ++i)
            if (i != tag) handles.push_back(live[i]);
        return handles;
    }

    Handle image_;
    Handle filter_;
    Handle queue_;
    void* deleted_ = nullptr;
    uint64_t foreign_[8] = {};
};

TEST_F(InterfaceContract, CountsOnlyDevicesOfTheOpenClBackEnd) {
    uint32_t count = 77;
    EXPECT_EQ(tovGetDeviceCount(0, TOV_DEVICE_TYPE_CPU, nullptr), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovGetDeviceCount(0, TOV_DEVICE_TYPE_CPU, &count), TOV_SUCCESS);
    EXPECT_GE(count, 1u);
    for (const uint32_t backend : {1u, 2u, 3u, 0xffffffffu}) {
        count = 77;
        EXPECT_EQ(tovGetDeviceCount(backend, TOV_DEVICE_TYPE_CPU, &count), TOV_SUCCESS);
        EXPECT_EQ(count, 0u) << "back end " << backend;
    }
    count = 77;
    EXPECT_EQ(tovGetDeviceCount(0, 2, &count), TOV_SUCCESS);
    EXPECT_EQ(count, 0u) << "an unknown device type";
}

TEST_F(InterfaceContract, ContextCreationChecksVersionThenOutputThenIndex) {
    uint32_t count = 0;
    ASSERT_EQ(tovGetDeviceCount(0, TOV_DEVICE_TYPE_CPU, &count), TOV_SUCCESS);
    void* const before = &foreign_;
    tov_context out = before;
    const auto create = [&](uint32_t version, uint32_t backend, int32_t index, tov_context* where) {
        return tovCreateContext(version, backend, TOV_DEVICE_TYPE_CPU, index, nullptr, where);
    };
    auto* const someContext = reinterpret_cast<_cl_context*>(&foreign_);
    auto* const someDevice = reinterpret_cast<_cl_device_id*>(&foreign_);
    auto* const someQueue = reinterpret_cast<_cl_command_queue*>(&foreign_);
    const auto adopt = [&](uint32_t version, _cl_context* c, _cl_device_id* d, _cl_command_queue* q, tov_context* o) {
        return tovCreateContextFromOpenClContext(version, c, d, q, nullptr, o);
    };
    expectCodes({
        {"version 2 before a null output", create(2, 0, 0, nullptr), TOV_ERROR_INVALID_API_VERSION},
        {"version 0", create(0, 0, 0, &out), TOV_ERROR_INVALID_API_VERSION},
        {"null output before a bad index", create(1, 0, -1, nullptr), TOV_ERROR_INVALID_PARAMETER},
        {"index -1", create(1, 0, -1, &out), TOV_ERROR_INVALID_CONTEXT},
        {"index = count", create(1, 0, static_cast<int32_t>(count), &out), TOV_ERROR_INVALID_CONTEXT},
        {"the largest index", create(1, 0, INT32_MAX, &out), TOV_ERROR_INVALID_CONTEXT},
        {"the smallest index", create(1, 0, INT32_MIN, &out), TOV_ERROR_INVALID_CONTEXT},
        {"back end 1", create(1, 1, 0, &out), TOV_ERROR_INVALID_CONTEXT},
        {"back end 2", create(1, 2, 0, &out), TOV_ERROR_INVALID_CONTEXT},
        {"device type 2", tovCreateContext(1, 0, 2, 0, nullptr, &out), TOV_ERROR_INVALID_CONTEXT},
        {"adopt: version", adopt(2, nullptr, nullptr, nullptr, nullptr), TOV_ERROR_INVALID_API_VERSION},
        {"adopt: no context", adopt(1, nullptr, someDevice, someQueue, &out), TOV_ERROR_INVALID_PARAMETER},
        {"adopt: no device", adopt(1, someContext, nullptr, someQueue, &out), TOV_ERROR_INVALID_PARAMETER},
        {"adopt: no queue", adopt(1, someContext, someDevice, nullptr, &out), TOV_ERROR_INVALID_PARAMETER},
        {"adopt: no output", adopt(1, someContext, someDevice, someQueue, nullptr), TOV_ERROR_INVALID_PARAMETER},
    });
    EXPECT_EQ(out, before);
}

TEST_F(InterfaceContract, RefusesEveryHandleThatIsNoContextWithoutTouchingOutputs) {
    void* const before = &foreign_;
    void* out = before;
    uint32_t type = 77;
    std::array<char, 128> text = {'x'};
    for (void* handle : wrongHandles(TOV_OBJECT_CONTEXT)) {
        expectCodes({
            {"info", tovContextGetDeviceInfo(handle, &type, text.data(), 0, text.data()), TOV_ERROR_INVALID_CONTEXT},
            {"image", tovContextCreateImage(handle, nullptr, nullptr, nullptr), TOV_ERROR_INVALID_CONTEXT},
            {"image with output", tovContextCreateImage(handle, &kDesc, nullptr, &out), TOV_ERROR_INVALID_CONTEXT},
            {"wrapped memory", tovContextCreateImageFromOpenClMemory(handle, nullptr, nullptr, 0, &out),
             TOV_ERROR_INVALID_CONTEXT},
            {"texture", tovContextCreateImageFromOpenGlTexture(handle, 0, 0, 0, &out), TOV_ERROR_INVALID_CONTEXT},
            {"filter", tovContextCreateImageFilter(handle, 99, &out), TOV_ERROR_INVALID_CONTEXT},
            {"queue", tovContextCreateCommandQueue(handle, &out), TOV_ERROR_INVALID_CONTEXT},
            {"execution", tovContextExecuteCommandQueue(handle, nullptr, nullptr, nullptr), TOV_ERROR_INVALID_CONTEXT},
        });
    }
    EXPECT_EQ(out, before);
    EXPECT_EQ(type, 77u);
    EXPECT_EQ(text[0], 'x');
}

TEST_F(InterfaceContract, RefusesEveryHandleThatIsNoImage) {
    uint64_t value = 77;
    uint64_t size = 77;
    void* pointer = &foreign_;
    for (void* handle : wrongHandles(TOV_OBJECT_IMAGE)) {
        expectCodes({
            {"info", tovImageGetInfo(handle, TOV_IMAGE_DATA_SIZE, 8, &value, &size), TOV_ERROR_INVALID_IMAGE},
            {"info, nothing else right", tovImageGetInfo(handle, 0, 0, nullptr, nullptr), TOV_ERROR_INVALID_IMAGE},
            {"map", tovImageMap(handle, 0, nullptr), TOV_ERROR_INVALID_IMAGE},
            {"map with output", tovImageMap(handle, 0, &pointer), TOV_ERROR_INVALID_IMAGE},
            {"unmap", tovImageUnmap(handle, nullptr), TOV_ERROR_INVALID_IMAGE},
        });
    }
    EXPECT_EQ(value, 77u);
    EXPECT_EQ(size, 77u);
    EXPECT_EQ(pointer, &foreign_);
}

TEST_F(InterfaceContract, RefusesEveryHandleThatIsNoFilter) {
    uint64_t value = 77;
    uint64_t size = 77;
    for (void* handle : wrongHandles(TOV_OBJECT_IMAGE_FILTER)) {
        expectCodes({
            {"1u", tovImageFilterSetParameter1u(handle, nullptr, 0), TOV_ERROR_INVALID_FILTER},
            {"2u", tovImageFilterSetParameter2u(handle, "srcRec", 1, 1), TOV_ERROR_INVALID_FILTER},
            {"1f", tovImageFilterSetParameter1f(handle, "cGamma", 1), TOV_ERROR_INVALID_FILTER},
            {"3f", tovImageFilterSetParameter3f(handle, nullptr, 0, 0, 0), TOV_ERROR_INVALID_FILTER},
            {"4f", tovImageFilterSetParameter4f(handle, nullptr, 0, 0, 0, 0), TOV_ERROR_INVALID_FILTER},
            {"16f", tovImageFilterSetParameter16f(handle, nullptr, nullptr), TOV_ERROR_INVALID_FILTER},
            {"image", tovImageFilterSetParameterImage(handle, nullptr, nullptr), TOV_ERROR_INVALID_FILTER},
            {"floats", tovImageFilterSetParameterFloatArray(handle, nullptr, nullptr, 1), TOV_ERROR_INVALID_FILTER},
            {"images", tovImageFilterSetParameterImageArray(handle, nullptr, nullptr, 1), TOV_ERROR_INVALID_FILTER},
            {"info", tovImageFilterGetInfo(handle, 0, 0, nullptr, nullptr), TOV_ERROR_INVALID_FILTER},
            {"parameter", tovParameterGetInfo(handle, 0, TOV_PARAMETER_NAME, 8, &value, &size),
             TOV_ERROR_INVALID_FILTER},
            {"attach", tovCommandQueueAttachImageFilter(queue_, handle, nullptr, nullptr), TOV_ERROR_INVALID_FILTER},
            {"detach", tovCommandQueueDetachImageFilter(queue_, handle), TOV_ERROR_INVALID_FILTER},
        });
    }
    EXPECT_EQ(value, 77u);
    EXPECT_EQ(size, 77u);
}

TEST_F(InterfaceContract, RefusesEveryHandleThatIsNoQueue) {
    for (void* handle : wrongHandles(TOV_OBJECT_COMMAND_QUEUE)) {
        expectCodes({
            {"attach", tovCommandQueueAttachImageFilter(handle, nullptr, nullptr, nullptr), TOV_ERROR_INVALID_QUEUE},
            {"detach", tovCommandQueueDetachImageFilter(handle, nullptr), TOV_ERROR_INVALID_QUEUE},
            {"execute", tovContextExecuteCommandQueue(context(), handle, nullptr, nullptr), TOV_ERROR_INVALID_QUEUE},
        });
    }
}

TEST_F(InterfaceContract, CreationsCheckTheirOtherArgumentsAfterTheContext) {
    void* const before = &foreign_;
    void* out = before;
    auto* const memory = reinterpret_cast<_cl_mem*>(&foreign_);
    const tov_context c = context();
    expectCodes({
        {"image: output first", tovContextCreateImage(c, nullptr, nullptr, nullptr), TOV_ERROR_INVALID_PARAMETER},
        {"image: descriptor", tovContextCreateImage(c, nullptr, nullptr, &out), TOV_ERROR_INVALID_IMAGE_DESC},
        {"memory: descriptor", tovContextCreateImageFromOpenClMemory(c, nullptr, memory, 0, &out),
         TOV_ERROR_INVALID_PARAMETER},
        {"memory: memory", tovContextCreateImageFromOpenClMemory(c, &kDesc, nullptr, 0, &out),
         TOV_ERROR_INVALID_PARAMETER},
        {"memory: output", tovContextCreateImageFromOpenClMemory(c, &kDesc, memory, 0, nullptr),
         TOV_ERROR_INVALID_PARAMETER},
        {"texture: output", tovContextCreateImageFromOpenGlTexture(c, 0x0de1, 0, 1, nullptr),
         TOV_ERROR_INVALID_PARAMETER},
        {"texture: nothing current", tovContextCreateImageFromOpenGlTexture(c, 0x0de1, 0, 1, &out), TOV_ERROR_OPENGL},
        {"filter: output before type", tovContextCreateImageFilter(c, 21, nullptr), TOV_ERROR_INVALID_PARAMETER},
        {"filter: type 21", tovContextCreateImageFilter(c, 21, &out), TOV_ERROR_INVALID_OPERATION},
        {"filter: type -1", tovContextCreateImageFilter(c, 0xffffffffu, &out), TOV_ERROR_INVALID_OPERATION},
        {"queue: output", tovContextCreateCommandQueue(c, nullptr), TOV_ERROR_INVALID_PARAMETER},
    });
    EXPECT_EQ(out, before);
}

TEST_F(InterfaceContract, ImageQueriesWantRoomForTheWholeValue) {
    std::array<unsigned char, 32> out;
    out.fill(0xcd);
    const auto untouched = out;
    uint64_t written = 77;
    const auto query = [&](uint32_t key, uint64_t size) {
        return tovImageGetInfo(image_, key, size, out.data(), &written);
    };
    expectCodes({
        {"no output", tovImageGetInfo(image_, TOV_IMAGE_DESC, 28, nullptr, &written), TOV_ERROR_INVALID_PARAMETER},
        {"no size output", tovImageGetInfo(image_, TOV_IMAGE_DESC, 28, out.data(), nullptr),
         TOV_ERROR_INVALID_PARAMETER},
        {"size 0 of an unknown key", query(771, 0), TOV_ERROR_INVALID_PARAMETER},
        {"27 bytes", query(769, 27), TOV_ERROR_INVALID_PARAMETER},
        {"7 bytes", query(770, 7), TOV_ERROR_INVALID_PARAMETER},
        {"key 771", query(771, 32), TOV_ERROR_UNSUPPORTED},
        {"key 768", query(768, 1), TOV_ERROR_UNSUPPORTED},
    });
    EXPECT_EQ(out, untouched);
    EXPECT_EQ(written, 77u);

    EXPECT_EQ(query(769, 28), TOV_SUCCESS);
    EXPECT_EQ(written, 28u);
    EXPECT_EQ(std::memcmp(out.data(), &kDesc, 28), 0);
    EXPECT_EQ(out[28], 0xcd) << "a byte beyond the descriptor was written";
    EXPECT_EQ(query(770, UINT64_MAX), TOV_SUCCESS);
    EXPECT_EQ(written, 8u);
}

TEST_F(InterfaceContract, FilterAndParameterQueriesWantRoomForTheWholeValue) {
    std::array<unsigned char, 16> out;
    out.fill(0xcd);
    const auto untouched = out;
    uint64_t written = 77;
    const auto filterInfo = [&](uint32_t key, uint64_t size) {
        return tovImageFilterGetInfo(filter_, key, size, out.data(), &written);
    };
    const auto parameterInfo = [&](uint32_t index, uint32_t key, uint64_t size) {
        return tovParameterGetInfo(filter_, index, key, size, out.data(), &written);
    };
    expectCodes({
        {"type, 3 bytes", filterInfo(TOV_IMAGE_FILTER_TYPE, 3), TOV_ERROR_INVALID_PARAMETER},
        {"count, 3 bytes", filterInfo(TOV_IMAGE_FILTER_PARAMETER_COUNT, 3), TOV_ERROR_INVALID_PARAMETER},
        {"text, 7 bytes", filterInfo(TOV_IMAGE_FILTER_DESCRIPTION, 7), TOV_ERROR_INVALID_PARAMETER},
        {"filter key 3", filterInfo(3, 16), TOV_ERROR_UNSUPPORTED},
        {"index before key", parameterInfo(1, 0, 16), TOV_ERROR_INVALID_PARAMETER},
        {"size 0 before index", parameterInfo(99, TOV_PARAMETER_NAME, 0), TOV_ERROR_INVALID_PARAMETER},
        {"key 0x1201", parameterInfo(0, 0x1201, 16), TOV_ERROR_UNSUPPORTED},
        {"name, 7 bytes", parameterInfo(0, TOV_PARAMETER_NAME, 7), TOV_ERROR_INVALID_PARAMETER},
        {"type, 3 bytes", parameterInfo(0, TOV_PARAMETER_TYPE, 3), TOV_ERROR_INVALID_PARAMETER},
        {"description, 7 bytes", parameterInfo(0, TOV_PARAMETER_DESCRIPTION, 7), TOV_ERROR_INVALID_PARAMETER},
        {"value, 7 bytes", parameterInfo(0, TOV_PARAMETER_VALUE, 7), TOV_ERROR_INVALID_PARAMETER},
    });
    EXPECT_EQ(out, untouched);
    EXPECT_EQ(written, 77u);
    EXPECT_EQ(parameterInfo(0, TOV_PARAMETER_TYPE, 4), TOV_SUCCESS);
    EXPECT_EQ(written, 4u);
    EXPECT_EQ(out[4], 0xcd) << "a byte beyond the type was written";
}

TEST_F(InterfaceContract, DeviceInfoFillsTwoBuffersOf128BytesAndNoMore) {
    std::array<char, 136> name;
    std::array<char, 136> vendor;
    name.fill('#');
    vendor.fill('#');
    uint32_t type = 77;
    expectCodes({
        {"type", tovContextGetDeviceInfo(context(), nullptr, name.data(), 0, vendor.data()),
         TOV_ERROR_INVALID_PARAMETER},
        {"name", tovContextGetDeviceInfo(context(), &type, nullptr, 0, vendor.data()), TOV_ERROR_INVALID_PARAMETER},
        {"vendor", tovContextGetDeviceInfo(context(), &type, name.data(), 0, nullptr), TOV_ERROR_INVALID_PARAMETER},
    });
    EXPECT_EQ(type, 77u);
    EXPECT_EQ(name[0], '#');
    ASSERT_EQ(tovContextGetDeviceInfo(context(), &type, name.data(), 0xdeadbeef, vendor.data()), TOV_SUCCESS);
    EXPECT_EQ(type, TOV_DEVICE_TYPE_CPU);
    EXPECT_GT(strnlen(name.data(), 128), 0u);
    EXPECT_LT(strnlen(name.data(), 128), 128u) << "the text is not terminated";
    EXPECT_NE(name[0], ' ');
    EXPECT_LT(strnlen(vendor.data(), 128), 128u) << "the text is not terminated";
    EXPECT_EQ(name[128], '#');
    EXPECT_EQ(vendor[128], '#');
}

TEST_F(InterfaceContract, EveryHandleIsDeletedOnce) {
    EXPECT_EQ(tovObjectDelete(nullptr), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovObjectDelete(&foreign_), TOV_ERROR_INVALID_PARAMETER);
    for (Handle* handle : {&image_, &filter_, &queue_}) {
        tov_object object = *handle;
        EXPECT_EQ(tovObjectDelete(object), TOV_SUCCESS);
        EXPECT_EQ(tovObjectDelete(object), TOV_ERROR_INVALID_PARAMETER);
        *handle->out() = nullptr;
    }
}

}  // namespace
}  // namespace apitest
