// OpenImageIO with alpha left as it is stored.
#include "test_pictures.h"

#include <stdexcept>

namespace tooltest {

Stored pattern(int width, int height, const std::vector<std::string>& channels, OIIO::TypeDesc type) {
    Stored picture{width, height, channels, {}, type};
    const size_t count = static_cast<size_t>(width) * static_cast<size_t>(height) * channels.size();
    // 8 bits hold thirds of 255 exactly, half and float hold quarters exactly.
    const unsigned steps = type == OIIO::TypeDesc::UINT8 ? 3 : 4;
    for (size_t i = 0; i < count; ++i) {
        picture.values.push_back(static_cast<float>((i * 7 + i / 5) % (steps + 1)) / static_cast<float>(steps));
    }
    return picture;
}

void store(const std::string& path, const Stored& picture) {
    const auto output = OIIO::ImageOutput::create(path);
    OIIO::ImageSpec spec(picture.width, picture.height, static_cast<int>(picture.channels.size()), picture.type);
    spec.channelnames = picture.channels;
    spec.alpha_channel = picture.channels.back() == "A" ? spec.nchannels - 1 : -1;
    spec.attribute("oiio:UnassociatedAlpha", 1);
    if (!output || !output->open(path, spec) || !output->write_image(OIIO::TypeDesc::FLOAT, picture.values.data()) ||
        !output->close()) {
        throw std::runtime_error("cannot store " + path);
    }
}

Stored load(const std::string& path) {
    OIIO::ImageSpec config;
    config.attribute("oiio:UnassociatedAlpha", 1);
    const auto input = OIIO::ImageInput::open(path, &config);
    if (!input) throw std::runtime_error("cannot load " + path + ": " + OIIO::geterror());
    const OIIO::ImageSpec& spec = input->spec();
    Stored picture{spec.width, spec.height, spec.channelnames, {}, spec.format};
    picture.values.resize(spec.image_pixels() * static_cast<size_t>(spec.nchannels));
    if (!input->read_image(0, 0, 0, spec.nchannels, OIIO::TypeDesc::FLOAT, picture.values.data())) {
        throw std::runtime_error("cannot read " + path);
    }
    return picture;
}

}  // namespace tooltest
