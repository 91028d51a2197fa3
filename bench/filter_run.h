// One filter with its images over OpenCL buffers, attached to a queue and ready to execute.
#pragma once

#include <cstdint>
#include <vector>

#include "filter_cases.h"
#include "handle.h"
#include "opencl.h"

namespace bench {

struct PictureLayout {
    uint32_t width;
    uint32_t height;
    bool bytes;  // 8-bit instead of float components of colours

    uint32_t pixels() const noexcept { return width * height; }
    uint32_t bytesPerPixel() const noexcept { return bytes ? 4 : 16; }
};

void applySettings(const FilterCase& what, tov_image_filter filter);

class FilterRun {
 public:
    // With `opencl`, whose queue the context has adopted, the images lie in its buffers, otherwise in the library's.
    FilterRun(const OpenCL* opencl, tov_context context, const FilterCase& what, const PictureLayout& layout);

    void execute();

    // Bytes that the algorithm has to move: each input read and each output written once.
    double bytesMoved() const noexcept { return static_cast<double>(bytesMoved_); }

    tov_image inputImage() const noexcept { return images_[0].handle.get(); }
    tov_image outputImage() const noexcept { return images_[1].handle.get(); }
    cl_mem input() const noexcept { return images_[0].memory.get(); }
    cl_mem output() const noexcept { return images_[1].memory.get(); }
    cl_mem feature(size_t index) const noexcept { return images_[2 + index].memory.get(); }

 private:
    struct Image {
        ClBuffer memory;  // empty without OpenCL of our own
        Handle handle;
    };
    tov_image addImage(Content content);
    Image makeImage(const tov_image_desc& desc, size_t bytes, const void* pixels) const;
    void bindFeatures();
    void bindArrays();

    const OpenCL* opencl_;
    tov_context context_;
    const FilterCase& what_;
    PictureLayout layout_;
    uint64_t bytesMoved_ = 0;
    std::vector<Image> images_;  // input, output, features, array elements
    std::vector<tov_image> arrayImages_;
    std::vector<float> arrayFloats_;
    Handle filter_;
    Handle queue_;
};

}  // namespace bench
