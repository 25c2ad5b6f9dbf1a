// Deadlines, the fatal stop, the last error, and the interface from C.

#include "harness.h"

#include "kt48api.h"

#include <signal.h>

#include <cerrno>
#include <cstdint>
#include <thread>

extern "C" int kt48_c_api_smoke(void);

namespace {

int64_t Ns(const timespec &t) { return static_cast<int64_t>(t.tv_sec) * 1000000000LL + t.tv_nsec; }

// deadline - (clock read before the call) lies within [want, want + elapsed].
void ExpectOffset(unsigned long ms, int64_t wantNs) {
    timespec before, deadline, after;
    clock_gettime(CLOCK_MONOTONIC, &before);
    ASSERT_EQ(0, AddMsecToCurrenttime(&deadline, ms));
    clock_gettime(CLOCK_MONOTONIC, &after);
    EXPECT_GE(deadline.tv_nsec, 0);
    EXPECT_LE(deadline.tv_nsec, 999999999L);
    EXPECT_GE(Ns(deadline) - Ns(before), wantNs);
    EXPECT_LE(Ns(deadline) - Ns(after), wantNs);
}

TEST(Deadline, AddsMillisecondsOnTheMonotonicClockKeepingNanosecondsNormalised) {
    ExpectOffset(0, 0);
    ExpectOffset(1500, 1500LL * 1000000LL);
    ExpectOffset(999, 999LL * 1000000LL);
    ExpectOffset(0xFFFFFFFFul, 4294967LL * 1000000000LL + 295LL * 1000000LL);
}

TEST(Deadline, MillisecondsAreThirtyTwoBitsSoMinusOneIsInfinite) {
    // -1 passed as a long reaches a 64-bit host as 2^64 - 1; the library
    // counts 32-bit milliseconds, so it must mean 0xFFFFFFFF.
    ExpectOffset(static_cast<unsigned long>(-1L), 4294967LL * 1000000000LL + 295LL * 1000000LL);
    ExpectOffset(0x100000000ul + 7, 7LL * 1000000LL);
}

TEST(Deadline, NullDeadlineGivesEinvalWithoutALogRecord) {
    kt48test::Child child([](kt48test::Channel &) { return AddMsecToCurrenttime(nullptr, 10); });
    EXPECT_EQ(EINVAL, child.Wait());
    EXPECT_TRUE(child.Log().empty());
}

TEST(FatalStop, ExitAbortsTheProcess) {
    kt48test::Child child([](kt48test::Channel &) {
        _sys_Exit();
        return 0;  // not reached
    });
    EXPECT_EQ(128 + SIGABRT, child.Wait());
}

TEST(LastError, IsTheThreadsErrnoAndEveryThreadHasItsOwn) {
    _sys_SetLastError(5);
    EXPECT_EQ(5u, _sys_GetLastError());
    EXPECT_EQ(5, errno);
    DWORD other = 0;
    std::thread t([&] {
        _sys_SetLastError(77);
        other = _sys_GetLastError();
    });
    t.join();
    EXPECT_EQ(77u, other);
    EXPECT_EQ(5u, _sys_GetLastError());
    errno = 0;
}

TEST(CInterface, HeaderCompilesAsCAndItsFunctionsLink) { EXPECT_EQ(0, kt48_c_api_smoke()); }

}  // namespace
