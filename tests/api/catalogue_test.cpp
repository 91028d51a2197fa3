// Every filter type runs, also where its output is its input and all its auxiliary images.
#include "fixture.h"

namespace apitest {
namespace {

// Values with which every filter can run; each type takes those that it knows.
void prepare(tov_image_filter filter, const std::vector<tov_image>& images) {
    static const std::vector<float> floats = {0.5f, 0.25f};  // read when the filter runs
    for (const auto& [name, value] : {std::pair{"sigma", 1.0f}, {"cGamma", 2.2f}, {"avLum", 0.5f}, {"maxLum", 2.0f}})
        setParameter(filter, {name, value});
    for (const char* name : {"radius", "halfWindow", "inputsNum"}) setParameter(filter, {name, 2u});
    for (const char* name : {"normalsImg", "depthImg", "positionsImg", "transImg"})
        setParameter(filter, {name, images[0]});
    for (const char* name : {"weights", "sigmas"}) tovImageFilterSetParameterFloatArray(filter, name, floats.data(), 2);
    tovImageFilterSetParameterImageArray(filter, "inputs", const_cast<tov_image*>(images.data()), 2);
}

class Catalogue : public DeviceTest {};

TEST_F(Catalogue, EveryFilterGivesThePictureOfSeparateImagesWhereTheyAreOne) {
    const Picture picture = noise(13, 11);
    const Handle auxiliary = newImage(picture);
    for (uint32_t type = 0; type <= TOV_IMAGE_FILTER_SHADOW_CATCHER; ++type) {
        const Handle input = newImage(picture);
        const Handle output = newImage(picture);
        const Handle apart = newFilter(type);
        const std::vector<tov_image> others = {auxiliary, auxiliary};
        prepare(apart, others);
        ASSERT_EQ(execute(apart, input, output), TOV_SUCCESS) << type;
        const Picture expected = read(output, picture);
        EXPECT_TRUE(isFinite(expected)) << type;
        const Handle inPlace = newFilter(type);
        const std::vector<tov_image> itself = {input, input};
        prepare(inPlace, itself);
        const bool isAllowed = type != TOV_IMAGE_FILTER_RESAMPLE;
        EXPECT_EQ(execute(inPlace, input, input), isAllowed ? TOV_SUCCESS : TOV_ERROR_INVALID_OPERATION) << type;
        EXPECT_EQ(maxDifference(read(input, picture), isAllowed ? expected : picture), 0.0) << type;
    }
}

}  // namespace
}  // namespace apitest
