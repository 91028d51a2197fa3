// Writing pictures in every format that OpenImageIO knows.
#ifndef TOV_TOOLS_PICTURE_WRITER_H
#define TOV_TOOLS_PICTURE_WRITER_H

#include <string>

#include "picture.h"
#include "replacement_file.h"

namespace tool {

// Made before the work begins, so that a name nobody can write fails early. Throws kUnwritable: an extension without a
// writer, or a place where no file can be made.
class PictureWriter {
 public:
    explicit PictureWriter(const std::string& path);

    // Values are written as they are: OpenEXR as half if the picture was read from half and fits, else float; TIFF and
    // Radiance HDR as float; everything else as 8 bits, clamped to 0 ... 1 and rounded. Gray stays gray; alpha is
    // dropped where the format has none.
    void write(const Picture& picture);

 private:
    std::string name_;
    ReplacementFile file_;
};

}  // namespace tool

#endif
