// Every filter type runs, also where its output is its input and all its auxiliary images; the per-pixel filters follow
// their formulas in double.
#include <algorithm>
#include <cmath>

#include "fixture.h"
#include "vectors.h"

namespace apitest {
namespace {

// Relative error of a few float operations; powers, logarithms and exponentials lose some more bits to relaxed maths.
constexpr double kArithmetic = 2e-6;
constexpr double kPower = 2e-5;
constexpr double kPublished = 2e-3;  // matrices of four digits

using Formula = std::function<Rgba(const Rgba&)>;
using Curve = std::function<double(double)>;

// One function for the three colours; alpha stays.
Formula each(const Curve& curve) {
    return [=](const Rgba& c) -> Rgba { return {curve(c[0]), curve(c[1]), curve(c[2]), c[3]}; };
}

// One function of the luminance, which scales the three colours.
Formula scaled(const Curve& curve) {
    return [=](const Rgba& c) {
        const double y = dot(c, kLuminance);
        return each([&](double v) { return v * curve(y) / y; })(c);
    };
}

Formula gammaOf(double gamma) {
    return each([=](double v) { return v <= 0 ? 0.0 : std::pow(std::min(v, 10000.0), 1 / gamma); });
}

double curved(double v) {
    return v <= 0 ? 0.0 : std::min(v * (2.51 * v + 0.03) / ((2.43 * v + 0.59) * v + 0.14), 1.0);
}

Rgba toRec2020(const Rgba& c) {  // from linear sRGB, as published in BT.2087
    const auto row = [&](double r, double g, double b) { return r * c[0] + g * c[1] + b * c[2]; };
    return {row(0.6274, 0.3293, 0.0433), row(0.0691, 0.9195, 0.0114), row(0.0164, 0.0880, 0.8956), c[3]};
}

Rgba normalised(const Rgba& c) {
    const double divisor = std::abs(c[3]) > 0.0001 ? c[3] : 1.0;
    return {c[0] / divisor, c[1] / divisor, c[2] / divisor, 1.0};
}

Rgba shadow(const Rgba& c) {
    const double value = c[1] == 0 || c[2] == 0 || c[3] == 0 ? 0.0 : c[2] / c[3] * (1 - c[0] / c[1]);
    return {value, value, value, 1.0};
}

Picture beginning(const std::vector<float>& values) {
    Picture picture = noise(75, 21, kFloat4, 3.0);
    std::copy(values.begin(), values.end(), picture.values.begin());
    return picture;
}

class Catalogue : public DeviceTest {};

TEST_F(Catalogue, OfPerPixelFiltersFollowsTheFormulasAndStaysFiniteWhereTheseDivideByZero) {
    const auto opaque = [](const Formula& formula) {
        return [=](const Rgba& c) { return formula({c[0], c[1], c[2], 1}); };
    };
    const Formula same = [](const Rgba& c) { return c; };
    const Formula drago = scaled([](double y) {  // of bias 0.25, average 2 and maximum 8
        return std::log1p(y / 2) / std::log(2 + std::pow(y / 8, 2) * 8) / std::log10(8 / 2 + 1);
    });
    const Formula exponential = each([](double v) { return 1.5 * (1 - std::exp(-0.75 * v)); });
    const Formula dark = each([](double v) { return (2 * v - 0.5) * std::exp2(-1.5); });
    const Formula burnt = scaled([](double y) { return y / (1 + y) + (y - y / (1 + y)) * 0.1; });
    const Formula whitened = scaled([](double y) { return y / 2 * (1 + y / 8) / (1 + y / 2); });
    const struct {
        uint32_t type;
        double tolerance;
        Formula formula;
        Parameters parameters;
    } rows[] = {
        {TOV_IMAGE_FILTER_NORMALIZATION, kArithmetic, normalised, {}},
        {TOV_IMAGE_FILTER_SHADOW_CATCHER, kArithmetic, shadow, {}},
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, 0.0, same, {}},
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, kPower, gammaOf(2.2f), {{"cGamma", 2.2f}}},
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, kPower, gammaOf(-2), {{"cGamma", -2.0f}}},
        {TOV_IMAGE_FILTER_COLOR_SPACE, 1e-5, same, {{"srcColorSpace", 2u}, {"dstColorSpace", 2u}}},
        {TOV_IMAGE_FILTER_COLOR_SPACE, kPublished, toRec2020, {{"srcColorSpace", 1u}, {"dstColorSpace", 3u}}},
        {TOV_IMAGE_FILTER_SIMPLE_TONEMAP, kPower, opaque(dark), {{"cExposure", -1.5f}, {"cContrast", 2.0f}}},
        {TOV_IMAGE_FILTER_SIMPLE_TONEMAP, kPower, opaque(each(curved)), {{"cApplyToneMap", 7u}}},
        {TOV_IMAGE_FILTER_REINHARD_TONEMAP, kArithmetic, burnt, {}},
        {TOV_IMAGE_FILTER_REINHARD_TONEMAP, kArithmetic, whitened, {{"cKey", 0.5f}, {"cWPoint", 2.0f}}},
        {TOV_IMAGE_FILTER_DRAGO_TONEMAP, kPower, drago, {{"cBias", 0.25f}, {"avLum", 2.0f}, {"maxLum", 8.0f}}},
        {TOV_IMAGE_FILTER_LINEAR_TONEMAP, 0.0, each([](double v) { return 2 * v; }), {{"cKey", 2.0f}}},
        {TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP, kPower, exponential, {{"cExposure", 0.75f}, {"cIntensity", 1.5f}}},
    };
    const Picture input = beginning({0.3f,  0.2f, 0.1f, 0,    0.3f, 0.2f, 0.1f,  9e-5f, 0.3f,  0.2f,  0.1f,
                                     -0.5f, 0.5f, 0,    0.5f, 0.5f, 0.5f, 0.5f,  0,     0.5f,  1e-5f, 2e-5f,
                                     1e-5f, 1,    -2,   0.5f, 20,   -1,   20000, 5000,  12000, 1});
    const Picture zeros =
        beginning({0, 0, 0,        0,       -0.0f, -0.0f, -0.0f,  1,      -1,     -1,     -1, 1, 1e-40f, 0,
                   0, 1, -0.7152f, 0.2126f, 0,     1,     1e-40f, 1e-40f, 1e-40f, 1e-40f, 3,  0, 0,      -1});
    for (const auto& [type, tolerance, formula, parameters] : rows) {
        SCOPED_TRACE(testing::Message() << "type " << type << ", " << parameters.size() << " parameters");
        EXPECT_LE(maxRelativeDifference(run(type, input, parameters), mapped(input, kFloat4, formula)), tolerance);
        const Picture finite = run(type, zeros, parameters);
        EXPECT_TRUE(isFinite(finite));
        if (type == TOV_IMAGE_FILTER_REINHARD_TONEMAP || type == TOV_IMAGE_FILTER_DRAGO_TONEMAP) {
            EXPECT_EQ(finite.at(0, 0), (Rgba{0, 0, 0, 0})) << "black stays black";
        }
    }
}

