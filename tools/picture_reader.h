// Reading pictures of every format that OpenImageIO knows.
#ifndef TOV_TOOLS_PICTURE_READER_H
#define TOV_TOOLS_PICTURE_READER_H

#include <string>

#include "picture.h"

namespace tool {

// Reads the whole picture as it is stored: no colour conversion, alpha not multiplied in; a stored orientation is
// applied. Throws kUnreadable; kFailed for a picture larger than any device image.
Picture readPicture(const std::string& path);

}  // namespace tool

#endif
