// The option texts that the library builds its programs with.
#pragma once

#include <string>

namespace options {

// The layout of one image: the type word and component count of its definitions. Sampler has no count.
struct Layout {
    const char* type;
    const char* count;
};
inline constexpr Layout kAbsent = {"none", "none"};
inline constexpr Layout kSampler = {"sampler", ""};
inline constexpr Layout kFloat4 = {"float", "4"};
inline constexpr Layout kBufferLayouts[] = {{"uint", "1"},  {"uint", "2"},  {"uint", "3"},  {"uint", "4"},
                                            {"half", "1"},  {"half", "2"},  {"half", "3"},  {"half", "4"},
                                            {"float", "1"}, {"float", "2"}, {"float", "3"}, {"float", "4"}};

inline std::string image(const std::string& name, Layout layout, int width, int height) {
    if (std::string(layout.type) == "none") {
        return " -D " + name + "_COMP_NUM=none -D " + name + "_COMP_TYPE=none -D " + name + "_Res=(int2)1";
    }
    return " -D " + name + "_Res=(int2)(" + std::to_string(width) + "," + std::to_string(height) + ") -D " + name +
           "_COMP_NUM=" + layout.count + " -D " + name + "_COMP_TYPE=" + layout.type;
}

inline std::string define(const std::string& text) {
    return " -D " + text + " ";
}

// The whole option text of a pass with these definitions.
inline std::string ofPass(bool grid2D, const std::string& definitions) {
    return std::string("-Werror -cl-mad-enable -cl-fast-relaxed-math -cl-std=CL1.2 -I .  -D X64 ") +
           (grid2D ? " -D GROUP_DIM_2D " : " -D GROUP_DIM_1D ") + definitions + " -I../Tovkit/Impl/CL/";
}

}  // namespace options
