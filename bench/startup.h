// What a host waits for before its first picture: compilation, the library's cache, creation of filters.
#pragma once

#include <string>
#include <vector>

#include "device_option.h"

namespace bench {

// Registers "startup/FILTER" and "creation/TYPE".
void registerStartup(const DeviceChoice& device);

// In a child process. Arguments: what to measure ("start" or "create"), filter case or "-", cache directory.
int runStartupChild(const std::vector<std::string>& arguments, const DeviceChoice& device);

}  // namespace bench
