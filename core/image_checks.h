// What must hold of a run's images: everything bound is looked at again, since images may have been deleted, rebound or
// attached to another queue since they were checked.
#pragma once

#include <cstdint>
#include <vector>

class FilterTree;
class TovFilterParameter;
class TovImage;
class TovImageFilter;

// The sizes that the filter works on are not 0: invalid parameter.
void checkSizes(TovImageFilter& filter);

// Every image of the tree is there where it must be, belongs to the device, has a known layout, storage for all its
// pixels and at least the size that its reader addresses: invalid operation. Two outputs share no memory: invalid
// parameter.
void checkImages(const FilterTree& tree);

// An input whose memory the run writes while it still needs it.
struct AliasedInput {
    TovFilterParameter* parameter;
    uint32_t element;
    const TovImage* image;
};
std::vector<AliasedInput> aliasedInputs(const FilterTree& tree);
