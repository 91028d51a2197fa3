// The access layer: every layout once as input and once as output, and the values where rounding and clamping show.
#include <algorithm>
#include <numeric>

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

TEST_F(PixelLayouts, AreReadAndWrittenAsDefined) {
    const std::vector<Layout> layouts = allLayouts();
    for (size_t i = 0; i < layouts.size(); ++i) {
        const Layout source = layouts[i];
        const Layout destination = layouts[(i + 5) % layouts.size()];  // each is the destination once, too
        const Picture input = noise(7, 5, source, 1.4);
        const Picture expected = mapped(input, destination, [](const Rgba& rgba) { return rgba; });
        // Only grays are computed, and floats of bytes in their last digit; everything else is exact. One step of a
        // byte: a gray may fall on either side of one half. A half has 11 bits, a sum of floats 24.
        const bool isExact = destination.components > 2 && (destination.type != TOV_COMPONENT_TYPE_FLOAT32 ||
                                                            source.type != TOV_COMPONENT_TYPE_UINT8);
        const double tolerance = isExact                                          ? 0.0
                                 : destination.type == TOV_COMPONENT_TYPE_UINT8   ? 1.0
                                 : destination.type == TOV_COMPONENT_TYPE_FLOAT16 ? 1.4 / 1024
                                                                                  : 2e-7;
        EXPECT_LE(maxDifference(copied(input, destination), expected), tolerance)
            << source.components << " of " << source.type << " to " << destination.components << " of "
            << destination.type;
    }
}

TEST_F(PixelLayouts, OfBytesAreClampedAndRoundedToEvenAndHoldAllTheirValues) {
    Picture input(2, 1);
    input.values = {1.2f, 0.5f, -0.1f, 1, 0.0019f, 0.0020f, 1e30f, -1e30f};  // 0.4845 and 0.51 steps
    EXPECT_EQ(copied(input, kByte4).values, (std::vector<float>{255, 128, 0, 255, 0, 1, 255, 0}));
    Picture bytes(16, 4, kByte4);
    std::iota(bytes.values.begin(), bytes.values.end(), 0.0f);
    EXPECT_EQ(maxDifference(copied(copied(bytes, kFloat4), kByte4), bytes), 0.0);
}

TEST_F(PixelLayouts, AddressRowsByTheWidthAndWriteNothingBehindThem) {
    Picture input = noise(9, 5, {3, TOV_COMPONENT_TYPE_UINT8});
    const Picture before = noise(9, 5, input.layout, 1.0, 2);
    tov_image_desc desc = input.desc();
    desc.image_width = 7;
    desc.image_row_pitch = 9;
    const Handle source = newImage(desc, input.encoded().data());
    const Handle destination = newImage(desc, before.encoded().data());
    ASSERT_EQ(execute(newFilter(kCopy), source, destination), TOV_SUCCESS);
    constexpr std::ptrdiff_t kWritten = 105;  // components of 7 x 5 pixels
    std::copy(before.values.begin() + kWritten, before.values.end(), input.values.begin() + kWritten);
    EXPECT_EQ(maxDifference(read(destination, input), input), 0.0);
}

}  // namespace
}  // namespace apitest
