// The command line.
#ifndef TOV_TOOLS_ARGUMENTS_H
#define TOV_TOOLS_ARGUMENTS_H

#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "denoise.h"
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

// What all work on pictures has in common.
struct WorkArguments {
    std::string input;
    std::string output;
    std::optional<DeviceChoice> device;
    std::optional<std::string> cache;
    bool verbose = false;
};

struct RunCommand {
    WorkArguments work;
    std::vector<Stage> stages;
    bool fuse = false;
};

struct DenoiseCommand {
    WorkArguments work;
    DenoiseOptions options;
};

using Command = std::variant<PrintCommand, DevicesCommand, FiltersCommand, RunCommand, DenoiseCommand>;

// Throws a usage failure for what the command line alone shows to be wrong, names of filters included.
Command parseArguments(int argc, const char* const* argv);

}  // namespace tool

#endif
