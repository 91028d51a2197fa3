// Luminance of a picture, for filters that need to know it.
#ifndef TOV_TOOLS_LUMINANCE_H
#define TOV_TOOLS_LUMINANCE_H

#include <span>

namespace tool {

struct Luminance {
    float average;
    float maximum;

    // A black picture has no luminance to divide by.
    bool usable() const noexcept { return average > 0.0f && maximum > 0.0f; }
};

// Mean and largest of dot(RGB, (0.2126, 0.7152, 0.0722)) over the pixels where that is finite; 0 where there are none.
Luminance measureLuminance(std::span<const float> rgba);

}  // namespace tool

#endif
