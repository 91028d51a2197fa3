// The per-pixel filters against their formulas in double.
#include <gmock/gmock.h>

#include <algorithm>
#include <cmath>

#include "fixture.h"

namespace apitest {
namespace {

using testing::HasSubstr;

// Relative error of a few float operations; powers, logarithms and exponentials lose some more bits to relaxed maths.
constexpr double kArithmetic = 2e-6;
constexpr double kTranscendental = 2e-5;

double luminance(const Rgba& c) {
    return 0.2126 * c[0] + 0.7152 * c[1] + 0.0722 * c[2];
}

Rgba scaled(const Rgba& c, double factor) {
    return {c[0] * factor, c[1] * factor, c[2] * factor, c[3]};
}

class PerPixelFilters : public DeviceTest {
 protected:
    // Positive high-range values whose luminance is never 0.
    const Picture input_ = noise(7, 5, kFloat4, 3.0);

    static void expectFormula(uint32_t type, const Picture& input, const Parameters& parameters,
                              const std::function<Rgba(const Rgba&)>& formula, double tolerance) {
        const Picture output = run(type, input, parameters);
        EXPECT_LT(maxRelativeDifference(output, mapped(input, kFloat4, formula)), tolerance) << "type " << type;
    }
    static Rgba one(uint32_t type, const Rgba& pixel, const Parameters& parameters = {}) {
        const Picture input = painted(7, 5, kFloat4, [&](uint32_t, uint32_t) { return pixel; });
        return run(type, input, parameters).at(3, 2);
    }
};

TEST_F(PerPixelFilters, TheSelfTestEvaluatesFiveFunctionsAndWritesNothingElse) {
    Picture input(7, 5);
    const float values[] = {4.0f, 3.0f, 2.0f, 5.0f, 1.5f};
    std::copy(values, values + 5, input.values.begin());
    Picture before(7, 5);
    std::fill(before.values.begin(), before.values.end(), -7.0f);
    const Picture output = run(TOV_IMAGE_FILTER_MATH_TEST, input, {}, before);
    const double expected[] = {0.25, 9.0, std::pow(2.0, 2.5), std::log(5.0), std::exp(1.5)};
    for (size_t i = 0; i < 5; ++i) EXPECT_NEAR(output.values[i], expected[i], 1e-5 * expected[i]) << i;
    for (size_t i = 5; i < output.values.size(); ++i) EXPECT_EQ(output.values[i], -7.0f) << i;
}

TEST_F(PerPixelFilters, TheSelfTestNeedsTwentyBytesOnBothSides) {
    const Picture enough(5, 1, {1, TOV_COMPONENT_TYPE_FLOAT32});
    const Picture less(19, 1, {1, TOV_COMPONENT_TYPE_UINT8});
    const Handle large = newImage(enough);
    const Handle largeToo = newImage(enough);
    const Handle small = newImage(less);
    const Handle smallToo = newImage(less);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_MATH_TEST);
    EXPECT_EQ(execute(filter, small, smallToo), TOV_ERROR_INVALID_PARAMETER);
    EXPECT_EQ(execute(filter, large, largeToo), TOV_SUCCESS);
}

TEST_F(PerPixelFilters, NormalizationDividesByAlphaAboveItsThreshold) {
    Picture input = noise(7, 5, kFloat4, 2.0);
    input.set(0, 0, {0.5, 0.25, 0.1, 0.5});
    input.set(1, 0, {0.3, 0.3, 0.3, 0.0});
    input.set(2, 0, {0.3, 0.2, 0.1, 0.00009});
    input.set(3, 0, {0.3, 0.2, 0.1, -0.5});
    const auto formula = [](const Rgba& c) -> Rgba {
        const double divisor = std::abs(c[3]) > 0.0001 ? c[3] : 1.0;
        return {c[0] / divisor, c[1] / divisor, c[2] / divisor, 1.0};
    };
    expectFormula(TOV_IMAGE_FILTER_NORMALIZATION, input, {}, formula, kArithmetic);
    const Rgba half = one(TOV_IMAGE_FILTER_NORMALIZATION, {0.5, 0.25, 0.1, 0.5});
    EXPECT_NEAR(half[0], 1.0, 1e-6);
    EXPECT_NEAR(half[2], 0.2, 1e-6);
    EXPECT_EQ(half[3], 1.0);
}

TEST_F(PerPixelFilters, GammaOneChangesNoBitAndOthersClampThenRaise) {
    Picture input = noise(7, 5, kFloat4, 2.0);
    input.set(0, 0, {-3.0, 1e30, -0.0, -5.0});
    input.set(1, 0, {20000.0, 0.0, 1e-40, 2.0});
    EXPECT_EQ(run(TOV_IMAGE_FILTER_GAMMA_CORRECTION, input).encoded(), input.encoded());
    for (const float gamma : {2.2f, 0.5f, -1.0f}) {
        if (gamma < 0) input.set(0, 0, {1.0, 2.0, 3.0, -5.0});  // 0 to a negative power has no value
        if (gamma < 0) input.set(1, 0, {1.0, 2.0, 3.0, -5.0});
        const auto formula = [&](const Rgba& c) -> Rgba {
            const auto raise = [&](double v) { return std::pow(std::clamp(v, 0.0, 10000.0), 1.0 / double{gamma}); };
            return {raise(c[0]), raise(c[1]), raise(c[2]), c[3]};
        };
        expectFormula(TOV_IMAGE_FILTER_GAMMA_CORRECTION, input, {{"cGamma", gamma}}, formula, kTranscendental);
    }
    EXPECT_NEAR(one(TOV_IMAGE_FILTER_GAMMA_CORRECTION, {0.5, 0, 1, 1}, {{"cGamma", 2.2f}})[0], 0.7297, 5e-5);
}

TEST_F(PerPixelFilters, ColourSpacesGoThroughXyzAndEqualOnesChangeNothing) {
    // Linear sRGB to and from XYZ (D65) as published in IEC 61966-2-1, four digits; Rec. 2020 likewise.
    const double toXyz[3][3] = {{0.4124, 0.3576, 0.1805}, {0.2126, 0.7152, 0.0722}, {0.0193, 0.1192, 0.9505}};
    const double fromRec2020[3][3] = {{0.6370, 0.1446, 0.1689}, {0.2627, 0.6780, 0.0593}, {0.0000, 0.0281, 1.0610}};
    const Parameters toRec2020 = {{"srcColorSpace", 1u}, {"dstColorSpace", 3u}};
    const Parameters back = {{"srcColorSpace", 3u}, {"dstColorSpace", 1u}};
    const Picture converted = run(TOV_IMAGE_FILTER_COLOR_SPACE, input_, toRec2020);
    for (uint32_t x = 0; x < 7; ++x) {
        const Rgba before = input_.at(x, 3);
        const Rgba after = converted.at(x, 3);
        for (int row = 0; row < 3; ++row) {
            double xyz = 0;
            double same = 0;
            for (size_t i = 0; i < 3; ++i) {
                xyz += toXyz[row][i] * before[i];
                same += fromRec2020[row][i] * after[i];
            }
            EXPECT_NEAR(xyz, same, 2e-3);  // the published matrices carry four digits
        }
        EXPECT_EQ(after[3], before[3]);
    }
    EXPECT_LT(maxRelativeDifference(run(TOV_IMAGE_FILTER_COLOR_SPACE, converted, back), input_), 1e-5);
    for (const uint32_t space : {1u, 2u, 3u, 4u}) {
        const Picture same =
            run(TOV_IMAGE_FILTER_COLOR_SPACE, input_, {{"srcColorSpace", space}, {"dstColorSpace", space}});
        EXPECT_LT(maxRelativeDifference(same, input_), 1e-5) << "colour space " << space;
        const Rgba white = one(TOV_IMAGE_FILTER_COLOR_SPACE, {1, 1, 1, 1}, {{"dstColorSpace", space}});
        for (const double component : white) EXPECT_NEAR(component, 1.0, 1e-5) << "all share one white point";
    }
}

TEST_F(PerPixelFilters, FilmicToneMapAppliesContrastExposureAndItsCurve) {
    const auto formula = [](double exposure, double contrast, bool curve) {
        return [=](const Rgba& c) -> Rgba {
            Rgba result{0, 0, 0, 1};
            for (size_t i = 0; i < 3; ++i) {
                double v = (0.5 + (c[i] - 0.5) * contrast) * std::exp2(exposure);
                if (curve) {
                    v = std::max(0.0, v);
                    v = std::clamp(v * (2.51 * v + 0.03) / ((2.43 * v + 0.59) * v + 0.14), 0.0, 1.0);
                }
                result[i] = v;
            }
            return result;
        };
    };
    Picture input = input_;
    input.set(0, 0, {-2.0, 0.0, 60000.0, -1.0});
    expectFormula(TOV_IMAGE_FILTER_SIMPLE_TONEMAP, input, {}, formula(0, 1, false), 1e-7);
    expectFormula(TOV_IMAGE_FILTER_SIMPLE_TONEMAP, input, {{"cExposure", -1.5f}, {"cContrast", 1.3f}},
                  formula(-1.5, 1.3f, false), kTranscendental);
    expectFormula(TOV_IMAGE_FILTER_SIMPLE_TONEMAP, input,
                  {{"cExposure", 0.7f}, {"cContrast", 0.8f}, {"cApplyToneMap", 1u}}, formula(0.7f, 0.8f, true),
                  kTranscendental);
    EXPECT_NEAR(one(TOV_IMAGE_FILTER_SIMPLE_TONEMAP, {1, 1, 1, 1}, {{"cApplyToneMap", 7u}})[1], 0.8038, 5e-5);
}

TEST_F(PerPixelFilters, ReinhardCompressesLuminanceWithAndWithoutAWhitePoint) {
    const auto formula = [](double key, double white, double burn) {
        return [=](const Rgba& c) {
            const double l = key * luminance(c);
            const double simple = l / (1 + l);
            const double mapped =
                white < 0.00001 ? simple + (l - simple) * burn : l * (1 + l / white / white) / (1 + l);
            return scaled(c, mapped / luminance(c));
        };
    };
    expectFormula(TOV_IMAGE_FILTER_REINHARD_TONEMAP, input_, {}, formula(1, 0, 0.1f), kArithmetic);
    expectFormula(TOV_IMAGE_FILTER_REINHARD_TONEMAP, input_, {{"cKey", 0.36f}, {"cWPoint", 2.5f}, {"cBurn", 0.9f}},
                  formula(0.36f, 2.5, 0.9f), kArithmetic);
    EXPECT_NEAR(one(TOV_IMAGE_FILTER_REINHARD_TONEMAP, {1, 1, 1, 0.25})[0], 0.55, 1e-6);
    EXPECT_EQ(one(TOV_IMAGE_FILTER_REINHARD_TONEMAP, {1, 1, 1, 0.25})[3], 0.25);
}

TEST_F(PerPixelFilters, DragoCompressesLogarithmically) {
    const auto formula = [](double bias, double average, double maximum) {
        return [=](const Rgba& c) {
            const double ratio = maximum / average;
            const double y = luminance(c) / average;
            const double power = std::pow(y / ratio, std::log(bias) / std::log(0.5));
            const double l = std::log1p(y) / std::log(2 + power * 8) / std::log10(ratio + 1);
            return scaled(c, l / luminance(c));
        };
    };
    Picture input = input_;
    input.set(0, 0, {1e-5, 2e-5, 1e-5, 1.0});
    input.set(1, 0, {0.02, 0.01, 0.03, 1.0});
    expectFormula(TOV_IMAGE_FILTER_DRAGO_TONEMAP, input, {{"avLum", 0.5f}, {"maxLum", 3.0f}}, formula(1, 0.5, 3),
                  kTranscendental);
    expectFormula(TOV_IMAGE_FILTER_DRAGO_TONEMAP, input, {{"cBias", 0.85f}, {"avLum", 1.2f}, {"maxLum", 8.0f}},
                  formula(0.85f, 1.2f, 8), kTranscendental);
}

TEST_F(PerPixelFilters, LinearAndExponentialToneMapsKeepAlpha) {
    expectFormula(
        TOV_IMAGE_FILTER_LINEAR_TONEMAP, input_, {{"cKey", 2.0f}}, [](const Rgba& c) { return scaled(c, 2.0); }, 1e-7);
    Picture input = input_;
    input.set(0, 0, {-2.0, 0.0, 1e-6, -1.0});
    const auto exponential = [](const Rgba& c) -> Rgba {
        const auto map = [](double v) { return 1.5 * (1 - std::exp(-0.8 * v)); };
        return {map(c[0]), map(c[1]), map(c[2]), c[3]};
    };
    expectFormula(TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP, input, {{"cExposure", 0.8f}, {"cIntensity", 1.5f}}, exponential,
                  kTranscendental);
}

Picture sobel(const Picture& input) {
    const auto l = [&](int64_t x, int64_t y) {
        return luminance(input.at(static_cast<uint32_t>(std::clamp<int64_t>(x, 0, input.width - 1)),
                                  static_cast<uint32_t>(std::clamp<int64_t>(y, 0, input.height - 1))));
    };
    return painted(input.width, input.height, kFloat4, [&](int64_t x, int64_t y) -> Rgba {
        const double gx =
            l(x + 1, y + 1) + 2 * l(x + 1, y) + l(x + 1, y - 1) - l(x - 1, y + 1) - 2 * l(x - 1, y) - l(x - 1, y - 1);
        const double gy =
            l(x - 1, y - 1) + 2 * l(x, y - 1) + l(x + 1, y - 1) - l(x - 1, y + 1) - 2 * l(x, y + 1) - l(x + 1, y + 1);
        const double g = std::sqrt(gx * gx + gy * gy);
        return {g, g, g, 1.0};
    });
}

TEST_F(PerPixelFilters, SobelMeasuresTheGradientWithRepeatedEdges) {
    // A root of a difference that cancels to 1e-7 is off by that much.
    EXPECT_LT(maxDifference(run(TOV_IMAGE_FILTER_SOBEL, input_), sobel(input_)), 1e-5);
    const auto flat = [](uint32_t, uint32_t) { return Rgba{0.3, 0.6, 0.9, 0.5}; };
    const Picture constant = run(TOV_IMAGE_FILTER_SOBEL, painted(7, 5, kFloat4, flat));
    const Picture black = painted(7, 5, kFloat4, [](uint32_t, uint32_t) { return Rgba{0, 0, 0, 1}; });
    EXPECT_LT(maxDifference(constant, black), 1e-6);
    const auto step = [](uint32_t x, uint32_t) {
        const double v = x < 4 ? 0.0 : 1.0;
        return Rgba{v, v, v, 1.0};
    };
    const Picture edge = run(TOV_IMAGE_FILTER_SOBEL, painted(7, 5, kFloat4, step));
    for (uint32_t y = 0; y < 5; ++y)
        for (uint32_t x = 0; x < 7; ++x) EXPECT_NEAR(edge.at(x, y)[0], x == 3 || x == 4 ? 4.0 : 0.0, 1e-5);
    const Picture pixel = painted(1, 1, kFloat4, [](uint32_t, uint32_t) { return Rgba{1, 2, 3, 4}; });
    EXPECT_NEAR(run(TOV_IMAGE_FILTER_SOBEL, pixel).at(0, 0)[0], 0.0, 1e-6);
}

TEST_F(PerPixelFilters, TheShadowCatcherDividesAsWrittenAndGivesZeroForAZeroDivisor) {
    const auto formula = [](const Rgba& c) -> Rgba {
        const double value = c[1] == 0 || c[2] == 0 || c[3] == 0 ? 0.0 : c[2] / c[3] * (1 - c[0] / c[1]);
        return {value, value, value, 1.0};
    };
    Picture input = painted(7, 5, kFloat4, [](uint32_t x, uint32_t y) {
        return Rgba{0.1 + 0.2 * x, 0.5 + 0.1 * y, 0.3 + 0.1 * x, 0.7};
    });
    input.set(0, 0, {0.5, 0.0, 0.5, 0.5});
    input.set(1, 0, {0.5, 0.5, 0.0, 0.5});
    input.set(2, 0, {0.5, 0.5, 0.5, 0.0});
    input.set(3, 0, {0.0, 0.0, 0.0, 0.0});
    input.set(4, 0, {0.0, 0.5, 0.5, 0.5});
    expectFormula(TOV_IMAGE_FILTER_SHADOW_CATCHER, input, {}, formula, kArithmetic);
}

TEST_F(PerPixelFilters, BlackStaysBlackAndZeroDivisorsGiveFiniteValues) {
    const std::vector<Rgba> pixels = {
        {0, 0, 0, 0},
        {0, 0, 0, 1},
        {-0.0, -0.0, -0.0, 0},
        {-1, -1, -1, 1},  // 1 + luminance is 0
        {1e-40, 0, 0, 1},
        {-0.7152, 0.2126, 0, 1},  // a luminance of 0 with colour
        {1, 1, 1, 0},
        {-0.5, -0.5, -0.5, 0.5},
        {1e-30, 1e-30, 1e-30, 1e-30},
        {3, 0, 0, -1},
    };
    const Picture input = painted(7, 5, kFloat4, [&](uint32_t x, uint32_t y) { return pixels[(y * 7 + x) % 10]; });
    const Parameters drago = {{"avLum", 0.5f}, {"maxLum", 3.0f}};
    const std::pair<uint32_t, Parameters> runs[] = {
        {TOV_IMAGE_FILTER_REINHARD_TONEMAP, {}},
        {TOV_IMAGE_FILTER_REINHARD_TONEMAP, {{"cWPoint", 2.0f}}},
        {TOV_IMAGE_FILTER_DRAGO_TONEMAP, drago},
        {TOV_IMAGE_FILTER_NORMALIZATION, {}},
        {TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.2f}}},
        {TOV_IMAGE_FILTER_SHADOW_CATCHER, {}},
        {TOV_IMAGE_FILTER_SIMPLE_TONEMAP, {{"cApplyToneMap", 1u}}},
        {TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP, {}},
    };
    for (const auto& [type, parameters] : runs) {
        const Picture output = run(type, input, parameters);
        EXPECT_TRUE(isFinite(output)) << "filter type " << type;
        if (type == TOV_IMAGE_FILTER_REINHARD_TONEMAP || type == TOV_IMAGE_FILTER_DRAGO_TONEMAP) {
            EXPECT_EQ(output.at(0, 0), (Rgba{0, 0, 0, 0})) << "filter type " << type;
            EXPECT_EQ(output.at(1, 0), (Rgba{0, 0, 0, 1})) << "filter type " << type;
        }
    }
}

