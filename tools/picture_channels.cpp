// Channel names are LAYER.NAME or NAME alone, as in OpenEXR files.
#include "picture_channels.h"

#include <algorithm>
#include <array>
#include <initializer_list>
#include <iterator>
#include <string_view>

#include "text.h"

namespace tool {

namespace {

struct ChannelName {
    std::string layer;
    std::string name;
};

ChannelName splitName(const std::string& channel) {
    const size_t dot = channel.rfind('.');
    if (dot == std::string::npos) return {"", channel};
    return {channel.substr(0, dot), channel.substr(dot + 1)};
}

struct NameTest {
    bool anyCase;
    bool ending;  // after a dot

    bool operator()(std::string_view name, std::string_view wanted) const {
        const auto same = [this](char a, char b) { return anyCase ? lower(a) == lower(b) : a == b; };
        if (ending && name.size() > wanted.size()) {
            name.remove_prefix(name.size() - wanted.size() - 1);
            if (name.front() != '.') return false;
            name.remove_prefix(1);
        }
        return std::ranges::equal(name, wanted, same);
    }
};

constexpr NameTest kAnyCase = {true, false};
constexpr NameTest kAnyCaseEnding = {true, true};

// From the strictest to the most forgiving.
constexpr std::array kNameTests = {NameTest{false, false}, NameTest{false, true}, kAnyCase, kAnyCaseEnding};

// 0 for the layer without a name, then the beauty layers in their order, then all others alike.
size_t rank(const std::string& layer) {
    if (layer.empty()) return 0;
    const auto isLayer = [&](std::string_view name) { return kAnyCaseEnding(layer, name); };
    return 1 + static_cast<size_t>(std::ranges::find_if(kBeautyLayers, isLayer) - kBeautyLayers.begin());
}

class Layers {
 public:
    explicit Layers(const std::vector<std::string>& channels) {
        for (const std::string& channel : channels) {
            channels_.push_back(splitName(channel));
            const std::string& layer = channels_.back().layer;
            if (std::ranges::find(layers_, layer) == layers_.end()) layers_.push_back(layer);
        }
        std::ranges::stable_sort(layers_, {}, rank);
    }

    // The first layer that has all of the wanted names and none of the unwanted, with alpha if it has one.
    std::optional<ChannelChoice> find(std::initializer_list<std::string_view> wanted,
                                      std::initializer_list<std::string_view> unwanted) const {
        for (const std::string& layer : layers_) {
            const auto absent = [&](std::string_view name) { return index(layer, name) < 0; };
            if (std::ranges::any_of(wanted, absent) || !std::ranges::all_of(unwanted, absent)) continue;
            ChannelChoice choice;
            for (const std::string_view name : wanted) add(choice, index(layer, name));
            add(choice, index(layer, "A"));
            return choice;
        }
        return std::nullopt;
    }

    // The only channel besides alpha, whatever it is called.
    std::optional<ChannelChoice> findLone() const {
        std::optional<ChannelChoice> choice;
        for (size_t i = 0; i < channels_.size(); ++i) {
            if (kAnyCase(channels_[i].name, "A") && channels_.size() > 1) continue;
            if (choice) return std::nullopt;
            add(choice.emplace(), static_cast<int>(i));
        }
        if (choice) add(*choice, channels_.size() > 1 ? index(channels_[0].layer, "A") : -1);
        return choice;
    }

 private:
    int index(const std::string& layer, std::string_view name) const {
        for (size_t i = 0; i < channels_.size(); ++i) {
            if (channels_[i].layer == layer && kAnyCase(channels_[i].name, name)) return static_cast<int>(i);
        }
        return -1;
    }

    void add(ChannelChoice& choice, int channel) const {
        if (channel < 0) return;
        choice.indices.push_back(channel);
        choice.names.push_back(channels_[static_cast<size_t>(channel)].name);
    }

    std::vector<ChannelName> channels_;
    std::vector<std::string> layers_;  // the likeliest to be the picture itself first
};

}  // namespace

std::vector<std::string> layerNames(const std::vector<std::string>& fileChannels) {
    std::vector<std::string> names;
    for (const std::string& channel : fileChannels) {
        const ChannelName split = splitName(channel);
        const std::string& name = split.layer.empty() ? split.name : split.layer;
        if (std::ranges::find(names, name) == names.end()) names.push_back(name);
    }
    return names;
}

std::vector<int> findLayer(const std::vector<std::string>& fileChannels, const std::string& layer) {
    std::vector<ChannelName> channels;
    std::ranges::transform(fileChannels, std::back_inserter(channels), splitName);
    for (const NameTest& test : kNameTests) {
        const auto found = std::ranges::find_if(
            channels, [&](const ChannelName& channel) { return !channel.layer.empty() && test(channel.layer, layer); });
        if (found == channels.end()) continue;
        std::vector<int> indices;
        for (size_t i = 0; i < channels.size(); ++i) {
            if (channels[i].layer == found->layer) indices.push_back(static_cast<int>(i));
        }
        return indices;
    }
    // A component of a vector is no picture of its own, unless asked for by its whole name.
    const auto ofVector = [&](const ChannelName& channel) {
        const auto isX = [&](const ChannelName& other) {
            return other.layer == channel.layer && lower(other.name[0]) == 'x';
        };
        return channel.name.size() == 1 && lower(channel.name[0]) != 'x' && std::ranges::any_of(channels, isX);
    };
    for (const NameTest& test : kNameTests) {
        for (size_t i = 0; i < fileChannels.size(); ++i) {
            if (test.ending && ofVector(channels[i])) continue;
            if (test(fileChannels[i], layer)) return {static_cast<int>(i)};
        }
    }
    return {};
}

std::optional<ChannelChoice> chooseChannels(const std::vector<std::string>& fileChannels,
                                            const std::vector<int>& among) {
    std::vector<std::string> names;
    for (const int index : among) names.push_back(fileChannels[static_cast<size_t>(index)]);
    auto choice = chooseChannels(names);
    if (choice) {
        for (int& index : choice->indices) index = among[static_cast<size_t>(index)];
    }
    return choice;
}

std::optional<ChannelChoice> chooseChannels(const std::vector<std::string>& fileChannels) {
    const Layers layers(fileChannels);
    if (auto colour = layers.find({"R", "G", "B"}, {})) return colour;
    if (auto luminance = layers.find({"Y"}, {"X", "Z", "RY", "BY"})) return luminance;
    if (auto lone = layers.findLone()) return lone;
    return layers.find({"X", "Y", "Z"}, {});
}

}  // namespace tool
