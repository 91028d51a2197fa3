// Filters and parameters as text.
#include "filter_listing.h"

#include <algorithm>

#include "filter_info.h"
#include "filter_names.h"
#include "text.h"

namespace tool {

namespace {

constexpr const char* kMarkdownHead =
    "# Filters\n"
    "\n"
    "Every filter with its parameters, their types and defaults, as the library itself describes them: this page is "
    "the\noutput of `tov filters --markdown`. Names are those of the command line; in code, `gamma_correction` is\n"
    "`TOV_IMAGE_FILTER_GAMMA_CORRECTION`, and parameters keep their names.\n";

size_t widest(const std::vector<ParameterInfo>& parameters, std::string (*text)(const ParameterInfo&)) {
    size_t width = 0;
    for (const ParameterInfo& parameter : parameters) width = std::max(width, text(parameter).size());
    return width;
}

std::string padded(std::string text, size_t width) {
    text.resize(std::max(text.size(), width), ' ');
    return text;
}

// "  cGamma  float = 1  gamma correction coefficient"
std::string plainText(const std::string& name, const FilterInfo& info) {
    const auto parameterName = [](const ParameterInfo& parameter) { return parameter.name; };
    const auto typeAndValue = [](const ParameterInfo& parameter) {
        return typeName(parameter.type) + " = " + valueText(parameter);
    };
    const size_t nameWidth = widest(info.parameters, parameterName);
    const size_t typeWidth = widest(info.parameters, typeAndValue);
    std::string text = name + "\n";
    if (!info.description.empty()) text += "  " + info.description + "\n";
    for (const ParameterInfo& parameter : info.parameters) {
        std::string line = "    " + padded(parameter.name, nameWidth) + "  " +
                           padded(typeAndValue(parameter), typeWidth) + "  " + parameter.description;
        line.erase(line.find_last_not_of(' ') + 1);
        text += line + "\n";
    }
    return text;
}

// Descriptions are plain text: what Markdown would take as its own is escaped.
std::string escaped(const std::string& text) {
    std::string result;
    for (const char c : text) {
        if (std::string_view("`*_|\\<").find(c) != std::string_view::npos) result += '\\';
        result += c;
    }
    result.erase(result.find_last_not_of(' ') + 1);
    return result;
}

std::string markdownText(const std::string& name, const FilterInfo& info) {
    std::string text = "\n## " + name + "\n";
    if (!info.description.empty()) text += "\n" + escaped(info.description) + "\n";
    if (info.parameters.empty()) return text + "\nNo parameters.\n";
    text += "\n| parameter | type | default | description |\n|---|---|---|---|\n";
    for (const ParameterInfo& parameter : info.parameters) {
        text += "| `" + parameter.name + "` | " + typeName(parameter.type) + " | " + valueText(parameter) + " | " +
                escaped(parameter.description) + " |\n";
    }
    return text;
}

}  // namespace

std::string listFilters(tov_context context, const std::optional<std::string>& name, bool markdown) {
    std::string text = markdown && !name ? kMarkdownHead : "";
    for (const NamedValue& row : filterNames()) {
        if (name && *name != row.name) continue;
        const Handle filter = createFilter(context, row.name);
        const FilterInfo info = readFilterInfo(filter.get());
        if (!markdown && !text.empty()) text += "\n";
        text += markdown ? markdownText(row.name, info) : plainText(row.name, info);
    }
    return text;
}

}  // namespace tool
