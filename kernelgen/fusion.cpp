#include "kernelgen/fusion.h"

#include <algorithm>
#include <array>
#include <map>
#include <optional>
#include <set>
#include <utility>
#include <vector>

#include "core/exception.h"
#include "core/image_filter.h"  // upward: the tree that is fused is one of filters
#include "zor/kernel.h"

const std::string_view kIncludeCommon = "#include \"common.cl\"\n\n";

namespace {

constexpr size_t kNone = std::string::npos;
constexpr std::array<std::string_view, 3> kLayoutEndings = {"_COMP_NUM", "_COMP_TYPE", "_Res"};
constexpr std::string_view kArrayType = "IMAGE_ARRAY";
constexpr std::string_view kRepeatType = "REPEAT";

bool contains(const std::string& text, std::string_view part) {
    return text.find(part) != kNone;
}
bool isArray(const TovKernelVariable& argument) {
    return contains(argument.type, kArrayType);
}

// ASCII only: source text, and independent of the locale.
bool isDigit(char c) {
    return c >= '0' && c <= '9';
}
bool isLetter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '_';
}

std::string_view trimBlanks(std::string_view text) {
    const size_t first = text.find_first_not_of(' ');
    if (first == kNone) return {};
    return text.substr(first, text.find_last_not_of(' ') - first + 1);
}

// Where the next option begins: a minus sign after a blank and before a letter. A negative value is none.
size_t nextOption(std::string_view options, size_t from) {
    for (size_t at = options.find(" -", from); at != kNone; at = options.find(" -", at + 1))
        if (at + 2 < options.size() && isLetter(options[at + 2])) return at;
    return options.size();
}

// ---- Renaming ----

class Renaming {
 public:
    explicit Renaming(std::string suffix) : suffix_(std::move(suffix)) {}

    void addName(const std::string& name) { names_.insert(name); }
    void addArray(const std::string& name) { arrays_.insert(name); }

    // The identifier's new form; itself when it is none of the names.
    std::string renamed(const std::string& identifier) const {
        if (names_.contains(identifier) || arrays_.contains(identifier)) return identifier + suffix_;
        for (const std::string_view ending : kLayoutEndings) {
            if (!identifier.ends_with(ending)) continue;
            const std::string name = identifier.substr(0, identifier.size() - ending.size());
            if (names_.contains(name)) return name + suffix_ + std::string(ending);
            return renamedElement(name) + std::string(ending);
        }
        return renamedElement(identifier);
    }

    std::string renamedText(const std::string& text) const {
        std::string result;
        for (size_t at = 0; at < text.size();) {
            size_t end = at;
            while (end < text.size() && (isLetter(text[end]) || isDigit(text[end]))) ++end;
            const bool isIdentifier = end > at && isLetter(text[at]);
            if (end == at) ++end;
            const std::string piece = text.substr(at, end - at);
            result += isIdentifier ? renamed(piece) : piece;
            at = end;
        }
        return result;
    }

 private:
    // "input2" of the array "input" becomes "input<suffix>2".
    std::string renamedElement(const std::string& identifier) const {
        const size_t digits = identifier.find_last_not_of("0123456789") + 1;
        if (digits == identifier.size() || !arrays_.contains(identifier.substr(0, digits))) return identifier;
        return identifier.substr(0, digits) + suffix_ + identifier.substr(digits);
    }

    std::string suffix_;
    std::set<std::string> names_;
    std::set<std::string> arrays_;
};

bool isLayoutDefinition(const std::string& name) {
    return std::any_of(kLayoutEndings.begin(), kLayoutEndings.end(),
                       [&](std::string_view ending) { return name.ends_with(ending); });
}

// ---- Rewriting a kernel as a function ----

// "WritePixel(buffer, x, y, value);" becomes "return value;".
void returnInsteadOfWriting(std::string& text) {
    constexpr std::string_view kWrite = "WritePixel(";
    for (size_t write = text.find(kWrite); write != kNone; write = text.find(kWrite)) {
        const size_t close = text.find(')', write);
        const size_t comma = close == kNone ? kNone : text.rfind(',', close);
        if (comma == kNone || comma < write) break;
        text.erase(close, 1);
        text.replace(write, comma + 1 - write, "return");
    }
}

