// OpenImageIO's reader, and the conversion of what it gives to RGBA.
#include "picture_reader.h"

#include <OpenImageIO/imagebuf.h>
#include <OpenImageIO/imagebufalgo.h>
#include <OpenImageIO/imageio.h>

#include <algorithm>
#include <filesystem>
#include <iterator>
#include <limits>
#include <memory>
#include <numeric>
#include <utility>

#include "failure.h"
#include "picture_channels.h"
#include "streams.h"
#include "text.h"

namespace tool {

namespace {

namespace fs = std::filesystem;

Failure unreadable(const std::string& path, const std::string& why) {
    return {ExitStatus::kUnreadable, "cannot read " + path + ": " + why};
}

void refuseWhatIsNoFile(const std::string& path) {
    std::error_code error;
    const fs::file_status status = fs::status(path, error);
    if (status.type() == fs::file_type::not_found) throw unreadable(path, "there is no such file");
    if (error) throw unreadable(path, systemError(error.value()));
    if (fs::is_directory(status)) throw unreadable(path, "it is a directory");
    if (!fs::is_regular_file(status)) throw unreadable(path, "it is not a regular file");
    const auto size = fs::file_size(path, error);
    if (!error && size == 0) throw unreadable(path, "it is empty");
}

// What the image library says of a failure, on one line.
std::string oneLine(std::string text) {
    while (!text.empty() && text.back() == '\n') text.pop_back();
    std::ranges::replace(text, '\n', ';');
    return text.empty() ? "the file is damaged or incomplete" : text;
}

std::unique_ptr<OIIO::ImageInput> open(const std::string& path) {
    refuseWhatIsNoFile(path);
    OIIO::ImageSpec config;
    config["oiio:UnassociatedAlpha"] = 1;  // alpha stays as it is stored
    auto input = OIIO::ImageInput::open(path, &config);
    if (!input) throw unreadable(path, oneLine(OIIO::geterror()));
    return input;
}

void refuseWhatIsNoPicture(const std::string& path, const OIIO::ImageSpec& spec) {
    if (spec.deep) throw unreadable(path, "it holds deep samples, which have to be flattened first");
    if (spec.depth > 1) throw unreadable(path, "it holds a volume, not a picture");
    if (spec.width <= 0 || spec.height <= 0 || spec.nchannels <= 0) throw unreadable(path, "it has no pixels");
    constexpr uint64_t kPixelBytes = kComponents * sizeof(float);
    constexpr uint64_t kMaxImageBytes = std::numeric_limits<uint32_t>::max();
    const uint64_t pixels = static_cast<uint64_t>(spec.width) * static_cast<uint64_t>(spec.height);
    if (pixels <= kMaxImageBytes / kPixelBytes) return;
    const uint64_t bytes = std::min(pixels, std::numeric_limits<uint64_t>::max() / kPixelBytes) * kPixelBytes;
    throw Failure(ExitStatus::kFailed, "the picture is too big for any device: " + std::to_string(spec.width) + " x " +
                                           std::to_string(spec.height) + " pixels need images of " +
                                           std::to_string(bytes) + " bytes; at most " + std::to_string(kMaxImageBytes) +
                                           " are available to one");
}

ChannelChoice channelsOf(const std::string& path, const OIIO::ImageSpec& spec) {
    auto choice = chooseChannels(spec.channelnames);
    if (!choice) {
        throw unreadable(path,
                         "its channels do not say how they make a picture (wanted: R, G, B and perhaps A, or one "
                         "gray channel): " +
                             join(spec.channelnames, ", "));
    }
    if (choice->indices.size() < spec.channelnames.size()) {
        std::vector<std::string> used;
        for (const int index : choice->indices) used.push_back(spec.channelnames[static_cast<size_t>(index)]);
        note(path + ": of its " + std::to_string(spec.nchannels) + " channels, " + join(used, ", ") + " are used");
    }
    return *std::move(choice);
}

// Gray becomes three equal colours, a missing alpha 1.
void spreadPixel(const float* stored, const std::vector<int>& offsets, float* rgba) {
    const bool gray = offsets.size() < 3;
    for (size_t c = 0; c < 3; ++c) rgba[c] = stored[offsets[gray ? 0 : c]];
    rgba[3] = offsets.size() % 2 == 0 ? stored[offsets.back()] : 1.0f;
}

void readPixels(OIIO::ImageInput& input, int part, const std::string& path, const std::vector<int>& indices,
                Picture& picture) {
    const auto [first, last] = std::ranges::minmax(indices);
    const size_t stride = static_cast<size_t>(last) - static_cast<size_t>(first) + 1;
    std::vector<float> stored(picture.pixelCount() * stride);
    input.geterror();  // forget what opening left
    const bool read = input.read_image(part, 0, first, last + 1, OIIO::TypeDesc::FLOAT, stored.data());
    // Some readers fill what is missing of a damaged file, report success and leave only an error text.
    if (!read || input.has_error()) throw unreadable(path, oneLine(input.geterror()));
    std::vector<int> offsets = indices;
    for (int& offset : offsets) offset -= first;
    picture.pixels.resize(picture.pixelCount() * kComponents);
    for (size_t i = 0; i < picture.pixelCount(); ++i) {
        spreadPixel(&stored[i * stride], offsets, &picture.pixels[i * kComponents]);
    }
}

// Cameras store turned pictures with a note which way is up.
void applyOrientation(Picture& picture, int orientation) {
    if (orientation <= 1) return;
    OIIO::ImageSpec spec(static_cast<int>(picture.width), static_cast<int>(picture.height), kComponents,
                         OIIO::TypeDesc::FLOAT);
    spec.attribute("Orientation", orientation);
    const OIIO::ImageBuf upright = OIIO::ImageBufAlgo::reorient(OIIO::ImageBuf(spec, picture.pixels.data()));
    std::vector<float> pixels(picture.pixels.size());
    if (!upright.get_pixels(upright.roi(), OIIO::TypeDesc::FLOAT, pixels.data())) return;
    picture.pixels = std::move(pixels);
    picture.width = static_cast<uint32_t>(upright.spec().width);
    picture.height = static_cast<uint32_t>(upright.spec().height);
    picture.window = {};
}

Picture readChannels(OIIO::ImageInput& input, int part, const std::string& path, ChannelChoice choice) {
    const OIIO::ImageSpec spec = input.spec(part);
    refuseWhatIsNoPicture(path, spec);
    Picture picture{.width = static_cast<uint32_t>(spec.width),
                    .height = static_cast<uint32_t>(spec.height),
                    .pixels = {},
                    .channels = std::move(choice.names),
                    .window = {spec.x, spec.y, spec.full_x, spec.full_y, spec.full_width, spec.full_height},
                    .pixelAspect = spec.get_float_attribute("PixelAspectRatio", 1.0f),
                    .half = spec.channelformat(choice.indices.front()) == OIIO::TypeDesc::HALF,
                    .unassociatedAlpha = spec.get_int_attribute("oiio:UnassociatedAlpha") != 0};
    readPixels(input, part, path, choice.indices, picture);
    applyOrientation(picture, spec.get_int_attribute("Orientation", 1));
    return picture;
}

// A layer's channels in one of the parts of a file.
struct LayerPlace {
    int part = 0;
    std::vector<int> channels;  // empty: no such layer
};

// The names of all layers are added to `names`, those of unnamed channels with their part's name.
LayerPlace findLayerIn(OIIO::ImageInput& input, const std::string& layer, std::vector<std::string>& names) {
    for (int part = 0; input.seek_subimage(part, 0); ++part) {
        const OIIO::ImageSpec spec = input.spec(part);
        std::vector<int> channels = findLayer(spec.channelnames, layer);
        const std::string partName = spec.get_string_attribute("oiio:subimagename");
        if (channels.empty() && !partName.empty() && partName == layer) {
            channels.resize(spec.channelnames.size());
            std::iota(channels.begin(), channels.end(), 0);
        }
        if (!channels.empty()) return {part, std::move(channels)};
        if (!partName.empty()) names.push_back(partName);
        std::ranges::copy(layerNames(spec.channelnames), std::back_inserter(names));
    }
    return {};
}

// Of a file whose first picture has a name like all others, as the parts of an OpenEXR file have, the beauty layer.
std::optional<std::string> beautyPart(OIIO::ImageInput& input, const std::string& path) {
    if (!input.seek_subimage(1, 0) || input.spec(0).get_string_attribute("oiio:subimagename").empty()) return {};
    return firstLayer(path, kBeautyLayers);
}

}  // namespace

Picture readPicture(const std::string& path) {
    const auto input = open(path);
    if (const auto layer = beautyPart(*input, path)) {
        note(path + ": of its layers, " + *layer + " is used");
        return readLayer(path, *layer);
    }
    const OIIO::ImageSpec spec = input->spec(0);
    refuseWhatIsNoPicture(path, spec);
    Picture picture = readChannels(*input, 0, path, channelsOf(path, spec));
    if (input->seek_subimage(1, 0)) note(path + ": only the first of its pictures is used");
    return picture;
}

Picture readLayer(const std::string& path, const std::string& layer) {
    const auto input = open(path);
    std::vector<std::string> names;
    const LayerPlace place = findLayerIn(*input, layer, names);
    if (place.channels.empty()) {
        throw unreadable(path, "it has no layer \"" + layer + "\"" + suggestion(layer, names) + "; its layers are " +
                                   join(names, ", "));
    }
    const OIIO::ImageSpec spec = input->spec(place.part);
    auto choice = chooseChannels(spec.channelnames, place.channels);
    if (!choice) {
        std::vector<std::string> channels;
        for (const int index : place.channels) channels.push_back(spec.channelnames[static_cast<size_t>(index)]);
        throw unreadable(path, "the channels of its layer \"" + layer +
                                   "\" do not say how they make a picture: " + join(channels, ", "));
    }
    return readChannels(*input, place.part, path, *std::move(choice));
}

bool isPictureFile(const std::string& source) {
    std::error_code ignored;
    return fs::is_regular_file(source, ignored);
}

Picture readFileOrLayer(const std::string& source, std::span<const std::string_view> preferred) {
    if (isPictureFile(source)) {
        const auto layer = firstLayer(source, preferred);
        return layer ? readLayer(source, *layer) : readPicture(source);
    }
    for (size_t colon = source.rfind(':'); colon != std::string::npos && colon > 0;
         colon = source.rfind(':', colon - 1)) {
        const std::string path = source.substr(0, colon);
        if (!isPictureFile(path)) continue;
        if (colon + 1 == source.size()) throw usageFailure(source + ": the name of the layer is missing");
        return readLayer(path, source.substr(colon + 1));
    }
    return readPicture(source);
}

std::optional<std::string> firstLayer(const std::string& path, std::span<const std::string_view> names) {
    const auto input = open(path);
    std::vector<std::string> ignored;
    for (const std::string_view name : names) {
        if (!findLayerIn(*input, std::string(name), ignored).channels.empty()) return std::string(name);
    }
    return std::nullopt;
}

}  // namespace tool
