// OpenImageIO's writer, and the conversion from RGBA to what a format stores.
#include "picture_writer.h"

#include <OpenImageIO/imageio.h>

#include <algorithm>
#include <cmath>
#include <filesystem>
#include <memory>
#include <string_view>

#include "failure.h"
#include "streams.h"
#include "text.h"

namespace tool {

namespace {

using Output = std::unique_ptr<OIIO::ImageOutput>;

// Formats that the image library counts as writable but that make no picture file.
bool makesNoFile(std::string_view format) {
    return format == "null" || format == "term";
}

// "exr, sxr, tif ...": the extensions of all writable formats. The lists read "format:ext,ext;format:ext".
std::string writableExtensions() {
    const std::string formatText = OIIO::get_string_attribute("output_format_list");
    const std::string extensionText = OIIO::get_string_attribute("extension_list");
    const auto formats = split(formatText, ',');
    std::vector<std::string> extensions;
    for (const std::string_view entry : split(extensionText, ';')) {
        const std::string_view format = entry.substr(0, entry.find(':'));
        if (std::ranges::find(formats, format) == formats.end() || makesNoFile(format)) continue;
        for (const std::string_view extension : split(entry.substr(format.size() + 1), ',')) {
            if (OIIO::ImageOutput::create("x." + std::string(extension))) extensions.emplace_back(extension);
        }
    }
    OIIO::geterror();  // forget what the attempts left
    return join(extensions, ", ");
}

Output createOutput(const std::string& path) {
    Output output = OIIO::ImageOutput::create(path);
    OIIO::geterror();
    if (output && !makesNoFile(output->format_name())) return output;
    const std::string extension = std::filesystem::path(path).extension().string();
    const std::string wrong = extension.empty() ? "the name has no extension to tell the format"
                                                : "no picture format has the extension \"" + extension + "\"";
    throw unwritable(path, wrong + "; known are " + writableExtensions());
}

const std::string& refuseImpossible(const std::string& path) {
    std::error_code ignored;
    if (path.ends_with('/') || std::filesystem::is_directory(path, ignored)) {
        throw unwritable(path, "it is a directory");
    }
    createOutput(path);
    return path;
}

constexpr float kLargestHalf = 65504.0f;

bool fitsHalf(const Picture& picture) {
    return std::ranges::all_of(picture.pixels,
                               [](float value) { return !std::isfinite(value) || std::abs(value) <= kLargestHalf; });
}

OIIO::TypeDesc storedType(const std::string& path, std::string_view format, const Picture& picture) {
    if (format == "openexr" && picture.half) {
        if (fitsHalf(picture)) return OIIO::TypeDesc::HALF;
        note(path + ": written as 32-bit floats, because some values are too large for 16 bits");
    }
    const bool holdsFloats = format == "openexr" || format == "tiff" || format == "hdr" || format == "zfile";
    return holdsFloats ? OIIO::TypeDesc::FLOAT : OIIO::TypeDesc::UINT8;
}

struct Channels {
    bool gray;
    bool alpha;
    int count() const noexcept { return (gray ? 1 : 3) + (alpha ? 1 : 0); }
};

Channels storedChannels(const std::string& path, const OIIO::ImageOutput& output, const Picture& picture) {
    const bool onlyColour = std::string_view(output.format_name()) == "hdr";
    const Channels channels{picture.gray() && !onlyColour,
                            picture.alpha() && !onlyColour && output.supports("alpha") != 0};
    if (picture.alpha() && !channels.alpha) note(path + ": alpha is not written, the format has none");
    return channels;
}

// Gray is the mean of the three colours, exactly the one value when they are equal.
float grayOf(const float* rgba) {
    if (rgba[0] == rgba[1] && rgba[1] == rgba[2]) return rgba[0];
    return (rgba[0] + rgba[1] + rgba[2]) / 3.0f;
}

std::vector<float> selectChannels(const Picture& picture, const Channels& channels) {
    std::vector<float> values;
    values.reserve(picture.pixelCount() * static_cast<size_t>(channels.count()));
    for (size_t i = 0; i < picture.pixelCount(); ++i) {
        const float* const rgba = &picture.pixels[i * kComponents];
        if (channels.gray) {
            values.push_back(grayOf(rgba));
        } else {
            values.insert(values.end(), rgba, rgba + 3);
        }
        if (channels.alpha) values.push_back(rgba[3]);
    }
    return values;
}

// Not-a-number has no place in whole numbers and becomes 0.
uint8_t toByte(float value) {
    constexpr float kLargestByte = 255.0f;
    if (!(value > 0.0f)) return 0;
    return static_cast<uint8_t>(std::lround(std::min(value, 1.0f) * kLargestByte));
}

OIIO::ImageSpec specFor(const OIIO::ImageOutput& output, const Picture& picture, const Channels& channels,
                        const OIIO::TypeDesc& type) {
    OIIO::ImageSpec spec(static_cast<int>(picture.width), static_cast<int>(picture.height), channels.count(), type);
    const std::string_view format = output.format_name();
    if (format == "openexr" && picture.channels.size() == static_cast<size_t>(channels.count())) {
        spec.channelnames = picture.channels;
    } else if (channels.gray) {
        spec.channelnames = {"Y"};
        if (channels.alpha) spec.channelnames.emplace_back("A");
    }
    spec.alpha_channel = channels.alpha ? channels.count() - 1 : -1;
    if (output.supports("displaywindow") != 0 && picture.window.fullWidth > 0) {
        spec.x = picture.window.x;
        spec.y = picture.window.y;
        spec.full_x = picture.window.fullX;
        spec.full_y = picture.window.fullY;
        spec.full_width = picture.window.fullWidth;
        spec.full_height = picture.window.fullHeight;
    }
    if (picture.pixelAspect != 1.0f) spec.attribute("PixelAspectRatio", picture.pixelAspect);
    // Without this the image library would divide colours by alpha on the way into most formats. TIFF stores either
    // kind and says which.
    if (format != "tiff" || picture.unassociatedAlpha) spec.attribute("oiio:UnassociatedAlpha", 1);
    return spec;
}

bool writePixels(OIIO::ImageOutput& output, const OIIO::TypeDesc& type, const std::vector<float>& values) {
    if (type != OIIO::TypeDesc::UINT8) return output.write_image(OIIO::TypeDesc::FLOAT, values.data());
    std::vector<uint8_t> bytes(values.size());
    std::ranges::transform(values, bytes.begin(), toByte);
    return output.write_image(OIIO::TypeDesc::UINT8, bytes.data());
}

}  // namespace

PictureWriter::PictureWriter(const std::string& path) : name_(path), file_(refuseImpossible(path)) {}

void PictureWriter::write(const Picture& picture) {
    const Output output = createOutput(file_.path());
    const OIIO::TypeDesc type = storedType(name_, output->format_name(), picture);
    const Channels channels = storedChannels(name_, *output, picture);
    const std::vector<float> values = selectChannels(picture, channels);
    const OIIO::ImageSpec spec = specFor(*output, picture, channels, type);
    // Closing writes what was held back, so it can fail like the rest.
    if (!output->open(file_.path(), spec) || !writePixels(*output, type, values) || !output->close()) {
        std::string why = output->geterror();
        std::ranges::replace(why, '\n', ' ');
        throw unwritable(name_, why.empty() ? "the disk may be full" : why);
    }
    file_.commit();
}

}  // namespace tool