// "GET_COORD(coord, limits)" becomes "coord = (int2)(xidx, yidx)" and loses its early return.
void takeCoordinates(std::string& text) {
    constexpr std::string_view kCoordinates = "GET_COORD(";
    for (size_t at = text.find(kCoordinates); at != kNone; at = text.find(kCoordinates)) {
        text.erase(at, kCoordinates.size());
        size_t end = at;
        for (int depth = 1; end < text.size() && depth > 0; ++end) {
            if (text[end] == '(') ++depth;
            if (text[end] == ')') --depth;
        }
        const size_t comma = text.find(',', at);
        if (comma == kNone || comma > end) break;
        text.replace(comma, end - comma, " = (int2)(xidx, yidx)");
    }
}

[[noreturn]] void refuseForm(const std::string& kernel) {
    refuse(TOV_ERROR_UNSUPPORTED, "Cannot fuse filters: " + kernel + " does not have the form that fusion needs");
}

// ---- Trees ----

// Levels number the kernels of a tree; a number that is taken gives way to the next free one.
class Levels {
 public:
    int take(int wished) {
        while (!used_.insert(wished).second) ++wished;
        return wished;
    }

 private:
    std::set<int> used_ = {0};
};

// Kernels name the elements of an array parameter in the singular: weights are weight0, weight1 …
std::string elementName(const TovFilterParameter& parameter) {
    std::string name = parameter.name();
    if (name.ends_with('s')) name.pop_back();
    return name;
}

struct Merge {
    size_t position;  // of the argument that the inner kernel replaces
    TovKernelCode inner;
};

class TreeFusion {
 public:
    TovKernelCode fuse(TovImageFilter& filter, int level) {
        const TovFilterPass& pass = filter.firstPass();
        TovKernelCode code = pass.code();
        ParseDefinitions(code, level == 0 ? pass.GetBuildOptions() : pass.GetDefines());
        nameRepeatedArguments(code, pass);
        if (level != 0) RenameKernel(code, std::to_string(level));
        std::vector<Merge> merges = expandArguments(code, pass, level);
        // From the last to the first, so that no merge moves the position of another.
        std::reverse(merges.begin(), merges.end());
        for (const Merge& merge : merges) MergeImageArgument(code, merge.position, merge.inner);
        return code;
    }

 private:
    // "REPEAT INPUTS_NUM" stands for float arguments whose name only the pass's parameter tells.
    static void nameRepeatedArguments(TovKernelCode& code, const TovFilterPass& pass) {
        for (size_t i = 0; i < code.arguments.size(); ++i) {
            if (code.arguments[i].type != kRepeatType) continue;
            const TovFilterParameter* parameter = pass.argumentParameter(i);
            if (parameter == nullptr || parameter->type() != TOV_PARAMETER_TYPE_FLOAT_ARRAY) refuseForm(code.name);
            code.arguments[i].name = elementName(*parameter);
        }
    }

    // Writes arrays out element by element and builds the kernels that are bound to image arguments.
    std::vector<Merge> expandArguments(TovKernelCode& code, const TovFilterPass& pass, int level) {
        const std::vector<TovKernelVariable> parsed = std::move(code.arguments);
        code.arguments.clear();
        std::vector<Merge> merges;
        for (size_t i = 0; i < parsed.size(); ++i) {
            const TovFilterParameter* parameter = pass.argumentParameter(i);
            const bool isElement = isArray(parsed[i]) || parsed[i].type == kRepeatType;
            const uint32_t count = isElement && parameter != nullptr ? parameter->count() : 1;
            for (uint32_t element = 0; element < count; ++element) {
                const size_t position = code.arguments.size();
                code.arguments.push_back(isElement ? elementOf(parsed[i], element) : parsed[i]);
                if (parsed[i].isOutput() || parameter == nullptr || !parameter->isImageLike()) continue;
                if (TovImageFilter* input = parameter->boundFilter(element))
                    merges.push_back(
                        {position, fuse(*input, levels_.take(level + kLevelStep + static_cast<int>(element)))});
            }
        }
        return merges;
    }

