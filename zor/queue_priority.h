// Priority and processor of the driver's thread that serves a command queue.
#pragma once

#include <cstdint>

namespace zor {

// The thread is an operating-system handle as the driver reports it: a thread id of this process on Linux, a thread
// handle on Windows. Both calls return false where the system refuses.
bool setThreadPriority(uint64_t thread, bool high);
bool bindThreadToFirstProcessor(uint64_t thread);

}  // namespace zor
