#include "trees.h"

namespace fusiontest {

const std::vector<Fusable>& fusableFilters() {
    static const Matrix kCamera = {1, 0.1f, 0, 0.2f, 0.1f, 1, 0, 0.1f, 0, 0, 1, 0, 0.1f, 0.2f, 0.3f, 2};
    static const std::vector<Fusable> filters = {
        {"color space", TOV_IMAGE_FILTER_COLOR_SPACE, {{"dstColorSpace", uint32_t{TOV_COLOR_SPACE_REC2020}}}},
        {"normalization", TOV_IMAGE_FILTER_NORMALIZATION, {}},
        {"gamma", TOV_IMAGE_FILTER_GAMMA_CORRECTION, {{"cGamma", 2.2f}}},
        {"filmic", TOV_IMAGE_FILTER_SIMPLE_TONEMAP, {{"cExposure", 0.5f}, {"cApplyToneMap", uint32_t{1}}}},
        {"Reinhard", TOV_IMAGE_FILTER_REINHARD_TONEMAP, {{"cKey", 0.8f}}},
        {"exponential", TOV_IMAGE_FILTER_EXPONENTIAL_TONEMAP, {{"cExposure", 1.5f}}},
        {"linear", TOV_IMAGE_FILTER_LINEAR_TONEMAP, {{"cKey", 0.7f}}},
        {"Drago", TOV_IMAGE_FILTER_DRAGO_TONEMAP, {{"cBias", 0.85f}, {"avLum", 0.5f}, {"maxLum", 2.0f}}},
        {"Sobel", TOV_IMAGE_FILTER_SOBEL, {}},
        {"shadow catcher", TOV_IMAGE_FILTER_SHADOW_CATCHER, {}},
        {"weighted sum",
         TOV_IMAGE_FILTER_WEIGHTED_SUM,
         {{"weights", std::vector<float>{0.3f, 0.6f}}, {"inputsNum", uint32_t{2}}}},
        {"product", TOV_IMAGE_FILTER_MULTIPLY, {{"inputsNum", uint32_t{2}}}},
        {"motion", TOV_IMAGE_FILTER_MOTION_BUFFER, {{"viewProjMatrix", kCamera}}},
        {"resampling", TOV_IMAGE_FILTER_RESAMPLE, {{"interpOperator", uint32_t{TOV_INTERPOLATION_BICUBIC}}}},
    };
    return filters;
}

const Fusable& fusable(uint32_t type) {
    for (const Fusable& filter : fusableFilters())
        if (filter.type == type) return filter;
    throw std::invalid_argument("this type cannot be fused");
}

bool takesInputArray(uint32_t type) {
    return type == TOV_IMAGE_FILTER_WEIGHTED_SUM || type == TOV_IMAGE_FILTER_MULTIPLY;
}

void FusionTest::bindInput(Chain& chain, tov_image_filter filter, uint32_t type, tov_image source, tov_image picture) {
    const bool isArray = takesInputArray(type);
    EXPECT_EQ(tovImageFilterSetParameterImage(filter, "srcBuffer", isArray ? picture : source), TOV_SUCCESS);
    if (!isArray) return;
    chain.arrays.push_back({source, picture});
    EXPECT_EQ(tovImageFilterSetParameterImageArray(filter, "inputs", chain.arrays.back().data(), 2), TOV_SUCCESS);
}

Picture FusionTest::runOneByOne(const std::vector<uint32_t>& types, const Picture& input, Layout output) {
    Chain chain;
    std::vector<Handle> images;
    const Handle picture = newImage(input);
    const Handle queue = newQueue();
    tov_image source = picture;
    for (size_t i = 0; i < types.size(); ++i) {
        const Layout layout = i + 1 == types.size() ? output : kFloat4;
        images.push_back(newImage(Picture(input.width, input.height, layout)));
        chain.filters.push_back(newFilter(types[i], fusable(types[i]).parameters));
        tov_image_filter filter = chain.filters.back();
        bindInput(chain, filter, types[i], source, picture);
        const tov_image attached = takesInputArray(types[i]) ? tov_image{picture} : source;
        EXPECT_EQ(tovCommandQueueAttachImageFilter(queue, filter, attached, images.back()), TOV_SUCCESS);
        source = images.back();
    }
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_SUCCESS);
    return read(source, Picture(input.width, input.height, output));
}

Picture FusionTest::runFused(const std::vector<uint32_t>& types, const Picture& input, Layout output) {
    Chain chain;
    const Handle picture = newImage(input);
    const Handle result = newImage(Picture(input.width, input.height, output));
    tov_image source = picture;
    for (size_t i = 0; i < types.size(); ++i) {
        const uint32_t type = types[i];
        chain.filters.push_back(newFilter(type, fusable(type).parameters));
        tov_image_filter filter = chain.filters.back();
        bindInput(chain, filter, type, source, picture);
        // Only a resampling filter that feeds another one needs to be told its size.
        if (type == TOV_IMAGE_FILTER_RESAMPLE && i + 1 < types.size())
            tovImageFilterSetParameter2u(filter, "dstRec", input.width, input.height);
        source = filter;
    }
    const Handle queue = newQueue();
    tov_image_filter last = chain.filters.back();
    const size_t before = types.size() - 1;
    const tov_image attached =
        takesInputArray(types.back()) || before == 0 ? tov_image{picture} : tov_image{chain.filters[before - 1]};
    EXPECT_EQ(tovCommandQueueAttachImageFilter(queue, last, attached, result), TOV_SUCCESS);
    EXPECT_EQ(tovContextExecuteCommandQueue(context(), queue, nullptr, nullptr), TOV_SUCCESS);
    return read(result, Picture(input.width, input.height, output));
}

}  // namespace fusiontest
