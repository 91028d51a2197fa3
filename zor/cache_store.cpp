#include "zor/cache_store.h"

#include <chrono>
#include <cstdio>
#include <filesystem>
#include <memory>

#ifdef _WIN32
#include <process.h>
#else
#include <unistd.h>
#endif

#include "zor/number_text.h"

namespace zor {
namespace {

namespace fs = std::filesystem;

constexpr uint64_t kMaxFileBytes = uint64_t{1} << 30;  // no program is as long; a file that is was never ours

using File = std::unique_ptr<std::FILE, int (*)(std::FILE*)>;

std::string sidePath(const CacheEntry& entry) {
    return entry.path + ".options";
}

std::string sideText(const CacheEntry& entry, const std::string& binary) {
    return entry.options + "\n" + hexadecimal(fnv1a(binary), 16) + " " + std::to_string(binary.size()) + " " +
           hexadecimal(entry.identity, 16) + "\n";
}

uint64_t processNumber() noexcept {
#ifdef _WIN32
    return static_cast<uint64_t>(_getpid());
#else
    return static_cast<uint64_t>(getpid());
#endif
}

std::string programBinary(cl_program program) {
    size_t size = 0;
    check(cl().clGetProgramInfo(program, cl_program_info{CL_PROGRAM_BINARY_SIZES}, sizeof size, &size, nullptr),
          "clGetProgramInfo");
    std::string binary(size, '\0');
    char* bytes = binary.data();
    if (size > 0) {
        check(cl().clGetProgramInfo(program, cl_program_info{CL_PROGRAM_BINARIES}, sizeof bytes, &bytes, nullptr),
              "clGetProgramInfo");
    }
    return binary;
}

// Paths, not texts: nothing is allocated where nothing may be thrown.
void removeFile(const fs::path& path) noexcept {
    std::error_code ignored;
    fs::remove(path, ignored);
}

bool renameFile(const fs::path& from, const fs::path& to) noexcept {
    std::error_code error;
    fs::rename(from, to, error);
    return !error;
}

// A file of its own name in the directory of another, gone again unless it has been renamed. The clock keeps processes
// apart that share a directory but not their process numbers.
class TemporaryFile {
 public:
    TemporaryFile(const std::string& neighbour, const std::string& content) {
        static uint64_t calls = 0;
        const auto now = static_cast<uint64_t>(std::chrono::steady_clock::now().time_since_epoch().count());
        const std::string name =
            ".tmp-" + std::to_string(processNumber()) + "-" + std::to_string(calls++) + "-" + hexadecimal(now, 16);
        path_ = fs::path(neighbour).parent_path() / name;
        File file(std::fopen(path_.string().c_str(), "wbx"), std::fclose);
        if (file == nullptr) return;
        exists_ = true;
        const bool whole = std::fwrite(content.data(), 1, content.size(), file.get()) == content.size();
        written_ = std::fclose(file.release()) == 0 && whole;
    }
    TemporaryFile(const TemporaryFile&) = delete;
    TemporaryFile& operator=(const TemporaryFile&) = delete;
    ~TemporaryFile() {
        if (exists_) removeFile(path_);
    }

    bool written() const noexcept { return written_; }
    bool renameTo(const fs::path& path) noexcept {
        if (!renameFile(path_, path)) return false;
        exists_ = false;
        return true;
    }

 private:
    fs::path path_;
    bool exists_ = false;
    bool written_ = false;
};

}  // namespace

std::optional<std::string> readFile(const std::string& path) {
    std::error_code error;
    if (!fs::is_regular_file(path, error)) return std::nullopt;
    const uint64_t size = fs::file_size(path, error);
    if (error || size > kMaxFileBytes) return std::nullopt;
    const File file(std::fopen(path.c_str(), "rb"), std::fclose);
    if (file == nullptr) return std::nullopt;
    std::string content(size_t{size}, '\0');
    if (std::fread(content.data(), 1, content.size(), file.get()) != content.size()) return std::nullopt;
    return content;
}

std::optional<std::string> loadBinary(const CacheEntry& entry) {
    std::optional<std::string> binary = readFile(entry.path);
    if (!binary) return std::nullopt;
    const std::optional<std::string> side = readFile(sidePath(entry));
    if (!side || *side != sideText(entry, *binary)) return std::nullopt;
    return binary;
}

bool storeBinary(const CacheEntry& entry, const std::string& binary) {
    const fs::path binaryFile(entry.path);
    const fs::path sideFile(sidePath(entry));
    TemporaryFile side(entry.path, sideText(entry, binary));
    TemporaryFile program(entry.path, binary);
    if (!side.written() || !program.written() || !side.renameTo(sideFile)) return false;
    if (program.renameTo(binaryFile)) return true;
    removeFile(sideFile);
    return false;
}

void writeProgram(cl_program program, const CacheEntry& entry) {
    const std::string binary = programBinary(program);
    if (!binary.empty() && storeBinary(entry, binary)) std::printf("Cached file created %s\n", entry.path.c_str());
}

void removeBinary(const CacheEntry& entry) {
    removeFile(entry.path);
    removeFile(sidePath(entry));
}

}  // namespace zor
