// One run of a filter: checks, resources, passes.
#include <algorithm>

#include "core/exception.h"
#include "core/filter_tree.h"
#include "core/image_checks.h"
#include "core/image_filter.h"
#include "filters/value_checks.h"

namespace {

// OpenGL textures among input and output, acquired for OpenCL. Released when the run ends, however it ends.
class AcquiredTextures {
 public:
    explicit AcquiredTextures(const zor::Device& device) : device_(static_cast<const zor::DeviceCL&>(device)) {}
    AcquiredTextures(const AcquiredTextures&) = delete;
    AcquiredTextures& operator=(const AcquiredTextures&) = delete;

    ~AcquiredTextures() {
        try {
            release();
        } catch (...) {
            // The run has failed already and reports why.
        }
    }

    void acquire(const TovImage* image) {
        if (image == nullptr || image->externalKind() != EXTERNAL_KIND_TEXTURE) return;
        cl_mem memory = image->storage()->memory();
        memories_.reserve(memories_.size() + 1);
        zor::check(zor::cl().clEnqueueAcquireGLObjects(device_.queue(), 1, &memory, 0, nullptr, nullptr),
                   "clEnqueueAcquireGLObjects");
        memories_.push_back(memory);
    }

    // Releases all of them, then reports the first failure.
    void release() {
        cl_int first = CL_SUCCESS;
        for (cl_mem memory : memories_) {
            const cl_int status = zor::cl().clEnqueueReleaseGLObjects(device_.queue(), 1, &memory, 0, nullptr, nullptr);
            if (first == CL_SUCCESS) first = status;
        }
        memories_.clear();
        zor::check(first, "clEnqueueReleaseGLObjects");
    }

 private:
    const zor::DeviceCL& device_;
    std::vector<cl_mem> memories_;
};

// Everything that the filters inside a fused kernel read; what would be their outputs has a size of its own.
void acquireInnerInputs(AcquiredTextures& textures, const FilterTree& tree) {
    for (const FilterNode& node : tree.nodes()) {
        if (node.filter == tree.nodes().front().filter) continue;
        for (const TovFilterParameter* parameter : node.filter->imageParameters())
            for (uint32_t i = 0; !parameter->runSize() && i < parameter->imageCount(); ++i)
                textures.acquire(parameter->boundImage(i));
    }
}

// Copies that stand in for inputs during a run.
class StandIns {
 public:
    explicit StandIns(const FilterTree& tree) : tree_(tree) {}
    StandIns(const StandIns&) = delete;
    StandIns& operator=(const StandIns&) = delete;
    ~StandIns() {
        for (const FilterNode& node : tree_.nodes())
            for (TovFilterParameter* parameter : node.filter->imageParameters()) parameter->clearStandIns();
    }

 private:
    const FilterTree& tree_;
};

uint64_t pixelsOf(const TovFilterParameter& parameter) {
    const TovImage* image = parameter.boundImage();
    return image == nullptr ? 0 : image->pixelCount();
}

}  // namespace

void TovImageFilter::reserveState() {
    const uint64_t size = spec_.stateBytesPerPixel * pixelsOf(dstBuffer_);
    if ((stateBuffer_ || size == 0) && size <= stateBufferSize_) return;
    createStateBuffer(nullptr, size);
}

void TovImageFilter::apply() {
    TovContext& owner = require<TovContext>(context_);
    const FilterTree tree(*this);
    for (const FilterNode& node : tree.nodes()) {
        checkSizes(*node.filter);
        require<TovContext>(node.filter->context_);
        checkValues(*node.filter);
    }
    checkImages(tree);

    AcquiredTextures textures(*device_);
    textures.acquire(srcBuffer_.boundImage());
    acquireInnerInputs(textures, tree);
    textures.acquire(dstBuffer_.boundImage());
    owner.reserveScratch(spec_.scratchBytesPerPixel * pixelsOf(srcBuffer_));
    reserveState();
    const StandIns standIns(tree);
    privateCopies_.provide(tree);

    const TovImage& output = *dstBuffer_.boundImage();
    const Size asked = dstBufferSize_.asSize();
    const Size size = {std::min(asked[0], output.width()), std::min(asked[1], output.height())};
    for (const auto& pass : passes_) pass->Execute(tree.isFused() ? this : nullptr, size);
    textures.release();
    for (const FilterNode& node : tree.nodes())
        for (const auto& pass : node.filter->passes_) pass->filterHasRun();
}
