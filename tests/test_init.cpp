// Process initialisation, first-in-system election and start-up clean-up.

#include "harness.h"

#include "kt48api.h"

#include <signal.h>
#include <sys/mman.h>
#include <sys/stat.h>

#include <atomic>
#include <cstdint>
#include <memory>
#include <string>
#include <thread>

namespace {

using kt48test::Channel;
using kt48test::Child;
using kt48test::Find;

const char kSuccessText[] = "kt48api.dll:KT48Setup/_sysCommon:LINE 374\r\n SUCCESS In Exclude_Init\r\n";
const char kErrorText[] = "kt48api.dll:KT48Setup/_sysCommon:LINE 380\r\n ERROR In Exclude_Init\r\n";

class Init : public kt48test::SessionTest {
protected:
    std::string KInit(const char *word, std::vector<kt48test::LogRecord> *log) {
        Child probe(std::vector<std::string>{kt48test::ProbePath(), "kinit", word});
        std::string answer = probe.Receive();
        EXPECT_EQ(0, probe.Wait());
        *log = probe.Log();
        return answer;
    }
    // Stands in for a process of another build: records a different
    // layout signature for the session.
    void RecordForeignLayout() {
        HSHAREDMEMORY h = CreateSharedMemory("KT48_LAYOUT", 8);
        ASSERT_NE(nullptr, h);
        *static_cast<uint64_t *>(GetSharedMemoryPtr(h)) = 0x1234;
        CloseSharedMemory(h);
    }
};

TEST_F(Init, FirstInitOfTheSystemRunsTheSystemPartOnceAndLogsItsSuccess) {
    std::vector<kt48test::LogRecord> first, second;
    EXPECT_EQ("result=0", KInit("0", &first));
    auto ok = Find(first, "SUCCESS In Exclude_Init");
    ASSERT_EQ(1u, ok.size());
    EXPECT_EQ(1, ok[0].level);
    EXPECT_EQ("KT48API_Init", ok[0].function);
    EXPECT_EQ(374, ok[0].line);
    EXPECT_EQ(kSuccessText, ok[0].text);

    EXPECT_EQ("result=0", KInit("0", &second));
    EXPECT_TRUE(Find(second, "Exclude_Init").empty()) << "a second process only initialises itself";
}

TEST_F(Init, NonZeroWordFirstFailsTheSystemPartForGood) {
    std::vector<kt48test::LogRecord> log;
    EXPECT_EQ("result=-1", KInit("1", &log));
    auto err = Find(log, "ERROR In Exclude_Init");
    ASSERT_EQ(1u, err.size());
    EXPECT_EQ(4, err[0].level);
    EXPECT_EQ(380, err[0].line);
    EXPECT_EQ(kErrorText, err[0].text);
    // The system part counts as done: later calls only initialise their process.
    EXPECT_EQ("result=0", KInit("0", &log));
    EXPECT_TRUE(Find(log, "Exclude_Init").empty());
    EXPECT_EQ("result=0", KInit("1", &log));
}

TEST_F(Init, ConcurrentFirstInitsElectExactlyOneProcess) {
    constexpr int kProcs = 4;
    std::vector<std::unique_ptr<Child>> procs;
    for (int i = 0; i < kProcs; ++i) {
        procs.push_back(std::make_unique<Child>([](Channel &ch) {
            ch.Receive();
            return KT48API_Init(0) == 0 ? 0 : 1;
        }));
    }
    for (auto &p : procs) p->Send("go");
    size_t successes = 0;
    for (auto &p : procs) {
        EXPECT_EQ(0, p->Wait());
        successes += Find(p->Log(), "SUCCESS In Exclude_Init").size();
    }
    EXPECT_EQ(1u, successes);
}

TEST_F(Init, ElectionSurvivesAProcessKilledWhileHoldingIt) {
    Child holder([](Channel &ch) {
        orva::SharedMemory<unsigned int> init("KT48API_INIT");
        if (!init.mapped || pthread_mutex_lock(*init.mutex) != 0) return 1;
        ch.Send("holding");
        ch.Receive();
        return 0;
    });
    ASSERT_EQ("holding", holder.Receive());
    holder.Kill(SIGKILL);
    EXPECT_EQ(128 + SIGKILL, holder.Wait());

    std::vector<kt48test::LogRecord> log;
    EXPECT_EQ("result=0", KInit("0", &log));
    EXPECT_EQ(1u, Find(log, "KT48API_INIT holder died").size());
    EXPECT_EQ(1u, Find(log, "SUCCESS In Exclude_Init").size()) << "the dead process had not finished it";
}

TEST_F(Init, UnreachableElectionObjectFailsWithoutInitialising) {
    setenv("KT48_SESSION", "not/a/word", 1);  // every system name is refused
    Child child([](Channel &) { return -KT48API_Init(0); });
    EXPECT_EQ(2, child.Wait());
    EXPECT_EQ(1u, Find(child.Log(), "KT48API_INIT cannot be mapped").size());
    setenv("KT48_SESSION", session().c_str(), 1);
}

TEST_F(Init, ProcessInitRunsOnceEvenWhenItFailed) {
    RecordForeignLayout();
    Child child([](Channel &ch) {
        int first = KT48API_ProcessInit(nullptr);
        int second = KT48API_ProcessInit(nullptr);
        int viaSetup = KT48API_SystemInit();
        ch.Send(std::to_string(first) + " " + std::to_string(second) + " " + std::to_string(viaSetup));
        return 0;
    });
    EXPECT_EQ("-1 0 0", child.Receive());
    EXPECT_EQ(0, child.Wait());
    auto refused = Find(child.Log(), "differs");
    ASSERT_EQ(1u, refused.size()) << "only the first call does the work";
    EXPECT_EQ(4, refused[0].level);
    EXPECT_EQ("KT48API_ProcessInit", refused[0].function);
    EXPECT_EQ(0u, refused[0].text.find("kt48api.dll:Common/_sysLayout:LINE "));
}

TEST_F(Init, ThreadsInitialisingTogetherRunTheHooksOnce) {
    RecordForeignLayout();  // makes the hooks' one run visible as one record
    Child child([](Channel &ch) {
        std::atomic<int> failures{0};
        std::vector<std::thread> threads;
        for (int i = 0; i < 8; ++i)
            threads.emplace_back([&] { failures += KT48API_ProcessInit(nullptr) != 0; });
        for (auto &t : threads) t.join();
        ch.Send(std::to_string(failures.load()));
        return 0;
    });
    EXPECT_EQ("1", child.Receive());
    EXPECT_EQ(0, child.Wait());
    EXPECT_EQ(1u, Find(child.Log(), "differs").size());
}

TEST_F(Init, StartupCleanUpRemovesLeftRegionsAndLogsItsSuccess) {
    for (const char *n : {"Old1", "Old2"}) {
        HSHAREDMEMORY h = CreateSharedMemory(n, 32);
        ASSERT_NE(nullptr, h);
        CloseSharedMemory(h);
    }
    RecordForeignLayout();  // left by a build of before: the clean-up forgets it too
    Child child([](Channel &) { return Exclude_SystemInit() == 0 && KT48API_ProcessInit(nullptr) == 0 ? 0 : 1; });
    EXPECT_EQ(0, child.Wait());
    EXPECT_EQ(nullptr, OpenSharedMemory("Old1", 0));
    EXPECT_EQ(nullptr, OpenSharedMemory("Old2", 0));
    auto ok = Find(child.Log(), "SUCCESS In Exclude_SystemInit");
    ASSERT_EQ(1u, ok.size());
    EXPECT_EQ(1, ok[0].level);
    EXPECT_EQ(52, ok[0].line);
    EXPECT_EQ("Exclude_SystemInit", ok[0].function);
    EXPECT_EQ("kt48api.dll:KT48Exclude/_sysExcludeInit:LINE 52\r\n SUCCESS In Exclude_SystemInit\r\n", ok[0].text);
    EXPECT_TRUE(Find(child.Log(), "differs").empty());
}

TEST_F(Init, PerformanceLogSwitchOnTheCommandLineReachesAChildsInitialisation) {
    Child parent([](Channel &ch) {
        char a0[] = "app", a1[] = "-r";
        char *argv[] = {a0, a1, nullptr};
        _sys_ProcessArguments(2, argv);
        Child probe(std::vector<std::string>{kt48test::ProbePath(), "init"});
        ch.Send(probe.Receive());
        return probe.Wait();
    });
    EXPECT_EQ("result=0 plog=1 control=00000000", parent.Receive());
    EXPECT_EQ(0, parent.Wait());
}

}  // namespace
