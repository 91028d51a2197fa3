// The bilateral filter against its formula in double.
#include "fixture.h"
#include "vectors.h"

namespace {

using namespace apitest;

Picture filtered(const Picture& input, const std::vector<Picture>& guides, const std::vector<float>& sigmas, int r) {
    const auto colour = [](const Picture& p, int64_t x, int64_t y) { return overAlpha(nearest(p, x, y)); };
    return painted(input.width, input.height, input.layout, [&](int64_t x, int64_t y) {
        Rgba sum{};  // whose alpha is the sum of the weights
        for (int j = -r; j <= r; ++j)
            for (int i = -r; i <= r; ++i) {
                double exponent = 0.0;
                for (size_t k = 0; k < guides.size(); ++k) {
                    const Rgba step = colour(guides[k], x + i, y + j) - colour(guides[k], x, y);
                    exponent -= 0.5 * dot(step, step) / double{sigmas[k]};
                }
                sum = sum + colour(input, x + i, y + j) * std::exp(exponent);
            }
        return sum * (1 / sum[3]);
    });
}

// Alpha 0 or, so that quotients stay small, from 1/2 to 1.
Picture translucent(uint32_t width, uint32_t height, uint32_t seed) {
    return mapped(noise(width, height, kFloat4, 1.0, seed), kFloat4, [](const Rgba& p) {
        return Rgba{p[0], p[1], p[2], p[3] < 0.1 ? 0.0 : 0.5 + 0.5 * p[3]};
    });
}

using Bilateral = DeviceTest;

}  // namespace

TEST_F(Bilateral, MatchesTheFormulaWithAnyAuxiliaryImagesAndWindowsBeyondThePicture) {
    std::vector<Picture> six;
    for (uint32_t i = 0; i < 6; ++i) six.push_back(translucent(5, 3, 10 + i));
    const struct {
        Picture input;
        std::vector<Picture> guides;
        std::vector<float> sigmas;
        uint32_t radius;
    } cases[] = {{translucent(37, 23, 3), {}, {}, 1},
                 {translucent(21, 18, 1),
                  {translucent(21, 18, 2), noise(21, 18, {3, TOV_COMPONENT_TYPE_UINT8}),
                   noise(21, 18, {1, TOV_COMPONENT_TYPE_FLOAT16})},
                  {0.5f, 0.05f, 0.2f},
                  4},
                 {translucent(5, 3, 1), six, {0.5f, 0.6f, 0.7f, 0.8f, 0.9f, 1.0f}, 6}};
    for (const auto& [input, guides, sigmas, radius] : cases) {
        std::vector<Handle> owners;
        std::vector<tov_image> images;
        for (const Picture& guide : guides) images.push_back(owners.emplace_back(newImage(guide)));
        const auto number = static_cast<uint32_t>(guides.size());
        const Picture result = run(TOV_IMAGE_FILTER_BILATERAL_DENOISE, input,
                                   {{"inputs", images}, {"sigmas", sigmas}, {"inputsNum", number}, {"radius", radius}});
        // Sums of floats and native exponentials.
        EXPECT_LT(maxRelativeDifference(result, filtered(input, guides, sigmas, static_cast<int>(radius))),
                  number == 0 ? 2e-6 : 1e-5)
            << number << " auxiliary images";
    }
}
