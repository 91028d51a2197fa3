#include "core/filter_tree.h"

#include <algorithm>
#include <string>

#include "core/exception.h"
#include "core/image_filter.h"

namespace {

constexpr Size kNoSize = {0, 0};

[[noreturn]] void refuseFusion(const std::string& why) {
    refuse(TOV_ERROR_UNSUPPORTED, "Cannot fuse filters: " + why);
}

[[noreturn]] void refuseTooMany() {
    refuseFusion("the tree has more than " + std::to_string(FilterTree::kMaxPasses) + " passes");
}

bool isScaling(const TovImageFilter& filter) {
    return filter.spec().sizeRule == SizeRule::AnyInput;
}

void requireFusable(const TovImageFilter& filter) {
    if (!filter.spec().fusable)
        refuseFusion(filter.kernelName() + " has several passes, memory of its own or a window that every pixel walks");
}

// Keeps the path that leads to the filter being visited.
class PathStep {
 public:
    PathStep(std::vector<const TovImageFilter*>& path, const TovImageFilter& filter) : path_(path) {
        if (std::find(path.begin(), path.end(), &filter) != path.end())
            refuseFusion(filter.kernelName() + " feeds itself");
        if (path.size() == FilterTree::kMaxPasses) refuseTooMany();
        path_.push_back(&filter);
    }
    PathStep(const PathStep&) = delete;
    PathStep& operator=(const PathStep&) = delete;
    ~PathStep() { path_.pop_back(); }

 private:
    std::vector<const TovImageFilter*>& path_;
};

}  // namespace

FilterTree::FilterTree(TovImageFilter& root) {
    try {
        const TovImage* output = root.find("dstBuffer")->boundImage();
        visit(root, output == nullptr ? kNoSize : Size{output->width(), output->height()}, false);
    } catch (...) {
        clearSizes();
        throw;
    }
}

FilterTree::~FilterTree() {
    clearSizes();
}

void FilterTree::clearSizes() noexcept {
    for (const FilterNode& node : nodes_)
        for (const char* name : {"srcBufferSize", "dstBufferSize", "dstBuffer"})
            node.filter->find(name)->clearRunSize();
}

void FilterTree::visit(TovImageFilter& filter, const Size& outputSize, bool readsAround) {
    const PathStep step(path_, filter);
    if (nodes_.size() == kMaxPasses) refuseTooMany();
    nodes_.push_back({&filter, outputSize, readsAround || filter.spec().inPlace != InPlace::PerPixel});
    const bool inner = nodes_.size() > 1;
    if (inner) {
        requireFusable(filter);
        setInnerSizes(filter, outputSize);
    }
    visitInputs(filter, outputSize, nodes_.back().readsAround);
}

void FilterTree::visitInputs(TovImageFilter& filter, const Size& outputSize, bool readsAround) {
    for (TovFilterParameter* parameter : filter.imageParameters()) {
        const bool inner = nodes_.front().filter != &filter;
        if (inner && filter.isMainOutput(*parameter)) continue;  // an old binding, of no account
        for (uint32_t i = 0; i < parameter->imageCount(); ++i) {
            TovImageFilter* input = parameter->boundFilter(i);
            if (input == nullptr) continue;
            requireFusable(filter);
            const bool scaled = isScaling(filter) && filter.isInput(*parameter);
            const Size size = scaled ? naturalSize(*input) : outputSize;
            if (scaled) filter.find("srcBufferSize")->setRunSize(size);
            visit(*input, size, readsAround);
        }
    }
}

// A filter that feeds two others gives both the same pixels, so both must read the same size.
void FilterTree::setInnerSizes(TovImageFilter& filter, const Size& outputSize) {
    TovFilterParameter& size = *filter.find("dstBufferSize");
    if (size.runSize() && *size.runSize() != outputSize)
        refuseFusion(filter.kernelName() + " feeds filters that read different sizes from it");
    size.setRunSize(outputSize);
    filter.find("dstBuffer")->setRunSize(outputSize);
}

// The size that a filter's result would have as an image of its own.
Size FilterTree::naturalSize(TovImageFilter& filter) {
    const PathStep step(path_, filter);
    if (isScaling(filter)) {
        if (const auto size = filter.explicitOutputSize()) return *size;
        refuseFusion("a resampling filter that feeds another needs its size: set \"dstRec\"");
    }
    const TovFilterParameter& input = *filter.find("srcBuffer");
    if (TovImageFilter* inner = input.boundFilter()) return naturalSize(*inner);
    const TovImage* image = input.boundImage();
    if (image == nullptr) refuse(TOV_ERROR_INVALID_OPERATION, "No image is bound to srcBuffer");
    return {image->width(), image->height()};
}
