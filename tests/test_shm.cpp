// Named shared memory: regions by handle, and orva::SharedMemory.

#include "harness.h"

#include "kt48api.h"
#include "../src/Common/_sysSharedMemory.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>

namespace {

using kt48test::Channel;
using kt48test::Child;

class SharedMemory : public kt48test::SessionTest {
protected:
    bool Listed(const std::string &region) {
        struct stat st;
        return stat((SystemName("/tmp/SHM/") + region).c_str(), &st) == 0;
    }
    bool ObjectExists(const std::string &region) {
        struct stat st;
        return stat(("/dev/shm" + SystemName("/" + region)).c_str(), &st) == 0;
    }
};

TEST_F(SharedMemory, BadArgumentsAndNullHandles) {
    EXPECT_EQ(nullptr, CreateSharedMemory("R", 0));
    EXPECT_EQ(nullptr, CreateSharedMemory(nullptr, 8));
    EXPECT_EQ(nullptr, OpenSharedMemory(nullptr, 8));
    EXPECT_EQ(nullptr, OpenSharedMemory("NeverMade", 8));
    EXPECT_EQ(nullptr, GetSharedMemoryPtr(nullptr));
    EXPECT_EQ(0u, GetSharedMemorySize(nullptr));
    CloseSharedMemory(nullptr);
    DeleteSharedMemory(nullptr);
    EXPECT_EQ(nullptr, OpenSharedMemoryAtPhysical("R", 8, 0x1000));
    EXPECT_FALSE(ObjectExists("R"));
    // Names the host cannot hold as one object are refused, not mangled.
    EXPECT_EQ(nullptr, CreateSharedMemory("a/b", 8));
    EXPECT_EQ(nullptr, CreateSharedMemory("", 8));
    EXPECT_EQ(nullptr, CreateSharedMemory(std::string(300, 'n').c_str(), 8));
}

TEST_F(SharedMemory, ARegionCreatedInOneProcessIsReadAndWrittenInAnother) {
    HSHAREDMEMORY mine = CreateSharedMemory("Shared8", 8);
    ASSERT_NE(nullptr, mine);
    EXPECT_EQ(8u, GetSharedMemorySize(mine));
    EXPECT_EQ(1u, mine->created);
    EXPECT_EQ(0u, mine->physical);
    auto *bytes = static_cast<unsigned char *>(GetSharedMemoryPtr(mine));
    for (int i = 0; i < 8; ++i) EXPECT_EQ(0, bytes[i]) << "a new region reads zeros";
    std::memcpy(bytes, "ABCDEFG", 8);
    EXPECT_TRUE(Listed("Shared8"));

    Child other([](Channel &ch) {
        HSHAREDMEMORY h = OpenSharedMemory("Shared8", 0);  // the size never matters
        if (h == nullptr) return 1;
        auto *p = static_cast<char *>(GetSharedMemoryPtr(h));
        ch.Send(std::string(p) + " " + std::to_string(GetSharedMemorySize(h)) + " " +
                std::to_string(h->created));
        p[0] = 'Z';
        CloseSharedMemory(h);
        return 0;
    });
    EXPECT_EQ("ABCDEFG 8 0", other.Receive());
    EXPECT_EQ(0, other.Wait());
    EXPECT_EQ('Z', bytes[0]);
    CloseSharedMemory(mine);
    EXPECT_TRUE(ObjectExists("Shared8")) << "closing never removes the region";
    DeleteSharedMemory("Shared8");
    EXPECT_FALSE(ObjectExists("Shared8"));
    EXPECT_FALSE(Listed("Shared8"));
}

TEST_F(SharedMemory, CreateIsExclusiveAndDeleteFreesTheName) {
    HSHAREDMEMORY a = CreateSharedMemory("Once", 16);
    ASSERT_NE(nullptr, a);
    EXPECT_EQ(nullptr, CreateSharedMemory("Once", 16));
    DeleteSharedMemory("Once");
    EXPECT_EQ(nullptr, OpenSharedMemory("Once", 16));
    // The old mapping stays valid after the name went.
    static_cast<char *>(GetSharedMemoryPtr(a))[15] = 1;
    HSHAREDMEMORY b = CreateSharedMemory("Once", 32);
    ASSERT_NE(nullptr, b);
    EXPECT_EQ(0, static_cast<char *>(GetSharedMemoryPtr(b))[15]) << "a new region, not the old one";
    CloseSharedMemory(a);
    CloseSharedMemory(b);
    DeleteSharedMemory("Once");
}

TEST_F(SharedMemory, ConcurrentCreatesOfOneNameHaveOneWinner) {
    constexpr int kProcs = 4;
    std::vector<std::unique_ptr<Child>> children;
    for (int i = 0; i < kProcs; ++i) {
        children.push_back(std::make_unique<Child>([](Channel &ch) {
            ch.Receive();  // start together
            HSHAREDMEMORY h = CreateSharedMemory("Race", 4096);
            bool won = h != nullptr;
            if (!won) h = OpenSharedMemory("Race", 0);
            if (h == nullptr || GetSharedMemorySize(h) != 4096) return 2;
            __atomic_add_fetch(static_cast<int *>(GetSharedMemoryPtr(h)), 1, __ATOMIC_SEQ_CST);
            CloseSharedMemory(h);
            return won ? 10 : 11;
        }));
    }
    for (auto &c : children) c->Send("go");
    int winners = 0;
    for (auto &c : children) {
        int code = c->Wait();
        ASSERT_TRUE(code == 10 || code == 11) << code;
        winners += code == 10;
    }
    EXPECT_EQ(1, winners);
    HSHAREDMEMORY h = OpenSharedMemory("Race", 0);
    ASSERT_NE(nullptr, h);
    EXPECT_EQ(kProcs, *static_cast<int *>(GetSharedMemoryPtr(h)));
    CloseSharedMemory(h);
}

TEST_F(SharedMemory, DeleteAllRemovesEveryListedRegionAndTheDirectory) {
    EXPECT_EQ(-1, DeleteAllSharedMemory()) << "no listing directory yet";
    for (const char *n : {"A1", "B2", "C3"}) {
        HSHAREDMEMORY h = CreateSharedMemory(n, 64);
        ASSERT_NE(nullptr, h);
        CloseSharedMemory(h);
    }
    EXPECT_EQ(0, DeleteAllSharedMemory());
    for (const char *n : {"A1", "B2", "C3"}) EXPECT_FALSE(ObjectExists(n)) << n;
    struct stat st;
    EXPECT_NE(0, stat(SystemName("/tmp/SHM/").c_str(), &st));
    EXPECT_TRUE(Leftovers().empty());
}

TEST_F(SharedMemory, OrvaObjectFromXAndSlashXInTwoProcessesIsOneObject) {
    Child first([](Channel &ch) {
        orva::SharedMemory<unsigned int> obj("X");
        if (!obj.mapped || obj.name != "/X") return 1;
        ch.Send("value " + std::to_string(*obj.data));
        if (pthread_mutex_lock(*obj.mutex) != 0) return 2;  // the mutex is initialised
        *obj.data = 0xC0FFEE;
        pthread_mutex_unlock(*obj.mutex);
        ch.Send("stored");
        ch.Receive();
        return 0;
    });
    EXPECT_EQ("value 0", first.Receive());
    EXPECT_EQ("stored", first.Receive());
    Child second([](Channel &ch) {
        orva::SharedMemory<unsigned int> obj("/X");
        if (!obj.mapped) return 1;
        pthread_mutex_lock(*obj.mutex);
        ch.Send("value " + std::to_string(*obj.data));
        pthread_mutex_unlock(*obj.mutex);
        return 0;
    });
    EXPECT_EQ("value " + std::to_string(0xC0FFEE), second.Receive());
    EXPECT_EQ(0, second.Wait());
    first.Send("done");
    EXPECT_EQ(0, first.Wait());
    EXPECT_EQ(0, shm_unlink(SystemName("/X").c_str())) << "the object outlives its users";
}

TEST_F(SharedMemory, OrvaObjectWhoseCreatorDiedBeforeSettingItUpIsFinishedByTheNextUser) {
    // A creator that died right after its exclusive create leaves an
    // empty object; one that died while claiming it leaves its pid.
    std::string name = SystemName("/Abandoned");
    int fd = shm_open(name.c_str(), O_RDWR | O_CREAT | O_EXCL, 0600);
    ASSERT_GE(fd, 0);
    close(fd);
    {
        orva::SharedMemory<unsigned int> obj("Abandoned");
        ASSERT_TRUE(obj.mapped);
        EXPECT_EQ(0u, *obj.data);
        EXPECT_EQ(0, pthread_mutex_lock(*obj.mutex));
        pthread_mutex_unlock(*obj.mutex);
    }
    shm_unlink(name.c_str());

    Child dead([](Channel &) { return 0; });
    pid_t deadPid = dead.pid();
    dead.Wait();
    fd = shm_open(name.c_str(), O_RDWR | O_CREAT | O_EXCL, 0600);
    ASSERT_GE(fd, 0);
    ASSERT_EQ(0, ftruncate(fd, sizeof(orva::SharedObject<unsigned int>)));
    auto *raw = static_cast<orva::SharedObject<unsigned int> *>(
        mmap(nullptr, sizeof(orva::SharedObject<unsigned int>), PROT_READ | PROT_WRITE, MAP_SHARED, fd, 0));
    close(fd);
    ASSERT_NE(MAP_FAILED, static_cast<void *>(raw));
    std::memset(&raw->mutex, 0xA5, sizeof raw->mutex);  // never initialised
    raw->initPid = deadPid;
    {
        orva::SharedMemory<unsigned int> obj("Abandoned");
        ASSERT_TRUE(obj.mapped);
        EXPECT_EQ(orva::kSharedObjectReady, raw->state);
        EXPECT_EQ(0, pthread_mutex_lock(*obj.mutex));
        pthread_mutex_unlock(*obj.mutex);
    }
    munmap(raw, sizeof(orva::SharedObject<unsigned int>));
    shm_unlink(name.c_str());
}

TEST_F(SharedMemory, OrvaObjectOfAnotherLayoutIsRefused) {
    std::string name = SystemName("/OtherBuild");
    int fd = shm_open(name.c_str(), O_RDWR | O_CREAT | O_EXCL, 0600);
    ASSERT_GE(fd, 0);
    ASSERT_EQ(0, ftruncate(fd, 12));  // value and a 32-bit target's mutex
    close(fd);
    orva::SharedMemory<unsigned int> obj("OtherBuild");
    EXPECT_FALSE(obj.mapped);
    EXPECT_EQ(nullptr, obj.data);
    EXPECT_EQ(nullptr, obj.mutex);
    shm_unlink(name.c_str());
}

TEST_F(SharedMemory, OrvaMutexIsRobustAgainstAHolderThatDies) {
    Child holder([](Channel &ch) {
        orva::SharedMemory<unsigned int> obj("Robust");
        if (!obj.mapped || pthread_mutex_lock(*obj.mutex) != 0) return 1;
        ch.Send("holding");
        ch.Receive();  // killed here
        return 0;
    });
    ASSERT_EQ("holding", holder.Receive());
    holder.Kill(SIGKILL);
    holder.Wait();
    orva::SharedMemory<unsigned int> obj("Robust");
    ASSERT_TRUE(obj.mapped);
    ASSERT_EQ(EOWNERDEAD, pthread_mutex_lock(*obj.mutex));
    EXPECT_EQ(0, pthread_mutex_consistent(*obj.mutex));
    pthread_mutex_unlock(*obj.mutex);
    EXPECT_EQ(0, pthread_mutex_lock(*obj.mutex));
    pthread_mutex_unlock(*obj.mutex);
    shm_unlink(SystemName("/Robust").c_str());
}

}  // namespace
