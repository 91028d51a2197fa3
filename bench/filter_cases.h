// The filters as the benchmarks run them: parameters, images and launch shapes.
#pragma once

#include <cstdint>
#include <span>
#include <string_view>
#include <variant>
#include <vector>

namespace bench {

// What an image holds. Colours have the layout under test, 8-bit or float; the rest are float images.
enum class Content { Color, HalfSizeColor, Normals, Depth, Positions, MeshIds, Variance };

struct Setting {
    const char* name;
    std::variant<uint32_t, float> value;
};

struct Feature {
    const char* parameter;
    Content content;
    bool isOutput = false;
};

struct FilterCase {
    const char* name;  // in the names of the benchmarks
    uint32_t type;     // TOV_IMAGE_FILTER_...
    std::vector<Setting> settings = {};
    std::vector<Feature> features = {};
    uint32_t arrayInputs = 0;           // images of the parameter "inputs", colours
    const char* arrayFloats = nullptr;  // float array of as many elements, each 0.5
    Content input = Content::Color;
    bool readsInput = true;  // sums and products read their arrays alone
    bool line = false;       // launches of 32 items in a line instead of groups of 8 x 8
    bool denoiser = false;   // measured at the smaller size only
    bool bytes = true;       // has a meaning for 8-bit pictures
    uint32_t settling = 1;   // executions until it works as it then goes on
};

std::span<const FilterCase> filterCases();

// Throws when there is none of that name.
const FilterCase& filterCase(std::string_view name);

}  // namespace bench
