// Morphological antialiasing against its three passes in double.
#include <gmock/gmock.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <optional>

#include "fixture.h"

namespace {

using namespace apitest;

constexpr Layout kHalf4 = {4, TOV_COMPONENT_TYPE_FLOAT16};
constexpr Layout kFloat1 = {1, TOV_COMPONENT_TYPE_FLOAT32};
constexpr Layout kFloat3 = {3, TOV_COMPONENT_TYPE_FLOAT32};

struct Grid {
    int width, height;
    std::vector<Rgba> values;

    Grid(uint32_t w, uint32_t h) : width(static_cast<int>(w)), height(static_cast<int>(h)), values(size_t{w} * h) {}
    Rgba& at(int x, int y) {
        return values[static_cast<size_t>(y) * static_cast<size_t>(width) + static_cast<size_t>(x)];
    }
    Rgba at(int x, int y) const { return const_cast<Grid*>(this)->at(x, y); }
    Rgba clamped(int x, int y) const { return at(std::clamp(x, 0, width - 1), std::clamp(y, 0, height - 1)); }
    // Bilinear, whole numbers are centres of pixels.
    Rgba sample(double x, double y) const {
        const int left = static_cast<int>(std::floor(x));
        const int top = static_cast<int>(std::floor(y));
        const double fx = x - left;
        const double fy = y - top;
        Rgba result{};
        for (size_t c = 0; c < 4; ++c)
            result[c] = (clamped(left, top)[c] * (1 - fx) + clamped(left + 1, top)[c] * fx) * (1 - fy) +
                        (clamped(left, top + 1)[c] * (1 - fx) + clamped(left + 1, top + 1)[c] * fx) * fy;
        return result;
    }
};

Grid gridOf(const Picture& picture) {
    Grid grid(picture.width, picture.height);
    for (uint32_t y = 0; y < picture.height; ++y)
        for (uint32_t x = 0; x < picture.width; ++x)
            grid.at(static_cast<int>(x), static_cast<int>(y)) = picture.at(x, y);
    return grid;
}

struct Features {
    std::optional<Picture> mesh, normals, depth;
};

bool isEdge(const Picture& color, const Features& features, uint32_t x, uint32_t y, uint32_t nx, uint32_t ny) {
    const auto luminance = [](const Rgba& p) { return 0.2126 * p[0] + 0.7152 * p[1] + 0.0722 * p[2]; };
    bool edge = 2 * std::abs(luminance(color.at(x, y)) - luminance(color.at(nx, ny))) > 0.05;
    if (features.mesh) edge |= features.mesh->at(x, y)[0] != features.mesh->at(nx, ny)[0];
    if (features.depth) edge |= std::abs(features.depth->at(x, y)[2] - features.depth->at(nx, ny)[2]) > 0.1;
    if (!features.normals) return edge;
    const Rgba a = features.normals->at(x, y);
    const Rgba b = features.normals->at(nx, ny);
    const auto length = [](const Rgba& v) { return std::sqrt(v[0] * v[0] + v[1] * v[1] + v[2] * v[2]); };
    if (length(a) == 0.0) return edge;
    const double dot = a[0] * b[0] + a[1] * b[1] + a[2] * b[2];
    const double cosine = length(b) == 0.0 ? 0.0 : dot / (length(a) * length(b));
    return edge || cosine < 0.9238795;
}

Grid edgesOf(const Picture& color, const Features& features) {
    Grid edges(color.width, color.height);
    for (uint32_t y = 0; y < color.height; ++y)
        for (uint32_t x = 0; x < color.width; ++x)
            edges.at(static_cast<int>(x), static_cast<int>(y)) = {
                x > 0 && isEdge(color, features, x, y, x - 1, y) ? 1.0 : 0.0,
                y > 0 && isEdge(color, features, x, y, x, y - 1) ? 1.0 : 0.0, 0.0, 0.0};
    return edges;
}

// Pixels to the end of the edge line in one direction, at most 30.
int distanceToEnd(const std::function<double(double)>& edgeAt) {
    double last = 0.0;
    for (int i = 0; i < 15; ++i) {
        last = edgeAt(1.5 + 2.0 * i);
        if (last < 0.9) return static_cast<int>(std::lround(2 * i + 2 * last));
    }
    return 30;
}

// (own side, other side) of a line of two ends, from the area under the lines between them; the crossings are 0 for
// none, 1 for the other side, 3 for the own one and 4 for both.
std::array<double, 2> areaOf(int first, int second, int crossingFirst, int crossingSecond) {
    const auto decided = [](int crossing) { return crossing == 1 || crossing == 3; };
    std::array<double, 2> sides{};
    if ((crossingFirst == 4 && !decided(crossingSecond)) || (crossingSecond == 4 && !decided(crossingFirst)))
        return sides;
    const auto resolved = [](int crossing, int other) { return crossing == 4 ? 4 - other : crossing; };
    const auto add = [&](int crossing, int own, int other) {
        if (!decided(crossing) || own > other) return;
        const double length = own + other + 1;
        const double area = own == other ? 1 / (8 * length) : (other - own) / (2 * length);
        sides[crossing == 3 ? 0 : 1] += std::floor(255 * area + 1e-9) / 255;  // the table holds bytes
    };
    add(resolved(crossingFirst, crossingSecond), first, second);
    add(resolved(crossingSecond, crossingFirst), second, first);
    return sides;
}

int crossing(double sampled) {
    return static_cast<int>(std::lround(4 * sampled));
}

Grid weightsOf(const Grid& edges) {
    Grid weights(static_cast<uint32_t>(edges.width), static_cast<uint32_t>(edges.height));
    for (int y = 0; y < edges.height; ++y) {
        for (int x = 0; x < edges.width; ++x) {
            Rgba& w = weights.at(x, y);
            if (edges.at(x, y)[1] > 0) {
                const int left = distanceToEnd([&](double d) { return edges.sample(x - d, y)[1]; });
                const int right = distanceToEnd([&](double d) { return edges.sample(x + d, y)[1]; });
                const auto sides = areaOf(left, right, crossing(edges.sample(x - left, y - 0.25)[0]),
                                          crossing(edges.sample(x + right + 1, y - 0.25)[0]));
                w[0] = sides[0];
                w[1] = sides[1];
            }
            if (edges.at(x, y)[0] > 0) {
                const int up = distanceToEnd([&](double d) { return edges.sample(x, y - d)[0]; });
                const int down = distanceToEnd([&](double d) { return edges.sample(x, y + d)[0]; });
                const auto sides = areaOf(up, down, crossing(edges.sample(x - 0.25, y - up)[1]),
                                          crossing(edges.sample(x - 0.25, y + down + 1)[1]));
                w[2] = sides[0];
                w[3] = sides[1];
            }
        }
    }
    return weights;
}

Picture antialiased(const Picture& color, const Features& features) {
    const Grid weights = weightsOf(edgesOf(color, features));
    const Grid source = gridOf(color);
    const auto weightAt = [&](int x, int y) {
        return x < weights.width && y < weights.height ? weights.at(x, y) : Rgba{};
    };
    return painted(color.width, color.height, color.layout, [&](uint32_t column, uint32_t row) {
        const int x = static_cast<int>(column);
        const int y = static_cast<int>(row);
        const Rgba own = weightAt(x, y);
        const Rgba a = {own[0], weightAt(x, y + 1)[1], own[2], weightAt(x + 1, y)[3]};
        const Rgba w = {std::pow(a[0], 3), std::pow(a[1], 3), std::pow(a[2], 3), std::pow(a[3], 3)};
        const double sum = w[0] + w[1] + w[2] + w[3];
        if (sum < 0.00001) return source.at(x, y);
        const Rgba samples[] = {source.sample(x, y - a[0]), source.sample(x, y + a[1]), source.sample(x - a[2], y),
                                source.sample(x + a[3], y)};
        Rgba result{};
        for (size_t c = 0; c < 4; ++c)
            result[c] =
                (samples[0][c] * w[0] + samples[1][c] * w[1] + samples[2][c] * w[2] + samples[3][c] * w[3]) / sum;
        return result;
    });
}

// Two tones beside slanted lines, with long steps of all lengths in both directions.
Picture slanted(uint32_t width, uint32_t height, Layout layout = kFloat4) {
    return painted(width, height, layout, [](uint32_t x, uint32_t y) {
        const bool first = 7 * y > x + 20;
        const bool second = 9 * x > y + 300;
        const double tone = first != second ? 0.75 : 0.25;
        return Rgba{tone, 0.5 * tone, 0.25, second ? 1.0 : 0.5};
    });
}

// Blocks of few values, so that edges cross and meet in every way.
Picture blocks(uint32_t width, uint32_t height, Layout layout, uint32_t seed) {
    const Picture random = noise(width, height, kFloat1, 1.0, seed);
    return painted(width, height, layout, [&](uint32_t x, uint32_t y) {
        const double value = random.at(x / 3 * 3, y / 2 * 2)[0] < 0.5 ? 0.0 : 1.0;
        return Rgba{value, value, value, 1.0};
    });
}

class Antialiasing : public DeviceTest {
 protected:
    static Picture antialias(const Picture& color, const Features& features = {}) {
        Parameters parameters;
        std::vector<Handle> owners;
        const auto add = [&](const char* name, const std::optional<Picture>& picture) {
            if (picture) parameters.push_back({name, Value(tov_image(owners.emplace_back(newImage(*picture))))});
        };
        add("meshIDImg", features.mesh);
        add("normalsImg", features.normals);
        add("depthImg", features.depth);
        return run(TOV_IMAGE_FILTER_MLAA, color, parameters);
    }
};

}  // namespace

