// A file that appears whole or not at all.
#ifndef TOV_TOOLS_REPLACEMENT_FILE_H
#define TOV_TOOLS_REPLACEMENT_FILE_H

#include <filesystem>
#include <string>

namespace tool {

// Makes an empty file beside the target, with a temporary name of the same extension; `commit` gives it the target's
// name. Without a commit, also when a signal ends the program, it is removed and the target stays as it was. A
// symbolic link is followed: what it leads to is replaced. One at a time.
class ReplacementFile {
 public:
    // Throws kUnwritable when the target can never be written.
    explicit ReplacementFile(const std::string& target);
    ~ReplacementFile();
    ReplacementFile(const ReplacementFile&) = delete;
    ReplacementFile& operator=(const ReplacementFile&) = delete;

    // The temporary name, to be written to.
    const std::string& path() const noexcept { return temporary_; }
    void commit();

 private:
    std::filesystem::path target_;
    std::string temporary_;
};

}  // namespace tool

#endif
