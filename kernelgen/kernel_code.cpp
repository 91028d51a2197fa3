#include "kernelgen/kernel_code.h"

#include <algorithm>
#include <locale>
#include <map>
#include <regex>

#include "kernelgen/sources.h"
#include "zor/freed_at_unload.h"

namespace {

constexpr std::string_view kWhiteSpace = " \t\f\v\n\r";
constexpr size_t kNone = std::string_view::npos;

bool isWhiteSpace(char c) noexcept {
    return kWhiteSpace.find(c) != kNone;
}

std::string_view trim(std::string_view text) noexcept {
    const size_t first = text.find_first_not_of(kWhiteSpace);
    if (first == kNone) return {};
    return text.substr(first, text.find_last_not_of(kWhiteSpace) - first + 1);
}

// Position of the "(" that belongs to the ")" at close, or 0 when there is none.
size_t matchingParenthesis(std::string_view text, size_t close) noexcept {
    int depth = 1;
    size_t at = close;
    while (depth > 0 && at > 0) {
        --at;
        if (text[at] == ')') ++depth;
        if (text[at] == '(') --depth;
    }
    return at;
}

// Where the last parameter of the list begins: after a comma, or, for a parameter in macro form that may bring its own
// comma, after the white space in front of it.
size_t splitPoint(std::string_view list) noexcept {
    const size_t comma = list.rfind(',');
    const size_t close = list.rfind(')');
    if (close == kNone || (comma != kNone && close < comma)) return comma;
    size_t at = matchingParenthesis(list, close);
    while (at > 0)
        if (isWhiteSpace(list[--at])) return at;
    return kNone;
}

TovKernelVariable readArgument(std::string_view text) {
    if (const size_t open = text.rfind('('); open != kNone) {
        size_t end = text.find(',');
        if (end == kNone) end = text.find(')');
        if (end == kNone || end < open) end = text.size();
        return {std::string(text.substr(open + 1, end - open - 1)), std::string(text.substr(0, open))};
    }
    const size_t blank = text.find_last_of(" \t\n");
    if (blank == kNone) return {std::string(text), {}};
    return {std::string(text.substr(blank + 1)), std::string(text.substr(0, blank))};
}

std::vector<TovKernelVariable> splitArguments(std::string_view list) {
    std::vector<TovKernelVariable> arguments;
    for (;;) {
        const size_t split = splitPoint(list);
        const std::string_view piece = trim(split == kNone ? list : list.substr(split + 1));
        if (!piece.empty()) arguments.push_back(readArgument(piece));
        if (split == kNone) break;
        list = list.substr(0, split);
    }
    std::reverse(arguments.begin(), arguments.end());
    return arguments;
}

// What lies between the first "{" and its matching "}", or nothing where they do not match.
std::string_view bodyOf(std::string_view text) noexcept {
    const size_t open = text.find('{');
    if (open == kNone) return {};
    int depth = 1;
    for (size_t at = open + 1; at < text.size(); ++at) {
        if (text[at] == '{') ++depth;
        if (text[at] == '}' && --depth == 0) return text.substr(open + 1, at - open - 1);
    }
    return {};
}

using ParsedKernels = std::map<std::pair<std::string, std::string>, TovKernelCode>;  // by source and kernel

ParsedKernels* parsed = nullptr;
const FreedAtUnload<ParsedKernels> parsedOwner{parsed};

}  // namespace

std::string TovKernelVariable::text() const {
    const bool macro = isOutput() || type.find("srcBufferType") != std::string::npos;
    return macro ? type + "(" + name + ")" : type + " " + name;
}

void ParseKernel(TovKernelCode& code, const std::string& kernelName, std::string_view source) {
    code.name = kernelName;
    std::regex signature;
    signature.imbue(std::locale::classic());
    signature.assign("__kernel\\s+void\\s+" + kernelName + "\\([^{]+", std::regex::ECMAScript);
    std::match_results<std::string_view::const_iterator> match;
    if (!std::regex_search(source.begin(), source.end(), match, signature)) return;
    const size_t start = static_cast<size_t>(match.position(0));
    const size_t length = static_cast<size_t>(match.length(0));
    const std::string_view text = source.substr(start, length);
    const size_t open = text.find('(');
    const size_t close = text.rfind(')');
    if (close == kNone) return;
    code.arguments = splitArguments(text.substr(open + 1, close - open - 1));
    code.body = bodyOf(source.substr(start + length));
}

const TovKernelCode& embeddedKernelCode(const std::string& sourceName, const std::string& kernelName) {
    if (parsed == nullptr) parsed = new ParsedKernels;
    const std::pair key(sourceName, kernelName);
    if (const auto known = parsed->find(key); known != parsed->end()) return known->second;
    TovKernelCode code;
    ParseKernel(code, kernelName, findKernelSource(sourceName));
    return parsed->emplace(key, std::move(code)).first->second;
}
