// fork, exec and files as outputs, which never fill up as pipes do.
#include "process.h"

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace tooltest {

namespace fs = std::filesystem;

namespace {

void redirect(int descriptor, const std::string& file) {
    const int opened = ::open(file.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
    if (opened < 0) ::_exit(126);
    ::dup2(opened, descriptor);
    ::close(opened);
}

[[noreturn]] void becomeProgram(const fs::path& program, const std::vector<std::string>& arguments,
                                const Setting& setting, const std::string& out, const std::string& err) {
    for (const auto& [name, value] : setting.environment) {
        if (value.empty()) {
            ::unsetenv(name.c_str());
        } else {
            ::setenv(name.c_str(), value.c_str(), 1);
        }
    }
    redirect(STDOUT_FILENO, setting.standardOutput.empty() ? out : setting.standardOutput);
    redirect(STDERR_FILENO, err);
    if (!setting.directory.empty() && ::chdir(setting.directory.c_str()) != 0) ::_exit(126);
    if (setting.prepare) setting.prepare();
    std::vector<char*> argv{const_cast<char*>(program.c_str())};
    for (const std::string& argument : arguments) argv.push_back(const_cast<char*>(argument.c_str()));
    argv.push_back(nullptr);
    ::execv(program.c_str(), argv.data());
    ::_exit(127);
}

const TemporaryDirectory& sharedCache() {
    static const TemporaryDirectory directory;
    return directory;
}

}  // namespace

Outcome runProgram(const fs::path& program, const std::vector<std::string>& arguments, const Setting& setting) {
    const TemporaryDirectory outputs;
    const std::string out = outputs / "out";
    const std::string err = outputs / "err";
    const pid_t child = ::fork();
    if (child < 0) throw std::runtime_error("fork failed");
    if (child == 0) becomeProgram(program, arguments, setting, out, err);
    int state = 0;
    ::waitpid(child, &state, 0);
    const int status = WIFEXITED(state) ? WEXITSTATUS(state) : 128 + WTERMSIG(state);
    return {status, setting.standardOutput.empty() ? readFile(out) : "", readFile(err)};
}

Outcome runTool(const std::vector<std::string>& arguments, Setting setting) {
    // Settings of the test come later and win.
    setting.environment.insert(setting.environment.begin(), {"XDG_CACHE_HOME", sharedCache().path().string()});
    return runProgram(TOV_TOOL, arguments, setting);
}

TemporaryDirectory::TemporaryDirectory() {
    std::string name = (fs::temp_directory_path() / "tov-test-XXXXXX").string();
    if (::mkdtemp(name.data()) == nullptr) throw std::runtime_error("mkdtemp failed");
    path_ = name;
}

TemporaryDirectory::~TemporaryDirectory() {
    std::error_code ignored;
    fs::remove_all(path_, ignored);
}

std::vector<std::string> TemporaryDirectory::list() const {
    std::vector<std::string> names;
    for (const auto& entry : fs::directory_iterator(path_)) names.push_back(entry.path().filename());
    std::ranges::sort(names);
    return names;
}

std::string readFile(const fs::path& path) {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

void writeFile(const fs::path& path, const std::string& bytes) {
    std::ofstream(path, std::ios::binary).write(bytes.data(), static_cast<std::streamsize>(bytes.size()));
}

}  // namespace tooltest
