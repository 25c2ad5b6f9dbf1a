// The per-process registry of waitable handles.

#include "kt48api.h"

#include <gtest/gtest.h>

#include <thread>
#include <vector>

namespace {

void *H(uintptr_t v) { return reinterpret_cast<void *>(v); }

class WaitObject : public ::testing::Test {
protected:
    void SetUp() override { _sys_WaitObjectInit(); }
    void TearDown() override { _sys_WaitObjectInit(); }
};

TEST_F(WaitObject, RefusesNullHandleAndKindsOutsideOneToFive) {
    EXPECT_EQ(0, _sys_WaitObjectAdd(H(0x10), static_cast<HANDLE_KIND>(0)));
    EXPECT_EQ(0, _sys_WaitObjectAdd(H(0x10), static_cast<HANDLE_KIND>(6)));
    EXPECT_EQ(0, _sys_WaitObjectAdd(H(0x10), static_cast<HANDLE_KIND>(-1)));
    EXPECT_EQ(0, _sys_WaitObjectAdd(nullptr, HANDLE_KIND_MUTEX));
    EXPECT_EQ(0, _sys_WaitObjectDel(H(0x10)));  // nothing was registered
    EXPECT_EQ(1, _sys_WaitObjectAdd(H(0x10), static_cast<HANDLE_KIND>(5)));  // no registrant, still a kind
}

TEST_F(WaitObject, OneRecordPerHandleAndTheFirstKindWins) {
    EXPECT_EQ(1, _sys_WaitObjectAdd(H(0x20), HANDLE_KIND_MUTEX));
    EXPECT_EQ(1, _sys_WaitObjectAdd(H(0x20), HANDLE_KIND_MUTEX));
    EXPECT_EQ(0, _sys_WaitObjectAdd(H(0x20), HANDLE_KIND_THREAD));
    EXPECT_EQ(1, _sys_WaitObjectAdd(H(0x20), HANDLE_KIND_MUTEX));  // still registered as a mutex
    EXPECT_EQ(1, _sys_WaitObjectDel(H(0x20)));
    EXPECT_EQ(0, _sys_WaitObjectDel(H(0x20)));  // one record, gone with one delete
}

TEST_F(WaitObject, DeleteKeepsTheRestOfTheListWhereverTheRecordStands) {
    for (uintptr_t h = 1; h <= 5; ++h) ASSERT_EQ(1, _sys_WaitObjectAdd(H(h), HANDLE_KIND_THREAD));
    EXPECT_EQ(0, _sys_WaitObjectDel(H(9)));
    EXPECT_EQ(0, _sys_WaitObjectDel(nullptr));
    EXPECT_EQ(1, _sys_WaitObjectDel(H(3)));  // middle
    EXPECT_EQ(1, _sys_WaitObjectDel(H(1)));  // head
    EXPECT_EQ(1, _sys_WaitObjectDel(H(5)));  // tail
    EXPECT_EQ(0, _sys_WaitObjectAdd(H(2), HANDLE_KIND_MUTEX));  // 2 and 4 stay, as threads
    EXPECT_EQ(0, _sys_WaitObjectAdd(H(4), HANDLE_KIND_MUTEX));
    EXPECT_EQ(1, _sys_WaitObjectAdd(H(6), HANDLE_KIND_MUTEX));  // appended after deletes at the tail
    EXPECT_EQ(1, _sys_WaitObjectDel(H(6)));
    EXPECT_EQ(1, _sys_WaitObjectDel(H(2)));
    EXPECT_EQ(1, _sys_WaitObjectDel(H(4)));
    EXPECT_EQ(0, _sys_WaitObjectDel(H(5)));
}

TEST_F(WaitObject, InitEmptiesTheRegistryAndTermChangesNothing) {
    ASSERT_EQ(1, _sys_WaitObjectAdd(H(0x30), HANDLE_KIND_MUTEX));
    EXPECT_EQ(1, _sys_WaitObjectTerm());
    EXPECT_EQ(0, _sys_WaitObjectAdd(H(0x30), HANDLE_KIND_THREAD));  // still there, as a mutex
    EXPECT_EQ(1, _sys_WaitObjectInit());
    EXPECT_EQ(0, _sys_WaitObjectDel(H(0x30)));
}

TEST_F(WaitObject, ConcurrentAddsAndDeletesKeepEveryHandleOnce) {
    constexpr int kThreads = 4, kPerThread = 2000;
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([t] {
            for (int i = 0; i < kPerThread; ++i) {
                void *h = H(static_cast<uintptr_t>(1 + t * kPerThread + i));
                _sys_WaitObjectAdd(h, HANDLE_KIND_THREAD);
                if (i % 2) _sys_WaitObjectDel(h);
            }
        });
    }
    for (auto &th : threads) th.join();
    int present = 0;
    for (uintptr_t h = 1; h <= kThreads * kPerThread; ++h) present += _sys_WaitObjectDel(H(h));
    EXPECT_EQ(kThreads * kPerThread / 2, present);
}

}  // namespace
