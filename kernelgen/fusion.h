// Fusion: the kernels of a tree of filters as one generated program. Every inner kernel becomes an inline function that
// computes one pixel, and the outer kernel's reads of the bound image are redirected to it by a macro.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "kernelgen/kernel_code.h"

class TovImageFilter;

// ---- Text to text ----

// Appends the definitions of an option text: "-D name=value", or "-D flag", which is its own value.
void ParseDefinitions(TovKernelCode& code, std::string_view options);

// Appends the suffix to the names of the kernel, its arguments and its definitions, and to every identifier of the body
// that is one of them, alone or followed by a layout ending (_Res, _COMP_NUM, _COMP_TYPE). An array's suffix stands
// between its name and the index.
void RenameKernel(TovKernelCode& code, const std::string& suffix);

// The kernel as an inline function of its inputs and a pixel, which it returns instead of writing.
std::string InlineFunctionText(const TovKernelCode& code);

// Replaces the input image at a position by what the inner kernel reads, and reads of it by calls of that kernel.
// Throws unsupported when the argument is not an input image.
void MergeImageArgument(TovKernelCode& outer, size_t position, const TovKernelCode& inner);

// The whole program text. It begins with kIncludeCommon.
std::string GenerateSource(const TovKernelCode& code);
extern const std::string_view kIncludeCommon;

// ---- Filters to text ----

// The fused kernel of the tree under a filter. Throws unsupported when a kernel in it is not of the form that fusion
// needs, or when the result has more arguments than a launch takes.
TovKernelCode BuildJoinCode(TovImageFilter& root);
