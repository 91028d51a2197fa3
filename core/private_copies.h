// Copies of inputs that a run also writes. They are kept between runs for their memory, as long as each run needs them.
#pragma once

#include <cstddef>
#include <memory>
#include <vector>

#include "zor/buffer.h"

class FilterTree;
class TovImage;

class PrivateCopies {
 public:
    // Copies every input of the tree whose memory the run writes while it is still needed, and lets the copies stand in
    // for the inputs. An output that a later pass reads back gets an image of its own where it is an OpenCL image,
    // which no kernel may both read and write. Throws the internal error when the device has no room.
    void provide(const FilterTree& tree);

 private:
    struct Copy {
        std::unique_ptr<zor::Buffer<char>> memory;
        bool isImage = false;
    };

    zor::Buffer<char>& copyOf(size_t index, const TovImage& image);
    zor::Buffer<char>& imageLike(size_t index, const TovImage& image);
    zor::Buffer<char>& bufferLike(size_t index, const TovImage& image);
    Copy& at(size_t index);

    std::vector<Copy> copies_;
};
