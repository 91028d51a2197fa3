// Runs the tool as a user would: a process with arguments, an environment and captured outputs.
#ifndef TOV_TESTS_TOOL_PROCESS_H
#define TOV_TESTS_TOOL_PROCESS_H

#include <filesystem>
#include <functional>
#include <string>
#include <utility>
#include <vector>

namespace tooltest {

struct Outcome {
    int status;  // exit status, or 128 + the signal that ended the process
    std::string out;
    std::string err;
};

struct Setting {
    std::vector<std::pair<std::string, std::string>> environment = {};  // set in the process; an empty value unsets
    std::string standardOutput = {};                                    // a file in place of the captured output
    std::function<void()> prepare = {};                                 // runs in the new process before the program
    std::filesystem::path directory = {};                               // working directory, if any
};

Outcome runProgram(const std::filesystem::path& program, const std::vector<std::string>& arguments,
                   const Setting& setting = {});

// The tool, with a cache directory that all tests of this run share, so that kernels are compiled once.
Outcome runTool(const std::vector<std::string>& arguments, Setting setting = {});

// A directory of the test's own, removed with it.
class TemporaryDirectory {
 public:
    TemporaryDirectory();
    ~TemporaryDirectory();
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

    std::string operator/(const std::string& name) const { return (path_ / name).string(); }
    const std::filesystem::path& path() const noexcept { return path_; }
    // Names of everything in it, hidden files included, sorted.
    std::vector<std::string> list() const;

 private:
    std::filesystem::path path_;
};

std::string readFile(const std::filesystem::path& path);
void writeFile(const std::filesystem::path& path, const std::string& bytes);

}  // namespace tooltest

#endif
