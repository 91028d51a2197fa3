#include "zor/file_time.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <memory>

#ifdef _WIN32
#include <windows.h>
#else
#include <dlfcn.h>
#include <sys/stat.h>
#endif

#include "zor/freed_at_unload.h"

namespace zor {
namespace {

struct FileTimes {
    FileTime modified = 0;
    FileTime changed = 0;  // its status: name, owner, rights; the same as modified where the system keeps none
};

#ifdef _WIN32
FileTimes timesOf(const std::string& path) {
    std::error_code error;
    const auto time = std::filesystem::last_write_time(path, error);
    if (error) return {};
    const FileTime ticks = std::chrono::duration_cast<std::chrono::nanoseconds>(time.time_since_epoch()).count();
    return {ticks, ticks};
}

std::string carrierPath() {
    HMODULE module = nullptr;
    const auto flags = GET_MODULE_HANDLE_EX_FLAG_FROM_ADDRESS | GET_MODULE_HANDLE_EX_FLAG_UNCHANGED_REFCOUNT;
    if (!GetModuleHandleExA(flags, reinterpret_cast<const char*>(&libraryTime), &module)) return {};
    char path[MAX_PATH];
    const DWORD length = GetModuleFileNameA(module, path, MAX_PATH);
    return length < MAX_PATH ? std::string(path, length) : std::string();
}
#else
#ifdef __APPLE__
const timespec& modificationTime(const struct stat& info) noexcept {
    return info.st_mtimespec;
}
const timespec& changeTime(const struct stat& info) noexcept {
    return info.st_ctimespec;
}
#else
const timespec& modificationTime(const struct stat& info) noexcept {
    return info.st_mtim;
}
const timespec& changeTime(const struct stat& info) noexcept {
    return info.st_ctim;
}
#endif

FileTime nanoseconds(const timespec& time) noexcept {
    return FileTime{time.tv_sec} * 1'000'000'000 + FileTime{time.tv_nsec};
}

FileTimes timesOf(const std::string& path) {
    struct stat info = {};
    if (stat(path.c_str(), &info) != 0) return {};
    return {nanoseconds(modificationTime(info)), nanoseconds(changeTime(info))};
}

std::string carrierPath() {
    Dl_info info = {};
    if (dladdr(reinterpret_cast<const void*>(&libraryTime), &info) == 0 || info.dli_fname == nullptr) return {};
    return info.dli_fname;
}
#endif

std::string* resolvedCarrier() {
    std::error_code error;
    return new std::string(std::filesystem::absolute(carrierPath(), error).string());
}

// Its name may be relative to the directory that the host was in when it loaded us, so it is resolved then.
std::string* carrier = resolvedCarrier();
const FreedAtUnload<std::string> carrierOwner{carrier};

// The library file that carries this code.
const std::string& libraryFile() {
    if (carrier == nullptr) carrier = resolvedCarrier();
    return *carrier;
}

// 0 when the path is a file that can be read, otherwise the system's error. Pipes and devices, which could block, are
// never opened.
int openError(const std::string& path) {
    std::error_code error;
    const auto status = std::filesystem::status(path, error);
    if (std::filesystem::exists(status) && !std::filesystem::is_regular_file(status)) return EINVAL;
    errno = 0;
    const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::fopen(path.c_str(), "rb"), std::fclose);
    return file != nullptr ? 0 : errno;
}

bool canOpen(const std::string& path) {
    const int error = openError(path);
    if (error == 0) return true;
    if (error == ENOENT) {
        std::printf("File not found %s\n", path.c_str());
    } else if (error == ENOTDIR) {
        std::printf("File path not found %s\n", path.c_str());
    } else {
        std::printf("Failed reading file with errorCode = %d\n%s\n", error, path.c_str());
    }
    return false;
}

}  // namespace

bool fileExists(const std::string& path) {
    std::error_code error;
    return std::filesystem::exists(path, error);
}

FileTime libraryTime() {
    const FileTimes times = timesOf(libraryFile());
    return std::max(times.modified, times.changed);
}

bool isNewerThanLibrary(const std::string& binary) {
    return timesOf(binary).modified > libraryTime();
}

bool isFileUpToDate(const std::string& binary, const std::string& source) {
    if (!canOpen(binary)) return false;
    if (!canOpen(source)) return true;
    return timesOf(source).modified < timesOf(binary).modified;
}

}  // namespace zor
