// Which channels of a file make the picture.
#ifndef TOV_TOOLS_PICTURE_CHANNELS_H
#define TOV_TOOLS_PICTURE_CHANNELS_H

#include <array>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace tool {

// What common renderers call the layer of the picture itself, in any letter case.
inline constexpr std::array<std::string_view, 3> kBeautyLayers = {"Combined", "beauty", "rgba"};

struct ChannelChoice {
    std::vector<int> indices;        // in the file: gray, gray and alpha, RGB or RGBA
    std::vector<std::string> names;  // without their layer
};

// The layer with R, G and B (and A) that has no name, else one of kBeautyLayers, else the first; else one with
// luminance; else a lone channel, or X, Y and Z. None when the names do not say how the channels make a picture.
std::optional<ChannelChoice> chooseChannels(const std::vector<std::string>& fileChannels);

// The layers in the order of the file: what stands before the last dot of a channel's name, else the name itself.
std::vector<std::string> layerNames(const std::vector<std::string>& fileChannels);

// Indices of the channels of a layer, given by its whole name or by what follows a dot in it, or of the one channel of
// that name. Names in the same letter case are preferred. Empty when there is none.
std::vector<int> findLayer(const std::vector<std::string>& fileChannels, const std::string& layer);

// As chooseChannels, among these channels only.
std::optional<ChannelChoice> chooseChannels(const std::vector<std::string>& fileChannels,
                                            const std::vector<int>& among);

}  // namespace tool

#endif
