// One kernel of a filter: what it is compiled with, what it is given and how it is launched.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "core/context.h"
#include "filters/define.h"
#include "filters/internal_parameter.h"
#include "kernelgen/kernel_code.h"

class TovFilterPass {
 public:
    // Throws the internal error for an unknown source or kernel.
    TovFilterPass(TovContext& context, const char* sourceName, const char* kernelName, bool grid2D);

    // ---- Filling by the catalogue ----

    // Appends the parameter as the next argument, and the layout definitions of its images under the name that the
    // kernel has at the same position. readBack: see TovInternalParameter.
    void addArgument(const TovFilterParameter& parameter, bool readBack = false);
    void addScratchArgument() { arguments_.push_back(std::make_unique<TovInternalParameter>(context_.scratch())); }
    void addStateArgument(const StateSlot& state) {
        arguments_.push_back(std::make_unique<TovInternalParameter>(state));
    }
    void addInternalParameter(std::unique_ptr<TovInternalParameter> p) { arguments_.push_back(std::move(p)); }
    void addDefine(std::unique_ptr<TovDefine> define) { defines_.push_back(std::move(define)); }
    void addParameterDefine(const std::string& name, const TovFilterParameter& parameter);
    // Appends " -D ", the text and one blank.
    void addBuildOption(const std::string& text) { ownDefines_ += " -D " + text + " "; }
    void setLocalSize(uint32_t x, uint32_t y) { localSize_ = {x, y}; }

    // ---- Running ----

    // The pass's own flags, then its definitions in order.
    std::string GetDefines() const;
    // The whole option text of a build of this kernel alone, without the include option.
    std::string GetBuildOptions() const;
    // Binds the arguments in kernel order. An inner pass of a fused kernel leaves its outputs out.
    void SetArguments(zor::Launcher& launcher, bool skipOutputs) const;
    // Builds or finds the kernel, binds it, launches one work item per pixel of the size, and waits. With a filter
    // given, the kernel is the fused one of the tree under that filter, whose first pass this is.
    void Execute(TovImageFilter* fusedRoot, const Size& size);
    void filterHasRun();

    const TovKernelCode& code() const noexcept { return code_; }
    // The parameter behind an entry of the argument list; null for buffers and past the end.
    const TovFilterParameter* argumentParameter(size_t index) const noexcept {
        return index < arguments_.size() ? arguments_[index]->parameter() : nullptr;
    }

 private:
    zor::Kernel* findKernel() const;
    zor::Kernel* findFusedKernel(TovImageFilter& root) const;
    void launch(zor::Launcher& launcher, const Size& size) const;

    std::string kernelName_;
    std::string sourceName_;
    std::vector<std::unique_ptr<TovInternalParameter>> arguments_;
    std::vector<std::unique_ptr<TovDefine>> defines_;
    TovContext& context_;
    const TovKernelCode& code_;
    Size localSize_ = {8, 8};
    std::string ownDefines_;
    bool grid2D_;
};
