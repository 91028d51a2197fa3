// Descriptors 0 to 2 and the file that holds the library's lines.
#include "streams.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>

#include "failure.h"

namespace tool {

namespace {

// Returns 0 or errno.
int writeAll(int descriptor, std::string_view text) noexcept {
    while (!text.empty()) {
        const ssize_t written = ::write(descriptor, text.data(), text.size());
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) return errno;
        text.remove_prefix(static_cast<size_t>(written));
    }
    return 0;
}

// A file opened later must never land on a standard descriptor that the caller left closed.
void fillStandardDescriptors() noexcept {
    int descriptor = 0;
    do {
        descriptor = ::open("/dev/null", O_RDWR);  // NOLINT(cppcoreguidelines-pro-type-vararg): the system's interface
    } while (descriptor >= 0 && descriptor <= STDERR_FILENO);
    if (descriptor >= 0) ::close(descriptor);
}

// A nameless file for reading and writing, or -1.
int openHoldingFile() noexcept {
    std::FILE* const file = std::tmpfile();
    if (file == nullptr) return -1;
    const int descriptor = ::dup(::fileno(file));
    std::fclose(file);
    return descriptor;
}

}  // namespace

Streams::Streams() {
    const bool open = ::fcntl(STDOUT_FILENO, F_GETFD) >= 0;  // NOLINT(cppcoreguidelines-pro-type-vararg): likewise
    fillStandardDescriptors();
    if (open) results_ = ::dup(STDOUT_FILENO);
    held_ = openHoldingFile();
    ::dup2(held_ >= 0 ? held_ : STDERR_FILENO, STDOUT_FILENO);
}

Streams::~Streams() {
    std::fflush(stdout);
    ::dup2(STDERR_FILENO, STDOUT_FILENO);  // lines printed while the library unloads
    if (held_ >= 0) ::close(held_);
    if (results_ >= 0) ::close(results_);
}

void Streams::result(std::string_view text) const {
    const int error = results_ >= 0 ? writeAll(results_, text) : EBADF;
    if (error != 0) throw Failure(ExitStatus::kUnwritable, "cannot write to standard output: " + systemError(error));
}

std::string Streams::collect() {
    std::fflush(stdout);
    std::string lines;
    std::array<char, 4096> buffer{};
    while (held_ >= 0) {
        const ssize_t count = ::pread(held_, buffer.data(), buffer.size(), taken_);
        if (count <= 0) break;
        lines.append(buffer.data(), static_cast<size_t>(count));
        taken_ += count;
    }
    pending_ += lines;
    return lines;
}

std::string Streams::takeLibraryLines() {
    std::string lines = collect();
    if (verbose_) showLibraryLines();
    return lines;
}

void Streams::showLibraryLines() {
    collect();
    writeAll(STDERR_FILENO, pending_);
    pending_.clear();
}

void Streams::forgetLibraryLines() {
    takeLibraryLines();
    pending_.clear();
}

void complain(std::string_view text) {
    writeAll(STDERR_FILENO, "tov: " + std::string(text) + "\n");
}

void note(std::string_view text) {
    writeAll(STDERR_FILENO, "note: " + std::string(text) + "\n");
}

}  // namespace tool
