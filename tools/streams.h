// Standard output carries results only. The library prints its diagnostic lines to descriptor 1, so this keeps a copy
// of the real one and lets descriptor 1 lead to standard error: through a file in between, which holds the lines back
// until a failure shows that they matter (or at once, when asked for).
#ifndef TOV_TOOLS_STREAMS_H
#define TOV_TOOLS_STREAMS_H

#include <cstdint>
#include <string>
#include <string_view>

namespace tool {

class Streams {
 public:
    // Call before the first call into the library.
    Streams();
    ~Streams();
    Streams(const Streams&) = delete;
    Streams& operator=(const Streams&) = delete;

    // From now on the library's lines reach standard error as soon as they are looked at.
    void setVerbose(bool verbose) noexcept { verbose_ = verbose; }
    bool verbose() const noexcept { return verbose_; }

    // Writes all of the text to standard output; throws kUnwritable when it cannot (closed, full, a broken pipe).
    void result(std::string_view text) const;

    // What the library printed since the last call; "" where the lines go straight to standard error.
    std::string takeLibraryLines();
    // Everything held back goes to standard error.
    void showLibraryLines();
    // What was printed so far belongs to no failure: unless verbose, it is not shown any more.
    void forgetLibraryLines();

 private:
    std::string collect();

    int results_ = -1;  // the real standard output, -1 when it was closed
    int held_ = -1;     // file with the library's lines, -1 when there is none
    int64_t taken_ = 0;
    std::string pending_;
    bool verbose_ = false;
};

// "tov: <text>" and "note: <text>" on standard error.
void complain(std::string_view text);
void note(std::string_view text);

}  // namespace tool

#endif
