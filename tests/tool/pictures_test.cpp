// Every kind of picture goes in and comes out with its channels; names tell what a picture is made of.
#include <cmath>
#include <limits>

#include "picture_channels.h"
#include "tool_test.h"

using Pictures = Tool;
using Indices = std::vector<int>;
const std::string kCopy = "run -f linear_tonemap ";  // its default multiplies by one

TEST_F(Pictures, OfEveryKindKeepTheirChannelsAndValues) {
    for (const auto& [ending, type] : {std::pair{std::string("png"), OIIO::TypeDesc::UINT8},
                                       {"exr", OIIO::TypeDesc::HALF},
                                       {"tif", OIIO::TypeDesc::FLOAT}}) {
        for (const Names& channels : {Names{"Y"}, Names{"Y", "A"}, kRgb, Names{"R", "G", "B", "A"}, Names{"Z"}}) {
            store("in." + ending, {13, 9, channels, kQuarters, type});
            expect(0, "", kCopy + "in." + ending + " -o out." + ending);
            const Stored before = load("in." + ending);
            const Stored after = load("out." + ending);
            EXPECT_EQ(after.channels, before.channels) << ending;
            EXPECT_EQ(after.type, OIIO::TypeDesc(type)) << ending;
            EXPECT_EQ(after.values, before.values) << ending << " of " << channels.size();
        }
    }
}

TEST_F(Pictures, PassOnWhatIsNotFiniteAndGrowToFloatsWhereHalvesDoNotSuffice) {
    const float infinity = std::numeric_limits<float>::infinity();
    store("in.exr", {4, 1, {"Y"}, {std::nanf(""), infinity, -infinity, 0.5f}, OIIO::TypeDesc::HALF});
    const Values large = made("run in.exr -f linear_tonemap:cKey=1048576").values;
    EXPECT_TRUE(std::isnan(large[0]));
    EXPECT_EQ(Values(large.begin() + 1, large.end()), (Values{infinity, -infinity, 524288}));
    expect(0, "", "run in.exr -f linear_tonemap:cKey=2 -o out.png");
    EXPECT_EQ(load("out.png").values, (Values{0, 1, 0, 1}));
}

TEST_F(Pictures, AreTurnedUpright) {
    OIIO::ImageSpec spec(2, 1, 1, OIIO::TypeDesc::FLOAT);
    spec.attribute("Orientation", 6);  // turn clockwise to see it upright
    const auto output = OIIO::ImageOutput::create("turned.tif");
    ASSERT_TRUE(output->open("turned.tif", spec) && output->write_image(OIIO::TypeDesc::FLOAT, kQuarters.data()));
    ASSERT_TRUE(output->close());
    const Stored upright = made(kCopy + "turned.tif");
    EXPECT_EQ(upright.height, 2);
    EXPECT_EQ(upright.values, (Values{0, 0.75f}));
}

TEST_F(Pictures, AreMadeOfTheChannelsThatTheirNamesTell) {
    const std::pair<Names, Indices> rows[] = {
        {{"A", "B", "G", "R", "Z"}, {3, 2, 1, 0}},
        {{"Y", "RY", "BY"}, {}},  // would need a conversion
        {{"X.R", "X.G", "X.B", "V.RGBA.R", "V.RGBA.G", "V.RGBA.B", "Combined.R", "Combined.G", "Combined.B"},
         {6, 7, 8}},
        {{"rgba.R", "rgba.G", "rgba.B", "R", "G", "B"}, {3, 4, 5}}};
    for (const auto& [channels, chosen] : rows) {
        const auto choice = tool::chooseChannels(channels);
        EXPECT_EQ(choice ? choice->indices : Indices{}, chosen) << testing::PrintToString(channels);
    }
    const Names layers = {"A.Normal.X", "A.Normal.Y", "A.Normal.Z", "A.Depth.Z", "R", "B.Normal.X", "normal.X"};
    const std::pair<const char*, Indices> named[] = {
        {"B.Normal", {5}}, {"Normal", {0, 1, 2}}, {"normal", {6}}, {"DEPTH", {3}}, {"R", {4}}, {"ormal", {}}};
    for (const auto& [layer, found] : named) EXPECT_EQ(tool::findLayer(layers, layer), found) << layer;
}

TEST_F(Pictures, AreTheBeautyPartOfSeveralWhichIsTold) {
    std::vector<OIIO::ImageSpec> parts(2, OIIO::ImageSpec(1, 1, 3, OIIO::TypeDesc::FLOAT));
    parts[0].attribute("oiio:subimagename", "Albedo");
    parts[1].attribute("oiio:subimagename", "Combined");
    const auto output = OIIO::ImageOutput::create("parts.exr");
    ASSERT_TRUE(output->open("parts.exr", 2, parts.data()));
    ASSERT_TRUE(output->write_image(OIIO::TypeDesc::FLOAT, kQuarters.data()));
    ASSERT_TRUE(output->open("parts.exr", parts[1], OIIO::ImageOutput::AppendSubimage));
    ASSERT_TRUE(output->write_image(OIIO::TypeDesc::FLOAT, &kQuarters[1]) && output->close());
    expect(0, "of its layers, Combined is used", kCopy + "parts.exr -o out.exr");
    EXPECT_EQ(load("out.exr").values, (Values{0.75f, 0.25f, 1}));
}
