// The per-pixel filters against their formulas in double.
#include <algorithm>
#include <cmath>

#include "fixture.h"

namespace apitest {
namespace {

// Relative error of a few float operations; powers, logarithms and exponentials lose some more bits to relaxed maths.
constexpr double kArithmetic = 2e-6;
constexpr double kPower = 2e-5;
constexpr double kPublished = 2e-3;  // matrices of four digits

using Formula = std::function<Rgba(const Rgba&)>;

double luminance(const Rgba& c) {
    return 0.2126 * c[0] + 0.7152 * c[1] + 0.0722 * c[2];
}

// One function for the three colours; alpha stays.
Formula each(const std::function<double(double)>& function) {
    return [=](const Rgba& c) -> Rgba { return {function(c[0]), function(c[1]), function(c[2]), c[3]}; };
}

// One function of the luminance, which scales the three colours.
Formula scaled(const std::function<double(double)>& function) {
    return [=](const Rgba& c) {
        const double factor = function(luminance(c)) / luminance(c);
        return each([&](double v) { return v * factor; })(c);
    };
}

Formula multiplied(const std::array<double, 9>& m) {
    const auto row = [=](size_t i, const Rgba& c) { return m[i] * c[0] + m[i + 1] * c[1] + m[i + 2] * c[2]; };
    return [=](const Rgba& c) -> Rgba { return {row(0, c), row(3, c), row(6, c), c[3]}; };
}

Formula gammaOf(double gamma) {
    return each([=](double v) { return v <= 0 ? 0.0 : std::pow(std::min(v, 10000.0), 1 / gamma); });
}

Formula filmic(double exposure, double contrast, bool hasCurve) {
    const auto map = [=](double value) {
        const double v = (0.5 + (value - 0.5) * contrast) * std::exp2(exposure);
        return !hasCurve ? v : v <= 0 ? 0.0 : std::min(v * (2.51 * v + 0.03) / ((2.43 * v + 0.59) * v + 0.14), 1.0);
    };
    return [=](const Rgba& c) -> Rgba { return {map(c[0]), map(c[1]), map(c[2]), 1.0}; };
}

Formula reinhard(double key, double white, double burn) {
    return scaled([=](double luminance) {
        const double l = key * luminance;
        return white == 0 ? l / (1 + l) + (l - l / (1 + l)) * burn : l * (1 + l / white / white) / (1 + l);
    });
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
    Picture picture = noise(7, 5, kFloat4, 3.0);
    std::copy(values.begin(), values.end(), picture.values.begin());
    return picture;
}

class PerPixelFilters : public DeviceTest {};

TEST_F(PerPixelFilters, FollowTheirFormulasAndStayFiniteWhereTheseDivideByZero) {
    // Linear sRGB to Rec. 2020, as published in BT.2087.
    const Formula toRec2020 = multiplied({0.6274, 0.3293, 0.0433, 0.0691, 0.9195, 0.0114, 0.0164, 0.0880, 0.8956});
    const Formula same = [](const Rgba& c) { return c; };
    const Formula drago = scaled([](double y) {  // of bias 0.25, average 2 and maximum 8
        return std::log1p(y / 2) / std::log(2 + std::pow(y / 8, 2) * 8) / std::log10(8 / 2 + 1);
    });
    const Formula exponential = each([](double v) { return 1.5 * (1 - std::exp(-0.75 * v)); });
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
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, kPower, gammaOf(0.5), {{"cGamma", 0.5f}}},
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, kPower, gammaOf(-2), {{"cGamma", -2.0f}}},
        {TOV_IMAGE_FILTER_COLOR_SPACE, 1e-5, same, {{"srcColorSpace", 2u}, {"dstColorSpace", 2u}}},
        {TOV_IMAGE_FILTER_COLOR_SPACE, kPublished, toRec2020, {{"srcColorSpace", 1u}, {"dstColorSpace", 3u}}},
        {TOV_IMAGE_FILTER_SIMPLE_TONEMAP, 1e-7, filmic(0, 1, false), {}},
        {TOV_IMAGE_FILTER_SIMPLE_TONEMAP, kPower, filmic(-1.5, 2, false), {{"cExposure", -1.5f}, {"cContrast", 2.0f}}},
        {TOV_IMAGE_FILTER_SIMPLE_TONEMAP, kPower, filmic(0.7f, 1, true), {{"cExposure", 0.7f}, {"cApplyToneMap", 7u}}},
        {TOV_IMAGE_FILTER_REINHARD_TONEMAP, kArithmetic, reinhard(1, 0, 0.1f), {}},
        {TOV_IMAGE_FILTER_REINHARD_TONEMAP, kArithmetic, reinhard(0.5, 2, 0), {{"cKey", 0.5f}, {"cWPoint", 2.0f}}},
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

TEST_F(PerPixelFilters, TheSelfTestEvaluatesFiveFunctionsAndWritesNothingElse) {
    Picture expected = noise(7, 5);
    const Picture output = run(TOV_IMAGE_FILTER_MATH_TEST, beginning({4, 3, 2, 5, 1.5f}), {}, expected);
    const double values[] = {0.25, 9.0, std::pow(2.0, 2.5), std::log(5.0), std::exp(1.5)};
    for (size_t i = 0; i < 5; ++i) {
        EXPECT_NEAR(output.values[i], values[i], 1e-5 * values[i]) << i;
        expected.values[i] = output.values[i];
    }
    EXPECT_EQ(maxDifference(output, expected), 0.0);
}

TEST_F(PerPixelFilters, SobelMeasuresTheGradientWithRepeatedEdges) {
    for (const uint32_t height : {5u, 1u}) {
        const Picture input = noise(7, height, kFloat4, 3.0);
        const auto l = [&](int64_t x, int64_t y) {
            return luminance(input.at(static_cast<uint32_t>(std::clamp<int64_t>(x, 0, 6)),
                                      static_cast<uint32_t>(std::clamp<int64_t>(y, 0, height - 1))));
        };
        const Picture expected = painted(7, height, kFloat4, [&](int64_t x, int64_t y) -> Rgba {
            std::array<double, 2> sum{};
            for (const int64_t i : {-1, 0, 1}) {
                sum[0] += (i == 0 ? 2 : 1) * (l(x + 1, y + i) - l(x - 1, y + i));
                sum[1] += (i == 0 ? 2 : 1) * (l(x + i, y + 1) - l(x + i, y - 1));
            }
            const double g = std::hypot(sum[0], sum[1]);
            return {g, g, g, 1.0};
        });
        // A root of a difference that cancels to 1e-7 is off by that much.
        EXPECT_LT(maxDifference(run(TOV_IMAGE_FILTER_SOBEL, input), expected), 1e-5);
    }
}

TEST_F(PerPixelFilters, SumsAndProductsTakeUpToSixImagesAndReadGapsAsZero) {
    Picture sum(7, 5);
    Picture product = mapped(sum, kFloat4, [](const Rgba&) { return Rgba{1, 1, 1, 1}; });
    std::vector<Handle> owners;
    std::vector<tov_image> images;
    std::vector<float> weights;
    for (const float weight : {0.25f, 0.75f, -1.0f, 2.0f, 0.0f, 0.5f}) {
        const Picture next = noise(7, 5, kFloat4, 2.0, static_cast<uint32_t>(images.size()) + 1);
        images.push_back(owners.emplace_back(newImage(next)));
        weights.push_back(weight);
        for (size_t i = 0; i < sum.values.size(); ++i) {
            sum.values[i] += weight * next.values[i];
            product.values[i] *= next.values[i];
        }
    }
    Parameters six = {{"inputs", images}, {"inputsNum", 6u}};
    EXPECT_LT(maxRelativeDifference(run(TOV_IMAGE_FILTER_MULTIPLY, sum, six), product), kArithmetic);
    six.push_back({"weights", weights});
    EXPECT_LT(maxRelativeDifference(run(TOV_IMAGE_FILTER_WEIGHTED_SUM, product, six), sum), kArithmetic);
    EXPECT_EQ(run(TOV_IMAGE_FILTER_MULTIPLY, sum).at(6, 4), (Rgba{1, 1, 1, 1})) << "the product of none";
    const Parameters gap = {
        {"inputs", std::vector<tov_image>{nullptr}}, {"weights", std::vector<float>{5.0f}}, {"inputsNum", 1u}};
    EXPECT_EQ(run(TOV_IMAGE_FILTER_WEIGHTED_SUM, sum, gap).at(6, 4), Rgba{});
}

}  // namespace
}  // namespace apitest