TEST_F(Catalogue, OfFiltersIncludesASelfTestThatEvaluatesFiveFunctionsAndWritesNothingElse) {
    Picture expected = noise(75, 21);
    std::ranges::copy(std::array{0.25f, 9.0f, std::exp2(2.5f), std::log(5.0f), std::exp(1.5f)}, &expected.values[0]);
    const Picture output = run(TOV_IMAGE_FILTER_MATH_TEST, beginning({4, 3, 2, 5, 1.5f}), {}, noise(75, 21));
    EXPECT_LT(maxRelativeDifference(output, expected), 1e-5);
    EXPECT_EQ(output.at(6, 4), expected.at(6, 4));
}

TEST_F(Catalogue, OfFiltersHasASobelThatMeasuresTheGradientWithRepeatedEdges) {
    const Picture input = noise(75, 21, kFloat4, 3.0);
    const Picture expected = painted(75, 21, kFloat4, [&](int x, int y) -> Rgba {
        const auto towards = [&](int dx, int dy) { return dot(slope(input, x, y, dx, dy), kLuminance); };
        const double g = std::hypot(towards(1, 0), towards(0, 1));
        return {g, g, g, 1.0};
    });
    // A root of a difference that cancels to 1e-7 is off by that much.
    EXPECT_LT(maxDifference(run(TOV_IMAGE_FILTER_SOBEL, input), expected), 1e-5);
}