    static TovKernelVariable elementOf(const TovKernelVariable& array, uint32_t element) {
        const std::string name = array.name + std::to_string(element);
        return {name, isArray(array) ? "srcBufferType" : "float"};
    }

    static constexpr int kLevelStep = 10;
    Levels levels_;
};

}  // namespace

void ParseDefinitions(TovKernelCode& code, std::string_view options) {
    constexpr std::string_view kDefine = "-D ";
    for (size_t at = options.find(kDefine); at != kNone; at = options.find(kDefine, at)) {
        const size_t start = at + kDefine.size();
        const size_t end = nextOption(options, start);
        const std::string_view token = trimBlanks(options.substr(start, end - start));
        const size_t equals = token.find('=');
        const std::string_view value = equals == kNone ? token : token.substr(equals + 1);
        code.definitions.emplace_back(token.substr(0, equals), value);
        at = end;
    }
}

void RenameKernel(TovKernelCode& code, const std::string& suffix) {
    Renaming renaming(suffix);
    for (const TovKernelVariable& argument : code.arguments) {
        const bool isElement = isArray(argument) || argument.type == kRepeatType;
        isElement ? renaming.addArray(argument.name) : renaming.addName(argument.name);
    }
    for (const auto& definition : code.definitions)
        if (!isLayoutDefinition(definition.first)) renaming.addName(definition.first);
    for (TovKernelVariable& argument : code.arguments) argument.name += suffix;
    for (auto& definition : code.definitions) definition.first = renaming.renamed(definition.first);
    code.body = renaming.renamedText(code.body);
    code.name += suffix;
}

std::string InlineFunctionText(const TovKernelCode& code) {
    std::string text = code.helpers + "\ninline float4 " + code.name + "(\n";
    for (const TovKernelVariable& argument : code.arguments)
        if (!argument.isOutput()) text += "   " + argument.text() + ",\n";
    text += "   int xidx, \n   int yidx)\n{\n" + code.body + "}\n";
    returnInsteadOfWriting(text);
    takeCoordinates(text);
    return text;
}

void MergeImageArgument(TovKernelCode& outer, size_t position, const TovKernelCode& inner) {
    if (position >= outer.arguments.size() || !contains(outer.arguments[position].type, "srcBufferType"))
        refuseForm(outer.name);
    const std::string image = outer.arguments[position].name;
    std::vector<TovKernelVariable> inputs;
    std::copy_if(inner.arguments.begin(), inner.arguments.end(), std::back_inserter(inputs),
                 [](const TovKernelVariable& argument) { return !argument.isOutput(); });
    std::string call = inner.name + "(";
    for (const TovKernelVariable& argument : inputs) call += argument.name + ", ";
    call += "x, y)";

    const auto place = outer.arguments.begin() + static_cast<std::ptrdiff_t>(position);
    outer.arguments.insert(outer.arguments.erase(place), inputs.begin(), inputs.end());
    outer.helpers += InlineFunctionText(inner);
    outer.definitions.emplace_back("ReadPixel_" + image + "_COMP_TYPE_" + image + "_COMP_NUM(buffer, bufferSize, x, y)",
                                   call);
    outer.definitions.emplace_back(image + "_Res", "0");
    outer.definitions.insert(outer.definitions.end(), inner.definitions.begin(), inner.definitions.end());
}

std::string GenerateSource(const TovKernelCode& code) {
    std::string text(kIncludeCommon);
    for (const auto& [name, value] : code.definitions) text += "#define " + name + " " + value + "\n";
    text += code.helpers;
    text += "\n__kernel\nvoid " + code.name + "(\n";
    for (const TovKernelVariable& argument : code.arguments) text += "   " + argument.text() + ",\n";
    text.erase(text.size() - 2);
    return text + ")\n{\n" + code.body + "\n}";
}

TovKernelCode BuildJoinCode(TovImageFilter& root) {
    TovKernelCode code = TreeFusion().fuse(root, 0);
    if (code.arguments.size() > zor::kMaxLaunchArguments)
        refuse(TOV_ERROR_UNSUPPORTED, "Cannot fuse filters: the tree has " + std::to_string(code.arguments.size()) +
                                          " arguments, a launch takes " + std::to_string(zor::kMaxLaunchArguments));
    return code;
}
