// The parsed form of one kernel: name, parameter list and body.
#pragma once

#include <string>
#include <string_view>
#include <utility>
#include <vector>

struct TovKernelVariable {
    std::string name;
    std::string type;

    // "type(name)" for the macro form of image parameters, "type name" otherwise.
    std::string text() const;
    // An image that the kernel writes.
    bool isOutput() const noexcept { return type.find("dstBufferType") != std::string::npos; }
};

struct TovKernelCode {
    std::string name;
    std::vector<TovKernelVariable> arguments;
    std::vector<std::pair<std::string, std::string>> definitions;  // name and value; filled by fusion
    std::string body;                                              // between the outer braces
    std::string helpers;                                           // inline functions; filled by fusion
};

// Fills name, arguments and body from a source text. A kernel that the text does not hold leaves arguments and body
// empty.
void ParseKernel(TovKernelCode& code, const std::string& kernelName, std::string_view source);

// The parsed kernel of an embedded source; parsed once per process and kept.
const TovKernelCode& embeddedKernelCode(const std::string& sourceName, const std::string& kernelName);
