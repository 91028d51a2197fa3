// How the tool fails: one exception with a message for people and the exit status for scripts.
#ifndef TOV_TOOLS_FAILURE_H
#define TOV_TOOLS_FAILURE_H

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>

namespace tool {

// Documented by `tov --help`.
enum class ExitStatus : int {
    kDone = 0,
    kFailed = 1,      // the library or the device refused
    kUsage = 2,       // wrong arguments, names or values
    kNoDevice = 3,    // no OpenCL device
    kUnreadable = 4,  // a picture cannot be read
    kUnwritable = 5,  // a result cannot be written
};

class Failure : public std::runtime_error {
 public:
    Failure(ExitStatus status, const std::string& message) : std::runtime_error(message), status_(status) {}
    ExitStatus status() const noexcept { return status_; }

 private:
    ExitStatus status_;
};

inline Failure usageFailure(const std::string& message) {
    return {ExitStatus::kUsage, message};
}

inline Failure unwritable(const std::string& path, const std::string& why) {
    return {ExitStatus::kUnwritable, "cannot write " + path + ": " + why};
}

// "TOV_ERROR_... (-12): meaning" for a code of the library.
std::string describeCode(int32_t code);

// Throws "<doing> failed: <code, name, meaning>" unless the code is TOV_SUCCESS.
void check(int32_t code, std::string_view doing);

// errno as text, independent of the locale.
std::string systemError(int error);

}  // namespace tool

#endif
