// The tool as users run it: shell commands in a directory of the test's own, which is removed with it. Pictures are
// stored and loaded with OpenImageIO, alpha as it is, without the tool's own reader and writer.
#pragma once

#include <OpenImageIO/imageio.h>
#include <gmock/gmock.h>
#include <sys/wait.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>

namespace fs = std::filesystem;
using testing::HasSubstr;
using Names = std::vector<std::string>;
using Values = std::vector<float>;

const Names kRgb = {"R", "G", "B"};
const Values kQuarters = {0, 0.75f, 0.25f, 1, 0.5f};  // exact in half and float

struct Stored {
    int width = 0, height = 0;
    Names channels = {};
    Values values = {};  // channels side by side; 8-bit values as 0 ... 1
    OIIO::TypeDesc type = OIIO::TypeDesc::FLOAT;
};

// Values are repeated to fill the picture.
inline void store(const std::string& path, const Stored& picture) {
    const auto output = OIIO::ImageOutput::create(path);
    OIIO::ImageSpec spec(picture.width, picture.height, static_cast<int>(picture.channels.size()), picture.type);
    spec.channelnames = picture.channels;
    spec.alpha_channel = picture.channels.back() == "A" ? spec.nchannels - 1 : -1;
    spec.attribute("oiio:UnassociatedAlpha", 1);
    Values values(spec.image_pixels() * picture.channels.size());
    for (size_t i = 0; i < values.size(); ++i) values[i] = picture.values[i % picture.values.size()];
    ASSERT_TRUE(output->open(path, spec) && output->write_image(OIIO::TypeDesc::FLOAT, values.data()));
    ASSERT_TRUE(output->close());
}

// Empty where there is none.
inline Stored load(const std::string& path) {
    OIIO::ImageSpec config;
    config.attribute("oiio:UnassociatedAlpha", 1);
    const auto input = OIIO::ImageInput::open(path, &config);
    if (!input) return {};
    const OIIO::ImageSpec& spec = input->spec();
    Values values(spec.image_pixels() * static_cast<size_t>(spec.nchannels));
    EXPECT_TRUE(input->read_image(0, 0, 0, spec.nchannels, OIIO::TypeDesc::FLOAT, values.data())) << path;
    return {spec.width, spec.height, spec.channelnames, values, spec.format};
}

inline std::string readFile(const std::string& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
}

struct Outcome {
    int status;
    std::string out, err;
};

class Tool : public testing::Test {
 protected:
    Tool() { fs::current_path(::mkdtemp(directory_.data())); }
    ~Tool() override {
        fs::current_path("/");
        for (const char* ending : {"", ".out", ".err"}) fs::remove_all(directory_ + ending);
    }

    // What stands before the command: "NAME=value" or "umask 027;". In all of it $R is the sample render.
    Outcome tov(const std::string& arguments, const std::string& before = "") const {
        const std::string outputs = " >" + directory_ + ".out 2>" + directory_ + ".err ";
        const int state = std::system((before + outputs + "$TOV " + arguments).c_str());
        return {WEXITSTATUS(state), readFile(directory_ + ".out"), readFile(directory_ + ".err")};
    }
    void expect(int status, const std::string& text, const std::string& words, const std::string& before = "") const {
        const Outcome outcome = tov(words, before);
        EXPECT_EQ(outcome.status, status) << words << outcome.err;
        EXPECT_THAT(outcome.err, HasSubstr(text)) << words;
    }
    // The picture that a successful command writes.
    Stored made(const std::string& arguments, const std::string& before = "") const {
        expect(0, "", arguments + " -o made.exr", before);
        return load("made.exr");
    }

    std::string directory_ = fs::temp_directory_path() / "tov-test-XXXXXX";
};
