// Reading pictures of every format that OpenImageIO knows.
#ifndef TOV_TOOLS_PICTURE_READER_H
#define TOV_TOOLS_PICTURE_READER_H

#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "picture.h"

namespace tool {

// Reads the whole picture as it is stored: no colour conversion, alpha not multiplied in; a stored orientation is
// applied. Throws kUnreadable; kFailed for a picture larger than any device image.
Picture readPicture(const std::string& path);

// The picture that a layer of a file holds: its name as for findLayer, or the name of one of the file's parts. Throws
// kUnreadable, also for a layer that is not there, naming those that are.
Picture readLayer(const std::string& path, const std::string& layer);

// "FILE" or "FILE:LAYER": where no file has the whole name, the layer follows the last colon that has a file before it.
// Of a file alone the first of the preferred layers that it has, else the picture as readPicture finds it.
Picture readFileOrLayer(const std::string& source, std::span<const std::string_view> preferred = {});

// Whether it is the name of a file, rather than of a layer in one.
bool isPictureFile(const std::string& source);

// The first of these names of layers for which the file has one. Throws kUnreadable.
std::optional<std::string> firstLayer(const std::string& path, std::span<const std::string_view> names);

}  // namespace tool

#endif
