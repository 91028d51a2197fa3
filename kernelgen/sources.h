// The OpenCL C texts that the library carries.
#pragma once

#include <string_view>

// "../Tovkit/Impl/CL/", relative to the working directory: where the sources nominally lie. Nothing has to be there,
// but a file there that is newer than a cached binary outdates it.
extern const std::string_view kKernelDirectory;

// The whole program text of a source name ("Filters", "Math" …), or an empty view for an unknown name.
std::string_view findKernelSource(std::string_view sourceName) noexcept;

// The shared support text that every program begins with.
std::string_view commonKernelSource() noexcept;
