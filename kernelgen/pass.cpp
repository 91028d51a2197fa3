#include "kernelgen/pass.h"

#include <array>
#include <limits>
#include <span>

#include "core/exception.h"
#include "kernelgen/fusion.h"
#include "kernelgen/option_text.h"
#include "kernelgen/sources.h"
#include "zor/cache_name.h"
#include "zor/file_time.h"

namespace {

constexpr std::string_view kFixedOptions = "-Werror -cl-mad-enable -cl-fast-relaxed-math -cl-std=CL1.2 -I . ";
constexpr uint64_t kMaxItems = std::numeric_limits<int32_t>::max();

std::string_view requireSource(const std::string& name) {
    const std::string_view source = findKernelSource(name);
    if (source.empty()) refuse(TOV_ERROR_INTERNAL_ERROR, "There is no kernel source named " + name);
    return source;
}

const TovKernelCode& requireKernelCode(const std::string& sourceName, const std::string& kernelName) {
    requireSource(sourceName);
    const TovKernelCode& code = embeddedKernelCode(sourceName, kernelName);
    if (code.arguments.empty())
        refuse(TOV_ERROR_INTERNAL_ERROR, "The kernel source " + sourceName + " has no kernel named " + kernelName);
    return code;
}

bool isQuarrion(const zor::Device& device) {
    std::array<char, zor::kDeviceTextBytes> vendor{};
    device.getVendorName(vendor.data());
    const std::string_view text(vendor.data());
    return text.find("QUARRION") != std::string_view::npos || text.find("Quarrion") != std::string_view::npos;
}

int32_t requireLaunchable(uint64_t items) {
    if (items > kMaxItems) refuse(TOV_ERROR_INTERNAL_ERROR, "The picture has more pixels than one launch can cover");
    return static_cast<int32_t>(items);
}

}  // namespace

TovFilterPass::TovFilterPass(TovContext& context, const char* sourceName, const char* kernelName, bool grid2D)
    : kernelName_(kernelName),
      sourceName_(sourceName),
      context_(context),
      code_(requireKernelCode(sourceName, kernelName)),
      grid2D_(grid2D) {}

void TovFilterPass::addArgument(const TovFilterParameter& parameter, bool readBack) {
    const size_t position = arguments_.size();
    arguments_.push_back(std::make_unique<TovInternalParameter>(parameter, readBack));
    if (!parameter.isImageLike()) return;
    addParameterDefine(position < code_.arguments.size() ? code_.arguments[position].name : std::string(), parameter);
}

void TovFilterPass::addParameterDefine(const std::string& name, const TovFilterParameter& parameter) {
    defines_.push_back(std::make_unique<TovDefine>(name, parameter));
}

std::string TovFilterPass::GetDefines() const {
    std::string text = ownDefines_;
    for (const auto& define : defines_) text += define->GetText();
    return text;
}

std::string TovFilterPass::GetBuildOptions() const {
    std::string text(kFixedOptions);
    if (isQuarrion(*context_.device())) text += " -D QUARRION ";
    text += " -D X64 ";
    text += grid2D_ ? " -D GROUP_DIM_2D " : " -D GROUP_DIM_1D ";
    return text + GetDefines();
}

void TovFilterPass::SetArguments(zor::Launcher& launcher, bool skipOutputs) const {
    for (size_t i = 0; i < arguments_.size(); ++i) {
        const bool isOutput = i < code_.arguments.size() && code_.arguments[i].isOutput();
        if (!(skipOutputs && isOutput)) arguments_[i]->SetKernelArgument(launcher);
    }
}

zor::Kernel* TovFilterPass::findKernel() const {
    const std::string fileName = std::string(kKernelDirectory) + sourceName_;
    const std::string options = GetBuildOptions() + " -I" + std::string(kKernelDirectory);
    const std::array sources = {requireSource(sourceName_)};
    return context_.device()->getKernel({.fileName = fileName,
                                         .kernelName = kernelName_,
                                         .options = options,
                                         .sources = sources,
                                         .dependencies = {},
                                         .keepInCache = true,
                                         .writeAfterRun = true});
}

// The fixed options of a single kernel are left out: the generated text carries every definition. A file of the shared
// text on disk is included and outdates cached binaries; without one the embedded text takes its place.
zor::Kernel* TovFilterPass::findFusedKernel(TovImageFilter& root) const {
    const std::string directory(kKernelDirectory);
    const std::string text = GenerateSource(BuildJoinCode(root));
    const std::string options = " -I" + directory + " -D HASH=" + decimal(HashSource(text.data(), text.size()));
    const std::string common = directory + "common.cl";
    const std::array<std::string_view, 1> dependencies = {common};
    const std::array<std::string_view, 1> included = {text};
    const std::array<std::string_view, 2> embedded = {commonKernelSource(),
                                                      std::string_view(text).substr(kIncludeCommon.size())};
    const bool isOnDisk = zor::fileExists(common);
    return context_.device()->getKernel({.fileName = directory + "Combined",
                                         .kernelName = kernelName_,
                                         .options = options,
                                         .sources = isOnDisk ? std::span<const std::string_view>(included) : embedded,
                                         .dependencies = dependencies,
                                         .keepInCache = true,
                                         .generatedSources = true,
                                         .writeAfterRun = true});
}

void TovFilterPass::Execute(TovImageFilter* fusedRoot, const Size& size) {
    zor::setCacheDirectory(context_.cachePath());
    zor::Kernel* kernel = fusedRoot != nullptr ? findFusedKernel(*fusedRoot) : findKernel();
    if (kernel == nullptr) throw TovException{TOV_ERROR_INTERNAL_ERROR};
    zor::Launcher launcher(*context_.device(), *kernel);
    SetArguments(launcher, false);
    launch(launcher, size);
}

void TovFilterPass::launch(zor::Launcher& launcher, const Size& size) const {
    const auto localX = static_cast<int32_t>(localSize_[0]);
    const auto localY = static_cast<int32_t>(localSize_[1]);
    if (grid2D_) {
        launcher.launch2D(requireLaunchable(size[0]), requireLaunchable(size[1]), localX, localY);
    } else {
        launcher.launch1D(requireLaunchable(uint64_t{size[0]} * size[1]), localX * localY);
    }
}

void TovFilterPass::filterHasRun() {
    for (const auto& argument : arguments_) argument->filterHasRun();
}
