// Which channels of a file make the picture.
#ifndef TOV_TOOLS_PICTURE_CHANNELS_H
#define TOV_TOOLS_PICTURE_CHANNELS_H

#include <optional>
#include <string>
#include <vector>

namespace tool {

struct ChannelChoice {
    std::vector<int> indices;        // in the file: gray, gray and alpha, RGB or RGBA
    std::vector<std::string> names;  // without their layer
};

// The first layer with R, G and B (and A); else one with luminance; else a lone channel, or X, Y and Z. None when the
// names do not say how the channels make a picture.
std::optional<ChannelChoice> chooseChannels(const std::vector<std::string>& fileChannels);

}  // namespace tool

#endif
