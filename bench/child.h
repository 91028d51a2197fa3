// Runs this program again as a child process, so that nothing but files is left of an earlier run.
#pragma once

#include <string>
#include <vector>

namespace bench {

struct ChildResult {
    std::string output;          // standard output
    std::vector<double> values;  // the numbers of its result line
};

// A directory below the system's temporary directory that is removed with its scope.
class TemporaryDirectory {
 public:
    TemporaryDirectory();
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;
    ~TemporaryDirectory();
    const std::string& path() const noexcept { return path_; }

 private:
    std::string path_;
};

// The driver of the child keeps its own cache of compiled programs in `driverCache`. Throws when the child fails.
ChildResult runChild(const std::vector<std::string>& arguments, const std::string& driverCache);

// In the child: the line that carries its numbers.
void printChildResult(const std::vector<double>& values);

// How many lines of the text contain `words`.
size_t linesWith(const std::string& text, const std::string& words);

}  // namespace bench