TEST_F(PerPixelFilters, SumsAndProductsTakeUpToSixImagesAndReadGapsAsZero) {
    const Picture output(7, 5);
    std::vector<Picture> pictures;
    std::vector<Handle> images;
    for (uint32_t i = 0; i < 6; ++i) {
        pictures.push_back(noise(7, 5, kFloat4, 2.0, i + 1));
        images.push_back(newImage(pictures.back()));
    }
    const std::vector<float> allWeights = {0.25f, 0.75f, -1.0f, 2.0f, 0.0f, 0.5f};
    for (const uint32_t count : {0u, 1u, 6u}) {
        const std::vector<tov_image> inputs(images.begin(), images.begin() + count);
        const std::vector<float> weights(allWeights.begin(), allWeights.begin() + count);
        const Parameters product = {{"inputs", inputs}, {"inputsNum", count}};
        const Parameters sum = {{"inputs", inputs}, {"weights", weights}, {"inputsNum", count}};
        const auto combined = [&](double start, auto&& step) {
            return painted(7, 5, kFloat4, [&](uint32_t x, uint32_t y) {
                Rgba result{start, start, start, start};
                for (uint32_t i = 0; i < count; ++i)
                    for (size_t c = 0; c < 4; ++c) result[c] = step(result[c], pictures[i].at(x, y)[c], i);
                return result;
            });
        };
        const Picture sums = combined(0, [&](double r, double v, uint32_t i) { return r + v * double{weights[i]}; });
        const Picture products = combined(1, [](double r, double v, uint32_t) { return r * v; });
        EXPECT_LT(maxRelativeDifference(run(TOV_IMAGE_FILTER_WEIGHTED_SUM, input_, sum), sums), kArithmetic) << count;
        EXPECT_LT(maxRelativeDifference(run(TOV_IMAGE_FILTER_MULTIPLY, input_, product), products), kArithmetic)
            << count;
    }
    const Parameters gap = {{"inputs", std::vector<tov_image>{images[0], nullptr}},
                            {"weights", std::vector<float>{1.0f, 5.0f}},
                            {"inputsNum", 2u}};
    EXPECT_EQ(maxDifference(run(TOV_IMAGE_FILTER_WEIGHTED_SUM, input_, gap), pictures[0]), 0.0);
}

TEST_F(PerPixelFilters, SevenInputsDoNotCompileAndTheQueueStaysUsable) {
    const Handle image = newImage(input_);
    const Handle filter = newFilter(TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", 7u}});
    const Parameter seven = {"inputs", std::vector<tov_image>(7, image)};
    ASSERT_EQ(setParameter(filter, seven), TOV_SUCCESS);
    int32_t code = TOV_SUCCESS;
    const std::string log = printedBy([&] { code = execute(filter, image, image); });
    EXPECT_EQ(code, TOV_ERROR_INTERNAL_ERROR);
    EXPECT_THAT(log, HasSubstr("Internal error: too lot of inputs!"));
    const Parameter none = {"inputs", std::vector<tov_image>{}};
    ASSERT_EQ(setParameter(filter, none), TOV_SUCCESS);
    ASSERT_EQ(setParameter(filter, {"inputsNum", 0u}), TOV_SUCCESS);
    EXPECT_EQ(execute(filter, image, image), TOV_SUCCESS);
}

}  // namespace
}  // namespace apitest
