#include "child.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <charconv>
#include <cstdio>
#include <filesystem>
#include <stdexcept>
#include <string_view>

namespace bench {
namespace {

constexpr std::string_view kResultMark = "\nRESULT";
// Where the drivers at hand keep compiled programs: PoCL, NVIDIA, and those that follow the desktop's rules.
constexpr std::array<std::string_view, 3> kDriverCacheVariables = {"POCL_CACHE_DIR", "CUDA_CACHE_PATH",
                                                                   "XDG_CACHE_HOME"};

bool isDriverCacheVariable(std::string_view assignment) {
    for (const std::string_view name : kDriverCacheVariables)
        if (assignment.substr(0, name.size() + 1) == std::string(name) + "=") return true;
    return false;
}

std::vector<std::string> childEnvironment(const std::string& driverCache) {
    std::vector<std::string> variables;
    for (char** entry = environ; *entry != nullptr; ++entry)
        if (!isDriverCacheVariable(*entry)) variables.emplace_back(*entry);
    for (const std::string_view name : kDriverCacheVariables)
        variables.push_back(std::string(name) + "=" + driverCache);
    return variables;
}

std::vector<char*> pointers(std::vector<std::string>& texts) {
    std::vector<char*> list;
    for (std::string& text : texts) list.push_back(text.data());
    list.push_back(nullptr);
    return list;
}

std::string readAll(int descriptor) {
    std::string text;
    std::array<char, 4096> part{};
    for (ssize_t count = 0; (count = read(descriptor, part.data(), part.size())) > 0;)
        text.append(part.data(), static_cast<size_t>(count));
    close(descriptor);
    return text;
}

// Starts the child with its standard output on the pipe's writing end.
pid_t spawn(std::vector<std::string> arguments, std::vector<std::string> environment, const std::array<int, 2>& ends) {
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, ends[1], STDOUT_FILENO);
    pid_t child = 0;
    const int error = posix_spawn(&child, "/proc/self/exe", &actions, nullptr, pointers(arguments).data(),
                                  pointers(environment).data());
    posix_spawn_file_actions_destroy(&actions);
    close(ends[1]);
    if (error != 0) throw std::runtime_error("The child process cannot be started");
    return child;
}

std::vector<double> numbersAfter(std::string_view line) {
    std::vector<double> numbers;
    while (!line.empty() && line.front() == ' ') {
        line.remove_prefix(1);
        double number = 0.0;
        const char* end = std::from_chars(line.data(), line.data() + line.size(), number).ptr;
        numbers.push_back(number);
        line.remove_prefix(static_cast<size_t>(end - line.data()));
    }
    return numbers;
}

}  // namespace

TemporaryDirectory::TemporaryDirectory() {
    path_ = (std::filesystem::temp_directory_path() / "tov-bench-XXXXXX").string();
    if (mkdtemp(path_.data()) == nullptr) throw std::runtime_error("No temporary directory can be made");
}

TemporaryDirectory::~TemporaryDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

ChildResult runChild(const std::vector<std::string>& arguments, const std::string& driverCache) {
    std::array<int, 2> ends{};
    if (pipe2(ends.data(), O_CLOEXEC) != 0) throw std::runtime_error("No pipe can be made");
    std::vector<std::string> all = {"tov_bench"};
    all.insert(all.end(), arguments.begin(), arguments.end());
    const pid_t child = spawn(std::move(all), childEnvironment(driverCache), ends);
    ChildResult result;
    result.output = readAll(ends[0]);
    int status = 0;
    waitpid(child, &status, 0);
    const size_t mark = result.output.rfind(kResultMark);
    if (status != 0 || mark == std::string::npos) throw std::runtime_error("The child process failed");
    result.values = numbersAfter(std::string_view(result.output).substr(mark + kResultMark.size()));
    return result;
}

void printChildResult(const std::vector<double>& values) {
    std::string line(kResultMark);
    for (const double value : values) {
        std::array<char, 32> text{};
        const char* end = std::to_chars(text.data(), text.data() + text.size(), value).ptr;
        line.append(" ").append(text.data(), static_cast<size_t>(end - text.data()));
    }
    std::puts(line.c_str());
    std::fflush(stdout);
}

size_t linesWith(const std::string& text, const std::string& words) {
    size_t count = 0;
    for (size_t at = text.find(words); at != std::string::npos; at = text.find(words, text.find('\n', at))) ++count;
    return count;
}

}  // namespace bench
