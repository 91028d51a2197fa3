// The access layer: every layout once as input and once as output, and the values where rounding and clamping show.
#include <algorithm>
#include <cstring>

#include "fixture.h"

namespace apitest {
namespace {

// A linear tone map with its default key of 1 multiplies by 1: it only reads and writes.
constexpr uint32_t kCopy = TOV_IMAGE_FILTER_LINEAR_TONEMAP;

class PixelLayouts : public DeviceTest {
 protected:
    static Picture copied(const Picture& input, Layout layout) {
        return run(kCopy, input, {}, Picture(input.width, input.height, layout));
    }
};

class EveryLayout : public PixelLayouts, public testing::WithParamInterface<size_t> {};

TEST_P(EveryLayout, IsReadAndWrittenAsDefined) {
    const std::vector<Layout> layouts = allLayouts();
    const Layout source = layouts[GetParam()];
    const Layout destination = layouts[(GetParam() + 5) % layouts.size()];  // each is the destination once, too
    const Picture input = noise(7, 5, source, 1.4);
    const Picture expected = mapped(input, destination, [](const Rgba& rgba) { return rgba; });
    // One step of a byte: a gray may fall on either side of one half. A half has 11 bits, a sum of floats 24.
    const double tolerance = destination.type == TOV_COMPONENT_TYPE_UINT8     ? 1.0
                             : destination.type == TOV_COMPONENT_TYPE_FLOAT16 ? 1.4 / 1024
                                                                              : 2e-7;
    const Picture output = copied(input, destination);
    EXPECT_LE(maxDifference(output, expected), tolerance);
    size_t wrong = 0;
    for (size_t i = 0; i < output.values.size(); ++i) wrong += output.values[i] != expected.values[i] ? 1 : 0;
    // Only grays are computed; everything else must be exact, floats of bytes to their last digit aside.
    const bool isExact = destination.components > 2 &&
                         (destination.type != TOV_COMPONENT_TYPE_FLOAT32 || source.type != TOV_COMPONENT_TYPE_UINT8);
    if (isExact) {
        EXPECT_EQ(wrong, 0u);
    }
}

INSTANTIATE_TEST_SUITE_P(All, EveryLayout, testing::Range<size_t>(0, 12));

TEST_F(PixelLayouts, BytesAreReadAs255thsAndWrittenClampedAndRoundedToEven) {
    Picture bytes(7, 5, kByte4);
    const float pixel[] = {255, 128, 0, 255};
    std::copy(pixel, pixel + 4, bytes.values.begin());
    const Picture floats = copied(bytes, kFloat4);
    EXPECT_EQ(floats.values[0], 1.0f);
    EXPECT_NEAR(floats.values[1], 128.0 / 255.0, 6e-8);
    EXPECT_EQ(floats.values[2], 0.0f);
    EXPECT_EQ(floats.values[3], 1.0f);

    Picture input(7, 5);
    const float source[] = {1.2f, 0.5f, -0.1f, 1, 0.0019f, 0.0020f, 1e30f, -1e30f};  // 0.4845 and 0.51 steps
    std::copy(source, source + 8, input.values.begin());
    const Picture output = copied(input, kByte4);
    const std::vector<float> expected = {255, 128, 0, 255, 0, 1, 255, 0};
    EXPECT_EQ(std::vector<float>(output.values.begin(), output.values.begin() + 8), expected);
}

TEST_F(PixelLayouts, EveryByteSurvivesARoundTrip) {
    Picture input(16, 16, {4, TOV_COMPONENT_TYPE_UINT8});
    for (size_t i = 0; i < input.values.size(); ++i) input.values[i] = static_cast<float>(i % 256);
    EXPECT_EQ(maxDifference(copied(input, kByte4), input), 0.0);
}

TEST_F(PixelLayouts, GrayIsTheMeanOfRedGreenAndBlue) {
    const Picture input = painted(7, 5, kFloat4, [](uint32_t, uint32_t) { return Rgba{0.2, 0.4, 0.9, 0.5}; });
    EXPECT_NEAR(copied(input, {1, TOV_COMPONENT_TYPE_FLOAT32}).values[0], 0.5, 6e-8);
    const Picture bytes = copied(input, {2, TOV_COMPONENT_TYPE_UINT8});
    EXPECT_EQ(bytes.values[0], 128.0f);
    EXPECT_EQ(bytes.values[1], 128.0f);
}

TEST_F(PixelLayouts, HalvesKeepValuesBeyondOneAndBelowZero) {
    Picture input(7, 5);
    const float source[] = {-2.5f, 1000.0f, 6e-8f, 65504.0f};
    std::copy(source, source + 4, input.values.begin());
    const Picture output = copied(input, {4, TOV_COMPONENT_TYPE_FLOAT16});
    EXPECT_EQ(output.values[0], -2.5f);
    EXPECT_EQ(output.values[1], 1000.0f);
    EXPECT_NEAR(output.values[2], 6e-8, 6e-8) << "the smallest half, or 0 on a device without denormals";
    EXPECT_EQ(output.values[3], 65504.0f);
}

TEST_F(PixelLayouts, RowsAreAddressedByTheWidthAndNothingBehindThemIsWritten) {
    tov_image_desc desc = Picture(7, 5, {3, TOV_COMPONENT_TYPE_UINT8}).desc();
    desc.image_row_pitch = 9;
    std::array<uint8_t, 9 * 5 * 3> bytes;
    for (size_t i = 0; i < bytes.size(); ++i) bytes[i] = static_cast<uint8_t>(i);
    const Handle input = newImage(desc, bytes.data());
    std::array<uint8_t, 9 * 5 * 3> before;
    before.fill(0xcd);
    const Handle output = newImage(desc, before.data());
    ASSERT_EQ(execute(newFilter(kCopy), input, output), TOV_SUCCESS);
    void* pixels = nullptr;
    ASSERT_EQ(tovImageMap(output, 0, &pixels), TOV_SUCCESS);
    EXPECT_EQ(std::memcmp(pixels, bytes.data(), 7 * 5 * 3), 0);
    EXPECT_EQ(std::memcmp(static_cast<uint8_t*>(pixels) + 7 * 5 * 3, before.data(), 2 * 5 * 3), 0);
    EXPECT_EQ(tovImageUnmap(output, pixels), TOV_SUCCESS);
}

}  // namespace
}  // namespace apitest
