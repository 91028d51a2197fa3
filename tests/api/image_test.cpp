// Images: sizes, storage and mapping; and the access layer: every layout once as input and once as output, the values
// where rounding and clamping show, and rows with padding.
#include <algorithm>
#include <numeric>

#include "fixture.h"

namespace apitest {
namespace {

// A linear tone map with its default key of 1 multiplies by 1: it only reads and writes.
constexpr uint32_t kCopy = TOV_IMAGE_FILTER_LINEAR_TONEMAP;
constexpr uint32_t kByte = TOV_COMPONENT_TYPE_UINT8;
constexpr uint32_t kFloat = TOV_COMPONENT_TYPE_FLOAT32;

class Images : public DeviceTest {
 protected:
    static Picture copied(const Picture& input, Layout layout) {
        return run(kCopy, input, {}, Picture(input.width, input.height, layout));
    }
};

TEST_F(Images, AreOfTheSizeThatTheirDescriptorGivesAndWithoutStorageWhereThatIsNoneOrTooMuch) {
    const std::pair<uint64_t, tov_image_desc> rows[] = {
        {uint64_t{204} * 108 * 16, {192, 108, 1, 204, 0, 4, kFloat}},
        {20, {5, 2, 7, 0, 123, 1, TOV_COMPONENT_TYPE_FLOAT16}},
        {24, {0, 2, 1, 3, 0, 4, kByte}},
        {0, {5, 2, 1, 0, 0, 4, 4}},
        {0, {5, 0, 1, 8, 0, 4, kByte}},
        {0xffffffff, {0x10000, 0x10000, 1, 0, 0, 0x40000000, kFloat}},  // 2^64 bytes: 0 in 64 bits
        {0x80000, {0x40000000, 0x8000, 1, 0x40000001, 0, 4, kFloat}},   // 2^49 + 2^19: the low 32 bits are told
    };
    const std::vector<std::byte> data(400000);
    for (const auto& [bytes, desc] : rows) {
        const Handle image = newImage(desc);
        const int32_t code = bytes == 0 || desc.image_width > 1000 ? TOV_ERROR_INTERNAL_ERROR : TOV_SUCCESS;
        uint64_t told = 77;
        uint64_t size = 0;
        void* pixels = this;
        Handle full;
        EXPECT_EQ(tovImageGetInfo(image, TOV_IMAGE_DATA_SIZE, sizeof told, &told, &size), TOV_SUCCESS);
        EXPECT_EQ(told, bytes);
        EXPECT_EQ(tovImageMap(image, 0, &pixels), code) << bytes;
        EXPECT_EQ(pixels != this, code == TOV_SUCCESS);
        EXPECT_EQ(tovContextCreateImage(context(), &desc, data.data(), full.out()), code) << bytes;
    }
}

TEST_F(Images, KeepWhatIsWrittenAndUnmapWhatMapGaveAsOftenAsGiven) {
    const Handle image = newImage(Picture(7, 5));
    const Handle other = newImage(Picture(7, 5));
    void *pixels = nullptr, *foreign = nullptr;
    ASSERT_EQ(tovImageMap(image, 0xffffffff, &pixels), TOV_SUCCESS);
    ASSERT_EQ(tovImageMap(other, 0, &foreign), TOV_SUCCESS);
    static_cast<float*>(pixels)[139] = 3.0f;
    EXPECT_EQ(tovImageUnmap(image, foreign), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_SUCCESS);
    EXPECT_EQ(tovImageUnmap(image, pixels), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(tovImageUnmap(other, foreign), TOV_SUCCESS);
    EXPECT_EQ(read(image, Picture(7, 5)).values[139], 3.0f);
}

TEST_F(Images, OfEveryLayoutAreReadAndWrittenAsDefined) {
    const std::vector<Layout> layouts = allLayouts();
    for (size_t i = 0; i < layouts.size(); ++i) {
        const Layout source = layouts[i];
        const Layout destination = layouts[(i + 5) % layouts.size()];  // each is the destination once, too
        const Picture input = noise(7, 5, source, 1.4);
        const Picture expected = mapped(input, destination, [](const Rgba& rgba) { return rgba; });
        // Only grays are computed, and floats of bytes in their last digit; everything else is exact. One step of a
        // byte: a gray may fall on either side of one half. A half has 11 bits, a sum of floats 24.
        const bool isExact = destination.components > 2 && (destination.type != kFloat || source.type != kByte);
        const double inexact = destination.type == kByte ? 1.0 : destination.type == kFloat ? 2e-7 : 1.4 / 1024;
        EXPECT_LE(maxDifference(copied(input, destination), expected), isExact ? 0.0 : inexact) << i;
    }
}

TEST_F(Images, OfBytesAreClampedAndRoundedToEvenAndHoldAllTheirValues) {
    Picture input(2, 1);
    input.values = {1.2f, 0.5f, -0.1f, 1, 0.0019f, 0.0020f, 1e30f, -1e30f};  // 0.4845 and 0.51 steps
    EXPECT_EQ(copied(input, kByte4).values, (std::vector<float>{255, 128, 0, 255, 0, 1, 255, 0}));
    Picture bytes(16, 4, kByte4);
    std::iota(bytes.values.begin(), bytes.values.end(), 0.0f);
    EXPECT_EQ(maxDifference(copied(copied(bytes, kFloat4), kByte4), bytes), 0.0);
}

TEST_F(Images, AddressRowsByTheWidthAndWriteNothingBehindThem) {
    Picture input = noise(9, 5, {3, kByte});
    const Picture before = noise(9, 5, input.layout, 1.0, 2);
    const tov_image_desc desc = {7, 5, 1, 9, 0, 3, kByte};
    const Handle source = newImage(desc, input.encoded().data());
    const Handle destination = newImage(desc, before.encoded().data());
    ASSERT_EQ(execute(newFilter(kCopy), source, destination), TOV_SUCCESS);
    constexpr std::ptrdiff_t kWritten = 105;  // components of 7 x 5 pixels
    std::copy(before.values.begin() + kWritten, before.values.end(), input.values.begin() + kWritten);
    EXPECT_EQ(maxDifference(read(destination, input), input), 0.0);
}

}  // namespace
}  // namespace apitest
