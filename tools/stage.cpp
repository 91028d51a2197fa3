// Splitting of -f arguments. Everything after a '=' up to the next comma is the value, colons included.
#include "stage.h"

#include <algorithm>
#include <limits>

#include "failure.h"
#include "picture.h"
#include "text.h"

namespace tool {

namespace {

Assignment parseAssignment(std::string_view text, const std::string& where) {
    const size_t equals = text.find('=');
    if (equals == std::string_view::npos || equals == 0) {
        throw usageFailure(where + ": \"" + std::string(text) + "\" is not of the form param=value");
    }
    if (equals + 1 == text.size()) throw usageFailure(where + ": " + std::string(text) + " has no value");
    return {std::string(text.substr(0, equals)), std::string(text.substr(equals + 1))};
}

}  // namespace

bool Stage::sets(std::string_view parameter) const noexcept {
    return std::ranges::find(assignments, parameter, &Assignment::parameter) != assignments.end();
}

Stage parseStage(std::string_view text) {
    const std::string where = "-f " + std::string(text);
    const size_t colon = text.find(':');
    Stage stage{std::string(text.substr(0, colon)), {}};
    if (stage.filter.empty()) throw usageFailure(where + ": the name of the filter is missing");
    if (colon == std::string_view::npos) return stage;
    for (const std::string_view part : split(text.substr(colon + 1), ',')) {
        Assignment assignment = parseAssignment(part, where);
        const bool isSize = stage.filter == kResampleFilter && assignment.parameter == "size";
        if (stage.sets(assignment.parameter) || (isSize && stage.size))
            throw usageFailure(where + ": " + assignment.parameter + " is given twice");
        if (isSize) {
            stage.size = parsePixelSize(assignment.value, where + ": size");
        } else {
            stage.assignments.push_back(std::move(assignment));
        }
    }
    return stage;
}

PixelSize parsePixelSize(std::string_view text, const std::string& what) {
    const size_t cross = text.find('x');
    if (cross == std::string_view::npos) {
        throw usageFailure(what + ": \"" + std::string(text) + "\" is not of the form WIDTHxHEIGHT");
    }
    const PixelSize size{parseUint(text.substr(0, cross), what), parseUint(text.substr(cross + 1), what)};
    if (size.width == 0 || size.height == 0) throw usageFailure(what + ": \"" + std::string(text) + "\" has no pixels");
    constexpr uint64_t kMaxPixels = std::numeric_limits<uint32_t>::max() / (kComponents * sizeof(float));
    if (uint64_t{size.width} * size.height > kMaxPixels) {
        throw usageFailure(what + ": \"" + std::string(text) + "\" is too large; an image has at most " +
                           std::to_string(kMaxPixels) + " pixels");
    }
    return size;
}

std::string describe(const PixelSize& size) {
    return std::to_string(size.width) + " x " + std::to_string(size.height);
}

}  // namespace tool
