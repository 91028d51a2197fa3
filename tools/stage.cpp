// Splitting of -f arguments. Everything after a '=' up to the next comma is the value, colons included.
#include "stage.h"

#include <algorithm>

#include "failure.h"
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
        if (stage.sets(assignment.parameter))
            throw usageFailure(where + ": " + assignment.parameter + " is given twice");
        stage.assignments.push_back(std::move(assignment));
    }
    return stage;
}

}  // namespace tool
