#include "core/private_copies.h"

#include <algorithm>

#include "core/exception.h"
#include "core/filter_tree.h"
#include "core/image_checks.h"
#include "core/image_filter.h"
#include "zor/image.h"

void PrivateCopies::provide(const FilterTree& tree) {
    std::vector<const TovImage*> copied;
    for (const AliasedInput& input : aliasedInputs(tree)) {
        const auto known = std::find(copied.begin(), copied.end(), input.image);
        const auto index = static_cast<size_t>(known - copied.begin());
        zor::Buffer<char>& copy = known == copied.end() ? copyOf(index, *input.image) : *copies_[index].memory;
        if (known == copied.end()) copied.push_back(input.image);
        input.parameter->setStandIn(input.element, &copy);
    }
    size_t used = copied.size();
    TovImageFilter& root = *tree.nodes().front().filter;
    TovFilterParameter& output = *root.find("dstBuffer");
    if (root.spec().readsOutputBack && output.boundImage()->isOpenClImage())
        output.setStandIn(kReadBackElement, &imageLike(used++, *output.boundImage()));
    copies_.resize(used);
}

PrivateCopies::Copy& PrivateCopies::at(size_t index) {
    if (index >= copies_.size()) copies_.resize(index + 1);
    return copies_[index];
}

zor::Buffer<char>& PrivateCopies::copyOf(size_t index, const TovImage& image) {
    if (image.isOpenClImage()) {
        zor::Buffer<char>& copy = imageLike(index, image);
        zor::copyImage(*image.device(), image.storage()->memory(), copy.memory());
        return copy;
    }
    zor::Buffer<char>& copy = bufferLike(index, image);
    copy.copyFrom(*image.storage(), image.storage()->size());
    return copy;
}

zor::Buffer<char>& PrivateCopies::imageLike(size_t index, const TovImage& image) {
    Copy& copy = at(index);
    copy = {std::make_unique<zor::Buffer<char>>(*image.device(), 0, zor::BUFFER_NO_ALLOCATION), true};
    zor::MemoryHandle memory = zor::createImageLike(*image.device(), image.storage()->memory());
    copy.memory->adopt(memory.release(), image.storage()->size(), true);
    return *copy.memory;
}

zor::Buffer<char>& PrivateCopies::bufferLike(size_t index, const TovImage& image) {
    Copy& copy = at(index);
    const uint64_t size = image.storage()->size();
    if (copy.memory && !copy.isImage && copy.memory->size() >= size) return *copy.memory;
    copy.memory.reset();
    auto memory = std::make_unique<zor::Buffer<char>>(*image.device(), size, zor::BUFFER_DEFAULT);
    if (!memory->hasMemory()) throw TovException{TOV_ERROR_INTERNAL_ERROR};
    copy = {std::move(memory), false};
    return *copy.memory;
}