TEST_F(Catalogue, OfPerPixelFiltersKeepsEqualPixelsEqualAndMayTakeAPartOfTheOutput) {
    constexpr Rgba kColor = {0.7, 0.31, 0.13, 0.9};
    const Picture input = noise(75, 21);
    const Picture before = noise(75, 21, kFloat4, 1.0, 2);
    for (const uint32_t type :
         {TOV_IMAGE_FILTER_LINEAR_TONEMAP, TOV_IMAGE_FILTER_GAMMA_CORRECTION, TOV_IMAGE_FILTER_SIMPLE_TONEMAP,
          TOV_IMAGE_FILTER_REINHARD_TONEMAP, TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP, TOV_IMAGE_FILTER_NORMALIZATION,
          TOV_IMAGE_FILTER_SHADOW_CATCHER, TOV_IMAGE_FILTER_SOBEL}) {
        // The last pixels of a row are computed one by one, the others side by side.
        const Picture uniform = run(type, painted(75, 21, kFloat4, [](uint32_t, uint32_t) { return kColor; }));
        const auto first = [&](uint32_t, uint32_t) { return uniform.at(0, 0); };
        EXPECT_EQ(maxDifference(uniform, painted(75, 21, kFloat4, first)), 0.0) << type;
        const Picture whole = run(type, input);
        const Handle source = newImage(input);
        const Handle output = newImage(before);
        const Handle filter = newFilter(type);
        const Handle queue = newQueue();
        ASSERT_EQ(tovCommandQueueAttachImageFilter(queue, filter, source, output), TOV_SUCCESS);
        ASSERT_EQ(tovImageFilterSetParameter2u(filter, "dstRec", 24, 16), TOV_SUCCESS);
        ASSERT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_SUCCESS);
        const auto color = [&](uint32_t x, uint32_t y) { return (x < 24 && y < 16 ? whole : before).at(x, y); };
        EXPECT_EQ(maxDifference(read(output, before), painted(75, 21, kFloat4, color)), 0.0) << type;
    }
}

TEST_F(Catalogue, OfFiltersAddsAndMultipliesUpToSixImagesAndReadsGapsAsZero) {
    const std::vector<float> weights = {1.0f, 0.5f, -0.25f, 2.0f, 0.0f, 0.125f};
    const Picture input = noise(7, 5);
    std::vector<Handle> owners;
    std::vector<tov_image> images;
    for (const double value : {1, 2, 4, 8, 16, 32}) {
        const auto color = [=](uint32_t, uint32_t) { return Rgba{value, value, value, value}; };
        images.push_back(owners.emplace_back(newImage(painted(7, 5, kFloat4, color))));
    }
    Parameters six = {{"inputs", images}, {"inputsNum", 6u}};
    EXPECT_EQ(run(TOV_IMAGE_FILTER_MULTIPLY, input, six).at(6, 4), (Rgba{32768, 32768, 32768, 32768}));
    EXPECT_EQ(run(TOV_IMAGE_FILTER_MULTIPLY, input).at(6, 4), (Rgba{1, 1, 1, 1})) << "the product of none";
    six.push_back({"weights", weights});
    EXPECT_EQ(run(TOV_IMAGE_FILTER_WEIGHTED_SUM, input, six).at(6, 4), (Rgba{21, 21, 21, 21}));
    six[0].value = std::vector<tov_image>(6, nullptr);
    EXPECT_EQ(run(TOV_IMAGE_FILTER_WEIGHTED_SUM, input, six).at(6, 4), Rgba{});
}

TEST_F(Catalogue, OfAllFiltersGivesThePictureOfSeparateImagesWhereTheyAreOne) {
    const Picture picture = noise(13, 11);
    const Handle auxiliary = newImage(picture);
    for (uint32_t type = 0; type <= TOV_IMAGE_FILTER_SHADOW_CATCHER; ++type) {
        const Handle input = newImage(picture);
        const Handle output = newImage(picture);
        const auto runWith = [&](const std::vector<tov_image>& images, tov_image destination) {
            const Handle filter = newFilter(type);
            setAll(filter, images);
            for (const char* name : {"depthImg", "transImg"}) setParameter(filter, {name, images[0]});
            return execute(filter, input, destination);
        };
        ASSERT_EQ(runWith({auxiliary, auxiliary}, output), TOV_SUCCESS) << type;
        const Picture expected = read(output, picture);
        EXPECT_TRUE(isFinite(expected)) << type;
        const bool isAllowed = type != TOV_IMAGE_FILTER_RESAMPLE;
        EXPECT_EQ(runWith({input, input}, input), isAllowed ? TOV_SUCCESS : TOV_ERROR_INVALID_OPERATION) << type;
        EXPECT_EQ(maxDifference(read(input, picture), isAllowed ? expected : picture), 0.0) << type;
    }
}

}  // namespace
}  // namespace apitest
