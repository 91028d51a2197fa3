// Temporary names, rename, and removal from signal handlers.
#include "replacement_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>

#include "failure.h"

namespace tool {

namespace {

namespace fs = std::filesystem;

constexpr std::array kEndingSignals = {SIGHUP, SIGINT, SIGTERM};

// The one temporary file, where a signal handler can find it; an empty text when there is none.
std::array<char, 4096> pendingFile{};

extern "C" void removeAndEnd(int signal) {
    if (pendingFile[0] != '\0') ::unlink(pendingFile.data());
    std::signal(signal, SIG_DFL);
    std::raise(signal);
}

void watchSignals(const std::string& file) {
    if (file.size() >= pendingFile.size()) return;
    std::memcpy(pendingFile.data(), file.c_str(), file.size() + 1);
    for (const int signal : kEndingSignals) {
        if (std::signal(signal, removeAndEnd) == SIG_IGN) std::signal(signal, SIG_IGN);
    }
}

fs::path followLinks(const fs::path& given) {
    constexpr int kMostLinks = 40;
    fs::path path = given;
    std::error_code error;
    for (int i = 0; i < kMostLinks; ++i) {
        if (!fs::is_symlink(fs::symlink_status(path, error))) return path;
        const fs::path link = fs::read_symlink(path, error);
        if (error) throw unwritable(given, systemError(error.value()));
        path = link.is_absolute() ? link : path.parent_path() / link;
    }
    throw unwritable(given, systemError(ELOOP));
}

// The permissions of the file to be replaced, or those of any new file. Refuses what must not be replaced.
mode_t permissionsFor(const fs::path& target) {
    constexpr mode_t kNewFile = 0666;
    constexpr mode_t kAllBits = 0777;
    struct stat state {};
    if (::stat(target.c_str(), &state) != 0) {
        const mode_t mask = ::umask(0);
        ::umask(mask);
        return kNewFile & ~mask;
    }
    if (S_ISDIR(state.st_mode)) throw unwritable(target, "it is a directory");
    if (!S_ISREG(state.st_mode)) throw unwritable(target, "it is not a regular file");
    if (::access(target.c_str(), W_OK) != 0) throw unwritable(target, systemError(errno));
    return state.st_mode & kAllBits;
}

std::string makeTemporary(const fs::path& target, mode_t permissions) {
    const fs::path directory = target.has_parent_path() ? target.parent_path() : fs::path(".");
    const std::string extension = target.extension().string();
    std::string name = (directory / ".tov-XXXXXX").string() + extension;
    const int descriptor = ::mkstemps(name.data(), static_cast<int>(extension.size()));
    if (descriptor < 0) throw unwritable(target, systemError(errno));
    ::fchmod(descriptor, permissions);
    ::close(descriptor);
    return name;
}

int synchronize(const std::string& path) noexcept {
    const int descriptor = ::open(path.c_str(), O_RDONLY);  // NOLINT(cppcoreguidelines-pro-type-vararg): the system's
    if (descriptor < 0) return errno;
    const int error = ::fsync(descriptor) == 0 || errno == EINVAL ? 0 : errno;  // EINVAL: nothing to synchronise here
    ::close(descriptor);
    return error;
}

}  // namespace

ReplacementFile::ReplacementFile(const std::string& target) : target_(followLinks(target)) {
    temporary_ = makeTemporary(target_, permissionsFor(target_));
    watchSignals(temporary_);
}

ReplacementFile::~ReplacementFile() {
    if (!temporary_.empty()) ::unlink(temporary_.c_str());
    pendingFile[0] = '\0';
}

void ReplacementFile::commit() {
    if (const int error = synchronize(temporary_)) throw unwritable(target_, systemError(error));
    if (std::rename(temporary_.c_str(), target_.c_str()) != 0) throw unwritable(target_, systemError(errno));
    temporary_.clear();
}

}  // namespace tool
