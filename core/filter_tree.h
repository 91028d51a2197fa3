// The filters that one run computes: a filter and, fused into its kernel, those that are bound where it reads images.
#pragma once

#include <vector>

#include "filters/parameter.h"

class TovImageFilter;

// One place in the tree; a filter that feeds several others has several.
struct FilterNode {
    TovImageFilter* filter;
    Size outputSize;   // pixels that whoever it feeds reads; the root's is its output image's
    bool readsAround;  // its pixels are read at other places than the root's own pixel, or its inputs' are
};

class FilterTree {
 public:
    // Walks the bindings and tells every filter the sizes of this run. Throws the code of a deleted handle; unsupported
    // for a tree that cannot be fused: circles, more than kMaxPasses filters, filters with memory or several passes.
    explicit FilterTree(TovImageFilter& root);
    FilterTree(const FilterTree&) = delete;
    FilterTree& operator=(const FilterTree&) = delete;
    ~FilterTree();

    static constexpr size_t kMaxPasses = 256;

    bool isFused() const noexcept { return nodes_.size() > 1; }
    // The root first.
    const std::vector<FilterNode>& nodes() const noexcept { return nodes_; }

 private:
    void visit(TovImageFilter& filter, const Size& outputSize, bool readsAround);
    void visitInputs(TovImageFilter& filter, const Size& outputSize, bool readsAround);
    void setInnerSizes(TovImageFilter& filter, const Size& outputSize);
    Size naturalSize(TovImageFilter& filter);
    void clearSizes() noexcept;

    std::vector<FilterNode> nodes_;
    std::vector<const TovImageFilter*> path_;  // from the root to the filter being visited
};
