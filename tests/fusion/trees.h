// Chains and trees of the filters that can be fused, each run fused and filter by filter.
#pragma once

#include <string>
#include <vector>

#include "fixture.h"

namespace fusiontest {

using namespace apitest;

// A filter type with parameters under which it changes a picture.
struct Fusable {
    const char* name;
    uint32_t type;
    Parameters parameters;
};
const std::vector<Fusable>& fusableFilters();
const Fusable& fusable(uint32_t type);
bool takesInputArray(uint32_t type);

class FusionTest : public DeviceTest {
 protected:
    // A chain of filter types, the first one reads the input. Sums and products take what precedes as their first
    // input, and the picture itself as their second.
    struct Chain {
        std::vector<Handle> filters;
        std::vector<std::vector<tov_image>> arrays;  // by address, so they live as long as the chain
    };

    // The picture after all filters of the chain, each run on its own, through float images.
    static Picture runOneByOne(const std::vector<uint32_t>& types, const Picture& input, Layout output);
    // The same with each filter bound as the input of the next, in one run.
    static Picture runFused(const std::vector<uint32_t>& types, const Picture& input, Layout output);

    // Binds what feeds a filter: an image or a filter.
    static void bindInput(Chain& chain, tov_image_filter filter, uint32_t type, tov_image source, tov_image picture);
};

}  // namespace fusiontest