TEST_F(Antialiasing, LuminanceEdgesMatchThePassesInDouble) {
    for (const Picture& picture : {slanted(83, 41), blocks(40, 31, kFloat4, 3), blocks(1, 9, kFloat4, 1),
                                   blocks(9, 1, kFloat4, 2), noise(1, 1), slanted(67, 29, kHalf4)}) {
        // Blended floats carry seven digits, halves three.
        const double tolerance = picture.layout == kHalf4 ? 1e-3 : 2e-6;
        EXPECT_LT(maxDifference(antialias(picture), antialiased(picture, {})), tolerance)
            << picture.width << " x " << picture.height;
    }
}

TEST_F(Antialiasing, FeaturesFindEdgesThatTheColourHides) {
    const Picture color = painted(45, 30, kFloat4, [](uint32_t x, uint32_t y) {
        return Rgba{0.5 + 0.0004 * x, 0.5, 0.5 - 0.0004 * y, 1.0};  // far below the threshold from pixel to pixel
    });
    Features features;
    features.mesh = blocks(45, 30, kFloat1, 5);
    features.normals = painted(45, 30, kFloat3, [](uint32_t x, uint32_t y) {
        return 3 * y > x ? Rgba{0, 0, 1, 0} : x > 40 ? Rgba{} : Rgba{0, 2, 1, 0};
    });
    features.depth = painted(45, 30, kFloat1, [](uint32_t x, uint32_t y) {
        const double z = x > 5 * y ? 1.0 : 1.5;
        return Rgba{z, z, z, 1};
    });
    const Picture expected = antialiased(color, features);
    ASSERT_GT(maxDifference(expected, color), 1e-4) << "the features must matter";
    EXPECT_LT(maxDifference(antialias(color, features), expected), 2e-6);
    EXPECT_EQ(maxDifference(antialias(color), color), 0.0) << "without them there is no edge";
}

