// Reading, checking and uploading.
#include "auxiliary_images.h"

#include "device_images.h"
#include "failure.h"
#include "picture_reader.h"

namespace tool {

namespace {

void clearAlpha(Picture& picture) {
    for (size_t i = 0; i < picture.pixelCount(); ++i) picture.pixels[i * kComponents + 3] = 0.0f;
}

}  // namespace

void refuseOtherSize(const std::string& name, const PixelSize& size, const std::string& pictureName,
                     const PixelSize& pictureSize) {
    if (size == pictureSize) return;
    throw usageFailure(name + " has " + describe(size) + " pixels, but " + pictureName + " has " +
                       describe(pictureSize) + ": pictures that a filter reads beside its input must be as large");
}

void AuxiliaryImages::add(const std::string& name, const Picture& picture) {
    made_[name] = {{picture.width, picture.height}, uploadPicture(*streams_, context_, picture, name)};
}

const AuxiliaryImages::Uploaded& AuxiliaryImages::read(const std::string& source, MissingAlpha missingAlpha) {
    const auto found = read_.find({source, missingAlpha});
    if (found != read_.end()) return found->second;
    Picture picture = readFileOrLayer(source);
    if (missingAlpha == MissingAlpha::kZero && !picture.alpha()) clearAlpha(picture);
    Uploaded uploaded{{picture.width, picture.height}, uploadPicture(*streams_, context_, picture, source)};
    return read_.emplace(std::pair{source, missingAlpha}, std::move(uploaded)).first->second;
}

tov_image AuxiliaryImages::get(const std::string& source, MissingAlpha missingAlpha, const PixelSize& expected,
                               const std::string& pictureName) {
    const auto made = made_.find(source);
    const auto& [size, image] = made == made_.end() ? read(source, missingAlpha) : made->second;
    refuseOtherSize(source, size, pictureName, expected);
    return image.get();
}

}  // namespace tool
