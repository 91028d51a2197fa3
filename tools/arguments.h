// The command line.
#ifndef TOV_TOOLS_ARGUMENTS_H
#define TOV_TOOLS_ARGUMENTS_H

#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "devices.h"
#include "stage.h"

namespace tool {

// --help and --version: a text to be printed.
struct PrintCommand {
    std::string text;
};

struct DevicesCommand {};

struct FiltersCommand {
    std::optional<std::string> filter;
    bool markdown = false;
};

struct RunCommand {
    std::string input;
    std::vector<Stage> stages;
    std::string output;
    std::optional<DeviceChoice> device;
    std::optional<std::string> cache;
    bool verbose = false;
};

using Command = std::variant<PrintCommand, DevicesCommand, FiltersCommand, RunCommand>;

// Throws a usage failure for what the command line alone shows to be wrong, names of filters included.
Command parseArguments(int argc, const char* const* argv);

}  // namespace tool

#endif
