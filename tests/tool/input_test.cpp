// Every kind of picture goes in and comes out with its channels; what is no whole picture is refused.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include <array>
#include <bit>
#include <limits>

#include "picture_channels.h"
#include "process.h"
#include "test_pictures.h"

namespace tooltest {

namespace {

using ::testing::HasSubstr;

const std::string kRender = TOV_DATA "/render.exr";

// linear_tonemap with its default key multiplies by one.
Outcome copy(const std::string& input, const std::string& output) {
    return runTool({"run", input, "-f", "linear_tonemap", "-o", output});
}

TEST(Input, PicturesOfEveryKindKeepTheirChannelsAndValues) {
    const TemporaryDirectory directory;
    const std::vector<std::vector<std::string>> kinds = {{"Y"}, {"Y", "A"}, {"R", "G", "B"}, {"R", "G", "B", "A"}};
    const struct {
        const char* extension;
        OIIO::TypeDesc::BASETYPE type;
    } formats[] = {{".png", OIIO::TypeDesc::UINT8},
                   {".exr", OIIO::TypeDesc::HALF},
                   {".exr", OIIO::TypeDesc::FLOAT},
                   {".tif", OIIO::TypeDesc::FLOAT}};
    for (const auto& format : formats) {
        for (const auto& channels : kinds) {
            SCOPED_TRACE(std::string(format.extension) + " with " + std::to_string(channels.size()) + " channels");
            const Stored picture = pattern(13, 9, channels, format.type);
            const std::string input = directory / "in" + format.extension;
            const std::string output = directory / "out" + format.extension;
            store(input, picture);
            EXPECT_EQ(copy(input, output).err, "");
            const Stored result = load(output);
            EXPECT_EQ(result.channels.size(), channels.size());
            EXPECT_EQ(result.type, format.type);
            EXPECT_EQ(result.values, picture.values);
        }
    }
}

TEST(Input, ADepthChannelKeepsItsName) {
    const TemporaryDirectory directory;
    const Stored picture = pattern(5, 5, {"Z"}, OIIO::TypeDesc::FLOAT);
    store(directory / "depth.exr", picture);
    EXPECT_EQ(copy(directory / "depth.exr", directory / "out.exr").status, 0);
    const Stored result = load(directory / "out.exr");
    EXPECT_EQ(result.channels, picture.channels);
    EXPECT_EQ(result.values, picture.values);
}

TEST(Input, TheFirstColourLayerOfManyIsUsed) {
    const TemporaryDirectory directory;
    const Stored picture = pattern(6, 4, {"N.X", "N.Y", "N.Z", "V.R", "V.G", "V.B", "V.A"}, OIIO::TypeDesc::FLOAT);
    store(directory / "layers.exr", picture);
    const Outcome outcome = copy(directory / "layers.exr", directory / "out.exr");
    EXPECT_THAT(outcome.err, HasSubstr("V.R, V.G, V.B, V.A are used"));
    const Stored layers = load(directory / "layers.exr");
    const Stored result = load(directory / "out.exr");
    ASSERT_EQ(result.channels, (std::vector<std::string>{"R", "G", "B", "A"}));
    for (size_t i = 0; i < size_t{6} * 4; ++i) {
        for (size_t c = 0; c < 4; ++c) {
            const auto from = std::ranges::find(layers.channels, "V." + result.channels[c]) - layers.channels.begin();
            ASSERT_EQ(result.values[i * 4 + c], layers.values[i * 7 + static_cast<size_t>(from)]) << i;
        }
    }
}

TEST(Input, TheLayerWithoutANameThenTheBeautyLayerComesBeforeTheFirst) {
    const auto chosen = [](const std::vector<std::string>& layers) {
        std::vector<std::string> channels;
        for (const std::string& layer : layers) {
            for (const char* name : {"R", "G", "B"}) channels.push_back(layer + name);
        }
        return tool::chooseChannels(channels)->indices.front() / 3;
    };
    EXPECT_EQ(chosen({"V.Albedo.", "V.Combined.", "V.RGBA.", ""}), 3);
    EXPECT_EQ(chosen({"V.Albedo.", "V.RGBA.", "V.Combined."}), 2);
    EXPECT_EQ(chosen({"Albedo.", "NotTheBeauty.", "Beauty."}), 2);
    EXPECT_EQ(chosen({"Albedo.", "Diffuse."}), 0);
}

TEST(Input, TheBeautyPartOfSeveralIsUsedAndTold) {
    const TemporaryDirectory directory;
    const std::string path = directory / "parts.exr";
    std::vector<OIIO::ImageSpec> parts(2, OIIO::ImageSpec(2, 1, 3, OIIO::TypeDesc::FLOAT));
    parts[0].attribute("oiio:subimagename", "Albedo");
    parts[1].attribute("oiio:subimagename", "Combined");
    const auto output = OIIO::ImageOutput::create(path);
    ASSERT_TRUE(output->open(path, 2, parts.data()));
    const std::vector<float> albedo(6, 0.25f);
    const std::vector<float> combined(6, 0.5f);
    ASSERT_TRUE(output->write_image(OIIO::TypeDesc::FLOAT, albedo.data()));
    ASSERT_TRUE(output->open(path, parts[1], OIIO::ImageOutput::AppendSubimage));
    ASSERT_TRUE(output->write_image(OIIO::TypeDesc::FLOAT, combined.data()));
    ASSERT_TRUE(output->close());
    EXPECT_THAT(copy(path, directory / "out.exr").err, HasSubstr("of its layers, Combined is used"));
    EXPECT_EQ(load(directory / "out.exr").values, combined);
}

TEST(Input, ChannelNamesDecideWhatAPictureIsMadeOf) {
    using Names = std::vector<std::string>;
    const struct {
        Names file;
        Names chosen;
    } rows[] = {{{"R", "G", "B", "A", "Z"}, {"R", "G", "B", "A"}},
                {{"A", "B", "G", "R"}, {"R", "G", "B", "A"}},
                {{"r", "g", "b"}, {"r", "g", "b"}},
                {{"Y", "A"}, {"Y", "A"}},
                {{"Z", "A"}, {"Z", "A"}},
                {{"A"}, {"A"}},
                {{"X", "Y", "Z"}, {"X", "Y", "Z"}},
                {{"View.Depth.Z", "View.Combined.B", "View.Combined.G", "View.Combined.R"}, {"R", "G", "B"}},
                {{"Y", "RY", "BY"}, {}},  // luminance and chroma would need a conversion
                {{"X", "Y"}, {}},         // motion vectors, say
                {{"a", "b", "c", "d"}, {}}};
    for (const auto& row : rows) {
        const auto choice = tool::chooseChannels(row.file);
        EXPECT_EQ(choice ? choice->names : Names{}, row.chosen) << testing::PrintToString(row.file);
    }
}

TEST(Input, NotANumberAndInfinityPassThrough) {
    const TemporaryDirectory directory;
    Stored picture = pattern(4, 3, {"R", "G", "B"}, OIIO::TypeDesc::FLOAT);
    picture.values[0] = std::numeric_limits<float>::quiet_NaN();
    picture.values[4] = std::numeric_limits<float>::infinity();
    picture.values[8] = -std::numeric_limits<float>::infinity();
    store(directory / "in.exr", picture);
    EXPECT_EQ(copy(directory / "in.exr", directory / "out.exr").status, 0);
    const Stored result = load(directory / "out.exr");
    EXPECT_TRUE(std::isnan(result.values[0]));
    for (size_t i = 1; i < result.values.size(); ++i) EXPECT_EQ(result.values[i], picture.values[i]) << i;
    EXPECT_EQ(copy(directory / "in.exr", directory / "out.png").status, 0);
    const Stored bytes = load(directory / "out.png");
    EXPECT_EQ(bytes.values[0], 0.0f);
    EXPECT_EQ(bytes.values[4], 1.0f);
    EXPECT_EQ(bytes.values[8], 0.0f);
}

TEST(Input, AStoredOrientationIsApplied) {
    const TemporaryDirectory directory;
    const auto output = OIIO::ImageOutput::create("x.tif");
    OIIO::ImageSpec spec(2, 1, 1, OIIO::TypeDesc::UINT8);
    spec.attribute("Orientation", 6);  // turn clockwise to see it upright
    const std::array<unsigned char, 2> pixels = {255, 0};
    ASSERT_TRUE(output->open(directory / "turned.tif", spec));
    ASSERT_TRUE(output->write_image(OIIO::TypeDesc::UINT8, pixels.data()));
    ASSERT_TRUE(output->close());
    EXPECT_EQ(copy(directory / "turned.tif", directory / "out.png").status, 0);
    const Stored result = load(directory / "out.png");
    EXPECT_EQ(result.width, 1);
    EXPECT_EQ(result.values, (std::vector<float>{1.0f, 0.0f}));
}

TEST(Input, WhatIsNoWholePictureIsRefused) {
    const TemporaryDirectory directory;
    for (const char* name : {"cut.png", "cut.jpg", "cut.tif", "cut.exr"}) {
        ASSERT_EQ(copy(kRender, directory / name).status, 0);
        const std::string whole = readFile(directory / name);
        writeFile(directory / name, whole.substr(0, whole.size() * 6 / 10));
    }
    writeFile(directory / "empty.exr", "");
    writeFile(directory / "text.png", "This is no picture.");
    writeFile(directory / "short.ppm", "P6\n1000 1000\n255\nabc");
    ::mkfifo((directory / "pipe.exr").c_str(), 0600);
    const struct {
        const char* name;
        const char* message;
    } rows[] = {{"cut.png", "cannot read"},   {"cut.jpg", "cannot read"},         {"cut.tif", "cannot read"},
                {"cut.exr", "cannot read"},   {"empty.exr", "it is empty"},       {"text.png", "cannot read"},
                {"short.ppm", "cannot read"}, {"pipe.exr", "not a regular file"}, {"none.exr", "no such file"},
                {"", "it is a directory"}};
    for (const auto& row : rows) {
        const Outcome outcome = copy(directory / row.name, directory / "out.png");
        EXPECT_EQ(outcome.status, 4) << row.name;
        EXPECT_THAT(outcome.err, HasSubstr(row.message)) << row.name;
    }
}

TEST(Input, APictureTooBigIsReportedWithTheBytesNeededAndAvailable) {
    const TemporaryDirectory directory;
    writeFile(directory / "huge.ppm", "P6\n100000 100000\n255\n");
    const Outcome huge = copy(directory / "huge.ppm", directory / "out.png");
    EXPECT_EQ(huge.status, 1);
    EXPECT_THAT(huge.err, HasSubstr("160000000000 bytes; at most 4294967295"));

    store(directory / "big.png", pattern(4800, 4800, {"Y"}, OIIO::TypeDesc::UINT8));
    const Outcome big =
        runTool({"run", directory / "big.png", "-f", "linear_tonemap", "-o", directory / "out.png"},
                {.environment = {{"POCL_MEMORY_LIMIT", "1"}}});  // GiB, of which the library keeps 256 MiB
    EXPECT_EQ(big.status, 1);
    EXPECT_THAT(big.err, HasSubstr("4800 x 4800 pixels need 737280000 bytes (two images of 368640000)"));
    EXPECT_THAT(big.err, HasSubstr(" bytes are available (two images of "));
}

}  // namespace

}  // namespace tooltest
