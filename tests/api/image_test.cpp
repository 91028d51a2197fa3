// Images: sizes, storage and mapping.
#include "fixture.h"

namespace apitest {
namespace {

constexpr uint32_t kByte = TOV_COMPONENT_TYPE_UINT8;
constexpr uint32_t kHalf = TOV_COMPONENT_TYPE_FLOAT16;
constexpr uint32_t kFloat = TOV_COMPONENT_TYPE_FLOAT32;

class Images : public DeviceTest {};

TEST_F(Images, AreOfTheSizeThatTheirDescriptorGivesAndWithoutStorageWhereThatIsNoneOrTooMuch) {
    const struct {
        uint64_t bytes;
        tov_image_desc desc;
        bool hasStorage;
    } rows[] = {
        {uint64_t{204} * 108 * 16, {192, 108, 1, 204, 0, 4, kFloat}, true},
        {uint64_t{100} * 108 * 16, {192, 108, 1, 100, 0, 4, kFloat}, true},
        {30, {5, 2, 1, 0, 0, 3, kByte}, true},
        {20, {5, 2, 7, 0, 123, 1, kHalf}, true},
        {24, {0, 2, 1, 3, 0, 4, kByte}, true},
        {0, {5, 2, 1, 0, 0, 4, 0}, false},
        {0, {5, 2, 1, 0, 0, 4, 4}, false},
        {0, {5, 0, 1, 8, 0, 4, kByte}, false},
        {0, {5, 2, 1, 0, 0, 0, kByte}, false},
        {0xffffffff, {0x10000, 0x10000, 1, 0, 0, 0x40000000, kFloat}, false},  // 2^64 bytes: 0 in 64 bits
        {0xffffffff, {0x80000000, 0x80000000, 1, 0, 0, 4, kByte}, false},      // 2^64 bytes, likewise
        {0x80000, {0x40000000, 0x8000, 1, 0x40000001, 0, 4, kFloat}, false},   // 2^49 + 2^19: the low 32 bits are told
    };
    const std::vector<std::byte> data(400000);
    for (const auto& [bytes, desc, hasStorage] : rows) {
        const Handle image = newImage(desc);
        uint64_t told = 77;
        uint64_t size = 0;
        void* pixels = this;
        EXPECT_EQ(tovImageGetInfo(image, TOV_IMAGE_DATA_SIZE, sizeof told, &told, &size), TOV_SUCCESS);
        EXPECT_EQ(told, bytes);
        EXPECT_EQ(tovImageMap(image, 0, &pixels), hasStorage ? TOV_SUCCESS : TOV_ERROR_INTERNAL_ERROR) << bytes;
        EXPECT_EQ(pixels != this, hasStorage);
        Handle full;
        const int32_t code = tovContextCreateImage(context(), &desc, data.data(), full.out());
        EXPECT_EQ(code, hasStorage ? TOV_SUCCESS : TOV_ERROR_INTERNAL_ERROR) << bytes;
    }
}

TEST_F(Images, KeepWhatIsUploadedAndWrittenWithThePaddingOfRows) {
    std::string bytes = "padding between rows and all, each byte another: 0123456789.";
    ASSERT_EQ(bytes.size(), 60u);
    const Handle image = newImage(tov_image_desc{3, 4, 1, 5, 0, 3, kByte}, bytes.data());
    for (const uint32_t flags : {0xffffffffu, 0u}) {
        void* pixels = nullptr;
        ASSERT_EQ(tovImageMap(image, flags, &pixels), TOV_SUCCESS);
        EXPECT_EQ(std::string(static_cast<char*>(pixels), 60), bytes);
        bytes.replace(0, 60, 60, 'z').copy(static_cast<char*>(pixels), 60);
        EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
    }
}

TEST_F(Images, UnmapTakesOnlyPointersThatMapGaveAndEachAsOftenAsGiven) {
    const Handle image = newImage(noise(7, 5));
    const Handle other = newImage(noise(7, 5));
    void* pixels = nullptr;
    void* otherPixels = nullptr;
    ASSERT_EQ(tovImageMap(image, 0, &pixels), TOV_SUCCESS);
    ASSERT_EQ(tovImageMap(other, 0, &otherPixels), TOV_SUCCESS);
    EXPECT_EQ(tovImageUnmap(image, &pixels), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(image, otherPixels), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(other, otherPixels), TOV_SUCCESS);
}

}  // namespace
}  // namespace apitest
