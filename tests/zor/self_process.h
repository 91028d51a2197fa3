// Runs tests of this very program in a process of its own.
#pragma once

#include <cstdio>
#include <filesystem>
#include <memory>
#include <string>

// Standard output of the program (or a copy of it) running the tests of the filter, disabled ones included; environment
// is a list like "A=1 B=2".
inline std::string runTests(const std::string& filter, const std::string& environment,
                            const std::filesystem::path& program = std::filesystem::read_symlink("/proc/self/exe")) {
    const std::string command = environment + " '" + program.string() +
                                "' --gtest_also_run_disabled_tests --gtest_filter='" + filter + "' 2>&1";
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> pipe(popen(command.c_str(), "r"), pclose);
    std::string output;
    char part[4096];
    while (pipe != nullptr && std::fgets(part, sizeof part, pipe.get()) != nullptr) output += part;
    return output;
}
