// $XDG_CACHE_HOME, $HOME and the account's home directory, in this order; relative ones are passed over.
#include "user_directories.h"

#include <pwd.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>

#include "failure.h"
#include "streams.h"

namespace tool {

namespace {

namespace fs = std::filesystem;

constexpr mode_t kPrivate = 0700;

std::optional<fs::path> absolutePath(const char* text) {
    if (text == nullptr || text[0] != '/') return std::nullopt;
    return fs::path(text);
}

std::optional<fs::path> userCacheDirectory() {
    if (auto cache = absolutePath(std::getenv("XDG_CACHE_HOME"))) return cache;
    if (const auto home = absolutePath(std::getenv("HOME"))) return *home / ".cache";
    const passwd* const account = ::getpwuid(::geteuid());
    if (account == nullptr) return std::nullopt;
    const auto home = absolutePath(account->pw_dir);
    if (home) return *home / ".cache";
    return std::nullopt;
}

// Makes the directory and its parents, new ones for the user alone. Returns 0 or errno.
int makeDirectories(const fs::path& path) {
    const fs::path parent = path.parent_path();
    std::error_code ignored;
    if (!parent.empty() && parent != path && !fs::exists(parent, ignored)) {
        if (const int error = makeDirectories(parent)) return error;
    }
    if (::mkdir(path.c_str(), kPrivate) == 0) return 0;
    const int error = errno;
    if (fs::is_directory(path, ignored)) return 0;
    return error == EEXIST ? ENOTDIR : error;
}

// A cache of ours that others can enter is closed to them; one of somebody else is refused.
void claim(const fs::path& path) {
    struct stat state {};
    if (::stat(path.c_str(), &state) != 0) return;
    if (state.st_uid != ::geteuid()) {
        throw Failure(ExitStatus::kFailed, "the cache directory " + path.string() +
                                               " belongs to another user, and its files are machine code; name one of "
                                               "your own with --cache");
    }
    if ((state.st_mode & 0777U) != kPrivate) ::chmod(path.c_str(), kPrivate);
}

void refuseTooLong(const std::string& path, const char* hint) {
    if (path.size() <= kMaxCachePathBytes) return;
    throw usageFailure("the cache directory " + path + " has " + std::to_string(path.size()) +
                       " bytes, more than the " + std::to_string(kMaxCachePathBytes) + " that the library takes" +
                       hint);
}

std::string givenDirectory(const std::string& path) {
    if (path.empty()) throw usageFailure("--cache: the path is empty");
    refuseTooLong(path, "");
    if (const int error = makeDirectories(path)) {
        throw Failure(ExitStatus::kFailed, "cannot make the cache directory " + path + ": " + systemError(error));
    }
    return path;
}

}  // namespace

std::string cacheDirectory(const std::optional<std::string>& given) {
    if (given) return givenDirectory(*given);
    const auto base = userCacheDirectory();
    if (!base) throw usageFailure("there is no home directory to keep compiled kernels in; name one with --cache");
    const fs::path path = *base / "tov";
    refuseTooLong(path.string(), "; name a shorter one with --cache");
    if (const int error = makeDirectories(path)) {
        note("compiled kernels are not kept: cannot make " + path.string() + ": " + systemError(error));
    } else {
        claim(path);
    }
    return path.string();
}

}  // namespace tool
