// Stands between the device layer and the system's dlopen and atexit, which this program replaces for itself.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace hooks {

struct State {
    std::vector<std::string> opened;           // names that dlopen was asked for
    std::vector<int> flags;                    // and how
    std::map<std::string, std::string> paths;  // what to open instead; an empty path fails
    bool refuseAtexit = false;
    int atexitCalls = 0;
    int closed = 0;  // dlclose calls
};
State& state();

}  // namespace hooks
