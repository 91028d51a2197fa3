// The pictures that filters read beside their input.
#ifndef TOV_TOOLS_AUXILIARY_IMAGES_H
#define TOV_TOOLS_AUXILIARY_IMAGES_H

#include <map>
#include <string>
#include <utility>

#include "handle.h"
#include "picture.h"
#include "stage.h"
#include "streams.h"

namespace tool {

// What stands in for the alpha that a file lacks. Filters that take the length of a variance's four components must
// not see a constant 1 there.
enum class MissingAlpha { kOne, kZero };

// Throws a usage failure that names both pictures and their sizes, where these differ.
void refuseOtherSize(const std::string& name, const PixelSize& size, const std::string& pictureName,
                     const PixelSize& pictureSize);

// On the device, each file (or layer of one) once.
class AuxiliaryImages {
 public:
    AuxiliaryImages(Streams& streams, tov_context context) : streams_(&streams), context_(context) {}

    // Makes a picture known under a name, as if a file of that name held it. Its alpha stays as it is.
    void add(const std::string& name, const Picture& picture);

    // The image of a file or layer, read the first time; it lives as long as this. One channel is gray. Throws
    // kUnreadable; a usage failure where its size is not the one of the picture that it goes with.
    tov_image get(const std::string& source, MissingAlpha missingAlpha, const PixelSize& expected,
                  const std::string& pictureName);

 private:
    struct Uploaded {
        PixelSize size;
        Handle image;
    };

    const Uploaded& read(const std::string& source, MissingAlpha missingAlpha);

    Streams* streams_;
    tov_context context_;
    std::map<std::string, Uploaded> made_;
    std::map<std::pair<std::string, MissingAlpha>, Uploaded> read_;
};

}  // namespace tool

#endif