TEST_F(Antialiasing, InPlaceGivesTheSamePicture) {
    const Picture picture = blocks(40, 31, kFloat4, 3);
    EXPECT_EQ(maxDifference(runInPlace(TOV_IMAGE_FILTER_MLAA, picture), antialias(picture)), 0.0);
}

TEST_F(Antialiasing, InputsThatItCannotTakeAreRefusedWithALine) {
    const Picture four = noise(4, 4);
    const Handle good = newImage(four);
    const Handle output = newImage(four);
    const Handle small = newImage(noise(3, 4, kFloat1));
    const auto refusal = [&](tov_image input, const Parameters& parameters, int32_t code) {
        const Handle filter = newFilter(TOV_IMAGE_FILTER_MLAA, parameters);
        return printedBy([&] { EXPECT_EQ(execute(filter, input, output), code); });
    };
    for (const Layout layout : {kFloat3, kByte4, kFloat1}) {
        const Handle input = newImage(noise(4, 4, layout));
        EXPECT_THAT(refusal(input, {}, TOV_ERROR_INTERNAL_ERROR), testing::HasSubstr("four components"));
    }
    EXPECT_THAT(refusal(good, {{"depthImg", tov_image(small)}}, TOV_ERROR_INVALID_OPERATION),
                testing::HasSubstr("depthImg"));
    EXPECT_EQ(refusal(good, {}, TOV_SUCCESS).find("must"), std::string::npos);
}

TEST_F(Antialiasing, AnotherSizeThanTheInputsIsRefused) {
    const Handle input = newImage(noise(4, 4));
    const Handle output = newImage(noise(4, 4));
    const Handle filter = newFilter(TOV_IMAGE_FILTER_MLAA);
    const Handle queue = newQueue();
    ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, input, output), TOV_SUCCESS);
    ASSERT_EQ(tovImageFilterSetParameter2u(filter, "srcRec", 4000, 4000), TOV_SUCCESS);
    const std::string printed = printedBy([&] {
        EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_ERROR_INVALID_PARAMETER);
    });
    EXPECT_THAT(printed, testing::HasSubstr("srcRec"));
}
