// A picture in memory, and how it was stored.
#ifndef TOV_TOOLS_PICTURE_H
#define TOV_TOOLS_PICTURE_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace tool {

// Whatever the file held, pixels are worked on as RGBA floats.
inline constexpr size_t kComponents = 4;

// Where the stored pixels lie in the plane, as OpenEXR's data and display windows tell.
struct Window {
    int x = 0;
    int y = 0;
    int fullX = 0;
    int fullY = 0;
    int fullWidth = 0;  // 0: the pixels themselves
    int fullHeight = 0;
};

struct Picture {
    uint32_t width = 0;
    uint32_t height = 0;
    std::vector<float> pixels;          // RGBA, rows from the top
    std::vector<std::string> channels;  // names as stored: gray, gray and alpha, RGB or RGBA
    Window window;
    float pixelAspect = 1.0f;
    bool half = false;               // stored as 16-bit floats
    bool unassociatedAlpha = false;  // colour not multiplied by alpha

    bool gray() const noexcept { return channels.size() < 3; }
    bool alpha() const noexcept { return channels.size() % 2 == 0; }
    size_t pixelCount() const noexcept { return size_t{width} * height; }
};

}  // namespace tool

#endif
