// Morphological antialiasing against its three passes in double.
#include "area_rule.h"
#include "fixture.h"
#include "vectors.h"

namespace {

using namespace apitest;

struct Features {
    Picture mesh, normals, depth;  // empty where absent
};

bool differ(const Picture& color, const Features& features, int64_t x, int64_t y, int64_t nx, int64_t ny) {
    const auto step = [&](const Picture& picture, const Rgba& weights) {
        return std::abs(dot(nearest(picture, x, y) - nearest(picture, nx, ny), weights));
    };
    if (2 * step(color, kLuminance) > 0.05 || step(features.depth, {0, 0, 1, 0}) > 0.1) return true;
    if (step(features.mesh, {1, 0, 0, 0}) != 0.0) return true;
    const Rgba a = nearest(features.normals, x, y);
    const Rgba b = nearest(features.normals, nx, ny);
    return length(a) > 0.0 && dot(a, b) < 0.9238795 * length(a) * length(b);
}

// Towards the left and towards the upper neighbour.
Picture edgesOf(const Picture& color, const Features& features) {
    return painted(color.width, color.height, kFloat4, [&](int64_t x, int64_t y) {
        return Rgba{differ(color, features, x, y, x - 1, y) ? 1.0 : 0.0,
                    differ(color, features, x, y, x, y - 1) ? 1.0 : 0.0, 0.0, 0.0};
    });
}

// Areas beside the line of upper (own = 1) or left (own = 0) edges through a pixel.
std::array<int, 2> areasAt(const Picture& edges, uint32_t x, uint32_t y, size_t own) {
    if (x >= edges.width || y >= edges.height || edges.at(x, y)[own] == 0.0) return {};
    const auto sample = [&](double along, double across) {
        return own == 1 ? bilinear(edges, x + along, y + across) : bilinear(edges, x + across, y + along);
    };
    const auto distanceToEnd = [&](int direction) {
        for (int i = 0; i < 15; ++i) {
            const double last = sample(direction * (1.5 + 2.0 * i), 0.0)[own];
            if (last < 0.9) return static_cast<int>(std::lround(2 * i + 2 * last));
        }
        return 30;
    };
    const auto crossing = [&](int along) { return static_cast<int>(std::lround(4 * sample(along, -0.25)[1 - own])); };
    const int first = distanceToEnd(-1);
    const int second = distanceToEnd(1);
    return areaRule(first, second, crossing(-first), crossing(second + 1));
}

Picture antialiased(const Picture& color, const Features& features) {
    const Picture edges = edgesOf(color, features);
    const auto area = [&](uint32_t x, uint32_t y, size_t own, size_t side) {
        return areasAt(edges, x, y, own)[side] / 255.0;
    };
    return painted(color.width, color.height, color.layout, [&](uint32_t x, uint32_t y) {
        const double a[] = {area(x, y, 1, 0), area(x, y + 1, 1, 1), area(x, y, 0, 0), area(x + 1, y, 0, 1)};
        const Rgba sides[] = {bilinear(color, x, y - a[0]), bilinear(color, x, y + a[1]), bilinear(color, x - a[2], y),
                              bilinear(color, x + a[3], y)};
        Rgba result{};
        double sum = 0.0;
        for (size_t i = 0; i < 4; ++i) {
            result = result + sides[i] * std::pow(a[i], 3);
            sum += std::pow(a[i], 3);
        }
        return sum < 0.00001 ? color.at(x, y) : result * (1 / sum);
    });
}

// Blocks of two values, so that edges cross and meet in every way.
Picture blocks(uint32_t width, uint32_t height, Layout layout = kFloat4) {
    const Picture random = noise(width, height, kFloat1, 1.0, 3);
    return painted(width, height, layout,
                   [&](uint32_t x, uint32_t y) { return gray(std::round(random.at(x / 3 * 3, y / 2 * 2)[0])); });
}

// Two tones beside slanted lines, with long steps of all lengths in both directions.
Picture slanted(uint32_t width, uint32_t height, Layout layout = kFloat4) {
    return painted(width, height, layout, [](uint32_t x, uint32_t y) {
        const double tone = (7 * y > x + 20) != (9 * x > y + 300) ? 0.75 : 0.25;
        return Rgba{tone, 0.5 * tone, 0.25, 9 * x > y + 300 ? 1.0 : 0.5};
    });
}

using Antialiasing = DeviceTest;

}  // namespace

TEST_F(Antialiasing, LuminanceEdgesMatchThePassesInDouble) {
    for (const Picture& picture :
         {slanted(83, 41), blocks(40, 31), blocks(9, 1), noise(1, 1), slanted(67, 29, {4, TOV_COMPONENT_TYPE_FLOAT16})})
        // Blended floats carry seven digits, halves three.
        EXPECT_LT(maxDifference(run(TOV_IMAGE_FILTER_MLAA, picture), antialiased(picture, {})),
                  picture.layout == kFloat4 ? 2e-6 : 1e-3)
            << picture.width << " x " << picture.height;
}

TEST_F(Antialiasing, FeaturesFindEdgesThatTheColourHides) {
    const Picture color = painted(45, 30, kFloat4, [](uint32_t x, uint32_t y) {
        return Rgba{0.5 + 0.0004 * x, 0.5, 0.5 - 0.0004 * y, 1.0};  // far below the threshold from pixel to pixel
    });
    Features features;
    features.mesh = blocks(45, 30, kFloat1);
    features.normals = painted(45, 30, {3, TOV_COMPONENT_TYPE_FLOAT32}, [](uint32_t x, uint32_t y) {
        return 3 * y > x ? Rgba{0, 0, 1, 0} : x > 40 ? Rgba{} : Rgba{0, 2, 1, 0};
    });
    features.depth = painted(45, 30, kFloat1, [](uint32_t x, uint32_t y) { return gray(x > 5 * y ? 1.0 : 1.5); });
    const Picture result = run(TOV_IMAGE_FILTER_MLAA, color,
                               {{"meshIDImg", tov_image{newImage(features.mesh)}},
                                {"normalsImg", tov_image{newImage(features.normals)}},
                                {"depthImg", tov_image{newImage(features.depth)}}});
    EXPECT_LT(maxDifference(result, antialiased(color, features)), 2e-6);
    EXPECT_EQ(maxDifference(run(TOV_IMAGE_FILTER_MLAA, color), color), 0.0) << "without them there is no edge";
}

TEST_F(Antialiasing, OtherLayoutsAndClaimedSizesAreRefused) {
    const Handle bytes = newImage(noise(4, 4, kByte4));
    const Handle input = newImage(noise(4, 4));
    const Handle output = newImage(noise(4, 4));
    const Handle filter = newFilter(TOV_IMAGE_FILTER_MLAA);
    const Handle queue = newQueue();
    EXPECT_EQ(execute(filter, bytes, output), TOV_ERROR_INTERNAL_ERROR);
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "srcRec", 4000, 4), TOV_SUCCESS);
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_ERROR_INVALID_PARAMETER);
}
