// Images: sizes, descriptors, mapping, and descriptors that no storage fits.
#include <cstring>

#include "fixture.h"

namespace apitest {
namespace {

constexpr uint32_t kByte = TOV_COMPONENT_TYPE_UINT8;
constexpr uint32_t kHalf = TOV_COMPONENT_TYPE_FLOAT16;
constexpr uint32_t kFloat = TOV_COMPONENT_TYPE_FLOAT32;

class Images : public DeviceTest {
 protected:
    static uint64_t dataSize(tov_image image) {
        uint64_t bytes = 0;
        uint64_t written = 0;
        EXPECT_EQ(tovImageGetInfo(image, TOV_IMAGE_DATA_SIZE, sizeof bytes, &bytes, &written), TOV_SUCCESS);
        return bytes;
    }
    static int32_t createWithData(const tov_image_desc& desc, const void* data) {
        Handle image;
        return tovContextCreateImage(context(), &desc, data, image.out());
    }
};

TEST_F(Images, DataSizeCountsRowPitchHeightAndComponentsOnly) {
    struct Row {
        tov_image_desc desc;
        uint64_t bytes;
    };
    const Row rows[] = {
        {{1920, 1080, 1, 0, 0, 4, kFloat}, 1920ull * 1080 * 16},
        {{1920, 1080, 1, 2048, 0, 4, kFloat}, 2048ull * 1080 * 16},
        {{1920, 1080, 1, 100, 0, 4, kFloat}, 100ull * 1080 * 16},
        {{5, 2, 1, 0, 0, 3, kByte}, 30},
        {{5, 2, 7, 0, 123, 1, kHalf}, 20},
        {{5, 2, 1, 0, 0, 4, 0}, 0},
        {{5, 2, 1, 0, 0, 4, 4}, 0},
        {{0, 2, 1, 0, 0, 4, kByte}, 0},
        {{0, 2, 1, 3, 0, 4, kByte}, 24},
        {{5, 0, 1, 8, 0, 4, kByte}, 0},
        {{5, 2, 1, 0, 0, 0, kByte}, 0},
        {{5, 2, 1, 0, 0, 9, kByte}, 90},
        {{65537, 65536, 1, 0, 0, 1, kByte}, 65536},  // 2^32 + 2^16: the low 32 bits
    };
    for (const Row& row : rows) EXPECT_EQ(dataSize(newImage(row.desc)), row.bytes);
}

TEST_F(Images, TheDescriptorComesBackAsItWasGiven) {
    const tov_image_desc given = {5, 2, 7, 0, 123, 9, 77};
    const Handle image = newImage(given);
    tov_image_desc desc;
    std::memset(&desc, 0xcd, sizeof desc);
    uint64_t written = 0;
    ASSERT_EQ(tovImageGetInfo(image, TOV_IMAGE_DESC, sizeof desc, &desc, &written), TOV_SUCCESS);
    EXPECT_EQ(std::memcmp(&desc, &given, sizeof desc), 0);
}

TEST_F(Images, UploadedBytesAreReadBackIncludingThePaddingOfRows) {
    const tov_image_desc desc = {3, 4, 1, 5, 0, 3, kByte};
    std::array<uint8_t, 5 * 4 * 3> bytes;
    for (size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<uint8_t>(i * 37 + 1);
    const Handle image = newImage(desc, bytes.data());
    void* pixels = nullptr;
    ASSERT_EQ(tovImageMap(image, 0xffffffff, &pixels), TOV_SUCCESS);
    EXPECT_EQ(std::memcmp(pixels, bytes.data(), bytes.size()), 0);
    std::memset(pixels, 0x5a, bytes.size());
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
    bytes.fill(0x5a);
    ASSERT_EQ(tovImageMap(image, 0, &pixels), TOV_SUCCESS);
    EXPECT_EQ(std::memcmp(pixels, bytes.data(), bytes.size()), 0) << "what the host wrote was lost";
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
}

TEST_F(Images, UnmapTakesOnlyPointersThatMapGaveAndEachAsOftenAsGiven) {
    const tov_image_desc desc = {7, 5, 1, 0, 0, 4, kFloat};
    const Handle image = newImage(desc);
    const Handle other = newImage(desc);
    void* pixels = nullptr;
    void* otherPixels = nullptr;
    int local = 0;
    ASSERT_EQ(tovImageMap(image, 0, &pixels), TOV_SUCCESS);
    ASSERT_EQ(tovImageMap(other, 0, &otherPixels), TOV_SUCCESS);
    EXPECT_EQ(tovImageUnmap(image, nullptr), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(image, &local), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(image, otherPixels), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(image, static_cast<char*>(pixels) + 4), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(other, otherPixels), TOV_SUCCESS);
    EXPECT_EQ(tovImageMap(image, 0, nullptr), TOV_ERROR_INVALID_PARAMETER);
}

TEST_F(Images, ImagesWithoutStorageExistButCannotBeMappedOrFilled) {
    const std::array<uint8_t, 64> data{};
    const tov_image_desc empty[] = {
        {5, 2, 1, 0, 0, 4, 0},
        {5, 2, 1, 0, 0, 4, 4},
        {0, 2, 1, 0, 0, 4, kByte},
        {5, 0, 1, 0, 0, 4, kByte},
        {5, 2, 1, 0, 0, 0, kByte},
        {0xffffffff, 0xffffffff, 1, 0, 0, 0xffffffff, kFloat},
        {0x10000, 0x10000, 1, 0, 0, 0x40000000, kFloat},  // 2^64 bytes: 0 in 64 bits
        {0x80000000, 0x80000000, 1, 0, 0, 4, kByte},      // 2^64 bytes, likewise
    };
    for (const tov_image_desc& desc : empty) {
        const Handle image = newImage(desc);
        void* pixels = this;
        EXPECT_EQ(tovImageMap(image, 0, &pixels), TOV_ERROR_INTERNAL_ERROR);
        EXPECT_EQ(pixels, this);
        EXPECT_EQ(createWithData(desc, data.data()), TOV_ERROR_INTERNAL_ERROR);
    }
}

TEST_F(Images, AnUploadOf4GibAndMoreIsRefusedInsteadOfWrapped) {
    const std::array<uint8_t, 64> data{};
    EXPECT_EQ(createWithData({65536, 65536, 1, 0, 0, 1, kByte}, data.data()), TOV_ERROR_INTERNAL_ERROR);
    EXPECT_EQ(createWithData({8, 4, 1, 0x8000002, 0, 4, kHalf}, data.data()), TOV_ERROR_INTERNAL_ERROR)
        << "2^32 + 64 bytes";
}

TEST_F(Images, AZeroWidthWithARowPitchHasStorage) {
    const tov_image_desc desc = {0, 2, 1, 3, 0, 4, kByte};
    std::array<uint8_t, 24> bytes;
    bytes.fill(7);
    const Handle image = newImage(desc, bytes.data());
    void* pixels = nullptr;
    ASSERT_EQ(tovImageMap(image, 0, &pixels), TOV_SUCCESS);
    EXPECT_EQ(std::memcmp(pixels, bytes.data(), bytes.size()), 0);
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
}

}  // namespace
}  // namespace apitest
