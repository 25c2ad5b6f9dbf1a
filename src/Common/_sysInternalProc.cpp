// Small services every family shares: monotonic deadlines, the fatal stop
// and the thread's last error.

#include "kt48api/internal.h"

#include "_sysLog.h"

#include <cerrno>
#include <cstdint>
#include <cstdlib>

namespace {
const char kSourceFile[] = "Common/_sysInternalProc";
}

int AddMsecToCurrenttime(struct timespec *deadline, unsigned long milliseconds) {
    if (deadline == nullptr) return EINVAL;
    int rc = clock_gettime(CLOCK_MONOTONIC, deadline);
    if (rc != 0) {
        KT48_LOG(4, 63, "AddMsecToCurrenttime", "clock_gettime ERROR In AddMsecToCurrenttime");
        return rc;
    }
    // Millisecond counts are 32-bit: a timeout of -1 passed as a long on a
    // 64-bit host is INFINITE's 0xFFFFFFFF, not 2^64 - 1.
    const uint32_t ms = static_cast<uint32_t>(milliseconds);
    deadline->tv_sec += static_cast<time_t>(ms / 1000u);
    deadline->tv_nsec += static_cast<long>(ms % 1000u) * 1000000L;
    if (deadline->tv_nsec > 999999999L) {
        deadline->tv_sec += deadline->tv_nsec / 1000000000L;
        deadline->tv_nsec %= 1000000000L;
    }
    return 0;
}

extern "C" void _sys_Exit(void) { std::abort(); }

extern "C" DWORD _sys_GetLastError(void) { return static_cast<DWORD>(errno); }

extern "C" void _sys_SetLastError(DWORD code) { errno = static_cast<int>(code); }
