#include "zor/queue_priority.h"

#if defined(_WIN32)
#include <windows.h>
#elif defined(__linux__)
#include <sched.h>
#include <sys/resource.h>
#include <unistd.h>

#include <limits>
#include <string>
#endif

namespace zor {

#if defined(_WIN32)

bool setThreadPriority(uint64_t thread, bool high) {
    const HANDLE handle = reinterpret_cast<HANDLE>(static_cast<uintptr_t>(thread));
    return SetThreadPriority(handle, high ? THREAD_PRIORITY_HIGHEST : THREAD_PRIORITY_NORMAL) != 0;
}

bool bindThreadToFirstProcessor(uint64_t thread) {
    return SetThreadAffinityMask(reinterpret_cast<HANDLE>(static_cast<uintptr_t>(thread)), 1) != 0;
}

#elif defined(__linux__)

namespace {

constexpr int kHighestNice = -20;
constexpr int kNormalNice = 0;

// Zero would mean the caller, and a number that is no thread of ours someone else's process.
bool isOwnThread(uint64_t thread) {
    if (thread == 0 || thread > static_cast<uint64_t>(std::numeric_limits<pid_t>::max())) return false;
    const std::string path = "/proc/self/task/" + std::to_string(thread);
    return access(path.c_str(), F_OK) == 0;
}

}  // namespace

bool setThreadPriority(uint64_t thread, bool high) {
    if (!isOwnThread(thread)) return false;
    return setpriority(PRIO_PROCESS, static_cast<id_t>(thread), high ? kHighestNice : kNormalNice) == 0;
}

bool bindThreadToFirstProcessor(uint64_t thread) {
    if (!isOwnThread(thread)) return false;
    cpu_set_t processors;
    CPU_ZERO(&processors);
    CPU_SET(0, &processors);
    return sched_setaffinity(static_cast<pid_t>(thread), sizeof processors, &processors) == 0;
}

#else

bool setThreadPriority(uint64_t /*thread*/, bool /*high*/) {
    return false;
}

bool bindThreadToFirstProcessor(uint64_t /*thread*/) {
    return false;
}

#endif

}  // namespace zor
