#include "core/image_checks.h"

#include <limits>
#include <string>

#include "core/exception.h"
#include "core/filter_tree.h"
#include "core/image_filter.h"

namespace {

constexpr uint32_t kMaxSide = std::numeric_limits<int32_t>::max();  // kernels take sizes as signed numbers

// One image bound to one parameter of one filter of the tree.
struct Binding {
    const FilterNode* node;
    TovFilterParameter* parameter;
    uint32_t element;
    const TovImage* image;
    bool isOutput;
};

bool isOutput(const TovImageFilter& filter, const TovFilterParameter& parameter) {
    if (std::string_view(parameter.name()) == "dstBuffer") return true;
    for (const char* name : filter.spec().outputs)
        if (std::string_view(parameter.name()) == name) return true;
    return false;
}

// Outputs that are computed where they are read are no images.
std::vector<Binding> boundImages(const FilterTree& tree) {
    std::vector<Binding> bindings;
    for (const FilterNode& node : tree.nodes()) {
        for (TovFilterParameter* parameter : node.filter->imageParameters()) {
            if (parameter->runSize()) continue;
            const bool output = isOutput(*node.filter, *parameter);
            for (uint32_t i = 0; i < parameter->imageCount(); ++i)
                if (const TovImage* image = parameter->boundImage(i))
                    bindings.push_back({&node, parameter, i, image, output});
        }
    }
    return bindings;
}

std::string sizeText(uint32_t width, uint32_t height) {
    return std::to_string(width) + " x " + std::to_string(height);
}

[[noreturn]] void refuseImage(const Binding& binding, const std::string& why) {
    std::string name = binding.parameter->name();
    if (binding.parameter->type() == TOV_PARAMETER_TYPE_IMAGE_ARRAY)
        name += "[" + std::to_string(binding.element) + "]";
    refuse(TOV_ERROR_INVALID_OPERATION, name + " " + why);
}

void requireBound(TovImageFilter& filter, const char* name) {
    if (filter.find(name)->boundObject() == nullptr)
        refuse(TOV_ERROR_INVALID_OPERATION, std::string("No image is bound to ") + name);
}

void requireUsable(const Binding& binding, const DevicePointer& device) {
    const TovImage& image = *binding.image;
    const tov_image_desc& desc = image.desc();
    if (image.device() != device) refuseImage(binding, "belongs to another context than the filter");
    if (componentBytes(desc.type) == 0) refuseImage(binding, "has an unknown component type");
    if (desc.num_components < 1 || desc.num_components > 4) refuseImage(binding, "must have 1 to 4 components");
    if (image.width() == 0 || image.height() == 0)
        refuse(TOV_ERROR_INVALID_PARAMETER, std::string(binding.parameter->name()) + " has a width or height of 0");
    if (image.width() > kMaxSide || image.height() > kMaxSide) refuseImage(binding, "is too wide or too high");
    if (!image.hasStorage()) refuseImage(binding, "has no storage");
    // Kernels address rows of exactly the width, so a smaller row pitch leaves the last rows without storage.
    const uint64_t bytesPerPixel = uint64_t{desc.num_components} * componentBytes(desc.type);
    if (!image.isOpenClImage() && image.pixelCount() > image.storage()->size() / bytesPerPixel)
        refuseImage(binding, "has less storage than its pixels need (is the row pitch smaller than the width?)");
}

void requireSize(const Binding& binding) {
    const SizeRule rule = binding.node->filter->spec().sizeRule;
    const Size& output = binding.node->outputSize;
    const TovImage& image = *binding.image;
    if (rule == SizeRule::Unchecked) return;
    const bool isInput = std::string_view(binding.parameter->name()) == "srcBuffer";
    if (rule == SizeRule::AnyInput && isInput) return;
    const bool mustEqual = rule == SizeRule::EqualOutput || (rule == SizeRule::EqualInput && isInput);
    const bool covers = image.width() >= output[0] && image.height() >= output[1];
    const bool equals = image.width() == output[0] && image.height() == output[1];
    if (mustEqual ? equals : covers) return;
    refuseImage(binding, "has " + sizeText(image.width(), image.height()) + " pixels, the output " +
                             sizeText(output[0], output[1]) + (mustEqual ? ": this filter needs equal sizes" : ""));
}

// Buffers in which every pixel lies at the same place. No kernel may both read and write one OpenCL image object.
bool samePixels(const TovImage& a, const TovImage& b) {
    return !a.isOpenClImage() && !b.isOpenClImage() && a.storage()->memory() == b.storage()->memory() &&
           a.width() == b.width() && a.desc().type == b.desc().type &&
           a.desc().num_components == b.desc().num_components;
}

}  // namespace

void checkSizes(TovImageFilter& filter) {
    for (const char* name : {"dstBufferSize", "srcBufferSize"}) {
        const bool isBound = filter.find(name[0] == 'd' ? "dstBuffer" : "srcBuffer")->boundImage() != nullptr;
        const Size size = filter.find(name)->asSize();
        if (isBound && (size[0] == 0 || size[1] == 0))
            refuse(TOV_ERROR_INVALID_PARAMETER,
                   std::string("The ") + (name[0] == 'd' ? "output" : "input") + " has a width or height of 0");
    }
}

void checkImages(const FilterTree& tree) {
    const FilterNode& root = tree.nodes().front();
    requireBound(*root.filter, "dstBuffer");
    for (const FilterNode& node : tree.nodes()) {
        if (node.filter->device() != root.filter->device())
            refuse(TOV_ERROR_INVALID_OPERATION, "A filter that feeds another must belong to the same context");
        requireBound(*node.filter, "srcBuffer");
        for (const char* name : node.filter->spec().required) requireBound(*node.filter, name);
    }
    const std::vector<Binding> bindings = boundImages(tree);
    const TovImage& output = *root.filter->find("dstBuffer")->boundImage();
    // Later passes read around their pixels what earlier ones have written.
    const Size part = root.filter->find("dstBufferSize")->asSize();
    if (root.filter->spec().passes.size() > 1 && (part[0] < output.width() || part[1] < output.height()))
        refuse(TOV_ERROR_INVALID_PARAMETER, "dstRec of a filter of several passes must cover the output");
    for (const Binding& binding : bindings) requireUsable(binding, root.filter->device());
    for (const Binding& binding : bindings) requireSize(binding);
    for (const Binding& binding : bindings)
        if (binding.isOutput && std::string_view(binding.parameter->name()) != "dstBuffer" &&
            binding.image->sharesMemoryWith(output))
            refuse(TOV_ERROR_INVALID_PARAMETER, "Two outputs of a filter must not share memory");
}

std::vector<AliasedInput> aliasedInputs(const FilterTree& tree) {
    std::vector<AliasedInput> aliased;
    const std::vector<Binding> bindings = boundImages(tree);
    for (const Binding& input : bindings) {
        if (input.isOutput) continue;
        for (const Binding& output : bindings) {
            if (!output.isOutput || !input.image->sharesMemoryWith(*output.image)) continue;
            if (!input.node->readsAround && samePixels(*input.image, *output.image)) continue;
            aliased.push_back({input.parameter, input.element, input.image});
            break;
        }
    }
    return aliased;
}
