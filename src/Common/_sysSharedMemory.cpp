// Named shared memory: handle-based regions over the platform's region
// services, and orva::SharedMemory, one typed value with a process-shared
// mutex directly on POSIX shared memory.

#include "_sysSharedMemory.h"

#include "kt48api/shm.h"

#include "_sysPlatform.h"

#include <dirent.h>
#include <fcntl.h>
#include <limits.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>

namespace {
const char kListingDir[] = "/tmp/SHM/";
}

extern "C" HSHAREDMEMORY CreateSharedMemory(const char *name, unsigned int size) {
    if (size == 0 || name == nullptr) return nullptr;
    HSHAREDMEMORY rec = static_cast<HSHAREDMEMORY>(std::calloc(1, sizeof(SHARED_MEMORY_RECORD)));
    if (rec == nullptr) return nullptr;
    rec->size = size;
    unsigned int h = 0, sz = 0;
    if (QelStd_SharedMemoryCreate(&h, &sz, name, size, 1) != 0) {
        std::free(rec);
        return nullptr;
    }
    int r = QelStd_SharedMemoryLink(&rec->address, h, sz, QELSTD_ACCESS_READWRITE);
    QelStd_SharedMemoryDelete(&h, name, QELSTD_RELEASE_HANDLE);
    if (r == 0) {
        rec->created = 1;
        return rec;
    }
    // A create that cannot map its region leaves no region behind.
    QelStd_SharedMemoryDelete(&h, name, QELSTD_REMOVE_REGION);
    std::free(rec);
    return nullptr;
}

extern "C" HSHAREDMEMORY OpenSharedMemory(const char *name, unsigned int /*size*/) {
    if (name == nullptr) return nullptr;
    HSHAREDMEMORY rec = static_cast<HSHAREDMEMORY>(std::calloc(1, sizeof(SHARED_MEMORY_RECORD)));
    if (rec == nullptr) return nullptr;
    unsigned int h = 0, sz = 0;
    if (QelStd_SharedMemoryCreate(&h, &sz, name, 1, 0) != 0) {
        std::free(rec);
        return nullptr;
    }
    int r = QelStd_SharedMemoryLink(&rec->address, h, sz, QELSTD_ACCESS_READWRITE);
    QelStd_SharedMemoryDelete(&h, name, QELSTD_RELEASE_HANDLE);
    if (r == 0) {
        rec->size = sz;
        rec->created = 0;
        return rec;
    }
    std::free(rec);
    return nullptr;
}

extern "C" void CloseSharedMemory(HSHAREDMEMORY handle) {
    if (handle == nullptr) return;
    if (handle->address != nullptr) {
        QelStd_SharedMemoryUnlink(handle->address, handle->size);
        handle->address = nullptr;
    }
    std::free(handle);
}

extern "C" void DeleteSharedMemory(const char *name) {
    if (name == nullptr) return;
    unsigned int h = 0;
    QelStd_SharedMemoryDelete(&h, name, QELSTD_REMOVE_REGION);
}

extern "C" int DeleteAllSharedMemory(void) {
    char dir[PATH_MAX];
    if (KT48Host_SystemName(kListingDir, dir, sizeof dir) != 0) return -1;
    DIR *d = opendir(dir);
    if (d != nullptr) {
        while (struct dirent *e = readdir(d)) {
            if (std::strcmp(e->d_name, ".") == 0 || std::strcmp(e->d_name, "..") == 0) continue;
            unsigned int h = 0;
            QelStd_SharedMemoryDelete(&h, e->d_name, QELSTD_REMOVE_REGION);
        }
        closedir(d);
    }
    return rmdir(dir);
}

extern "C" void *GetSharedMemoryPtr(HSHAREDMEMORY handle) {
    return handle ? handle->address : nullptr;
}

extern "C" unsigned int GetSharedMemorySize(HSHAREDMEMORY handle) {
    return handle ? handle->size : 0;
}

extern "C" HSHAREDMEMORY OpenSharedMemoryAtPhysical(const char *, unsigned int, unsigned int) {
    return nullptr;
}

namespace orva {

namespace {

// How long a fresh object may stay unfinished before a user finishes it:
// long enough that a live creator is never overtaken in practice, and
// harmless when it is (initialisation goes to whoever wins initPid).
constexpr long kConstructionGraceNs = 200L * 1000000L;

long elapsedNs(const timespec &since) {
    timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return (now.tv_sec - since.tv_sec) * 1000000000L + (now.tv_nsec - since.tv_nsec);
}

void backOff() {
    timespec t{0, 100000};  // 100 us
    nanosleep(&t, nullptr);
}

bool processGone(int32_t pid) { return pid > 0 && kill(pid, 0) != 0 && errno == ESRCH; }

template <typename T>
bool initMutex(SharedObject<T> *obj) {
    pthread_mutexattr_t attr;
    if (pthread_mutexattr_init(&attr) != 0) return false;
    pthread_mutexattr_setpshared(&attr, PTHREAD_PROCESS_SHARED);
    // Robust: a process that dies holding the mutex does not stop every
    // later user; the next locker gets EOWNERDEAD and recovers it.
    pthread_mutexattr_setrobust(&attr, PTHREAD_MUTEX_ROBUST);
    int rc = pthread_mutex_init(&obj->mutex, &attr);
    pthread_mutexattr_destroy(&attr);
    return rc == 0;
}

// Waits until the object is initialised, initialising it when this process
// is the first to claim it or its claimant died. False on a failure.
template <typename T>
bool awaitConstruction(SharedObject<T> *obj, bool creator) {
    const int32_t self = static_cast<int32_t>(getpid());
    timespec start;
    clock_gettime(CLOCK_MONOTONIC, &start);
    for (;;) {
        if (__atomic_load_n(&obj->state, __ATOMIC_ACQUIRE) == kSharedObjectReady) return true;
        int32_t owner = __atomic_load_n(&obj->initPid, __ATOMIC_ACQUIRE);
        bool claim = (owner == 0 && (creator || elapsedNs(start) > kConstructionGraceNs)) ||
                     (owner != 0 && owner != self && processGone(owner));
        if (claim && __atomic_compare_exchange_n(&obj->initPid, &owner, self, false,
                                                 __ATOMIC_ACQ_REL, __ATOMIC_ACQUIRE)) {
            if (!initMutex(obj)) return false;
            __atomic_store_n(&obj->state, kSharedObjectReady, __ATOMIC_RELEASE);
            return true;
        }
        backOff();
    }
}

// The size of a fresh object is set by its creator right after creating
// it; a user that finds it still empty waits, and finishes the job itself
// when the creator seems to have died in between.
bool awaitSize(int fd, off_t want) {
    timespec start;
    clock_gettime(CLOCK_MONOTONIC, &start);
    for (;;) {
        struct stat st;
        errno = 0;
        if (fstat(fd, &st) != 0) return false;
        if (st.st_size == want) return true;
        if (st.st_size != 0) return false;  // laid out by a different build: refuse it
        if (elapsedNs(start) > kConstructionGraceNs) {
            errno = 0;
            return ftruncate(fd, want) == 0;
        }
        backOff();
    }
}

}  // namespace

template <typename T>
SharedMemory<T>::SharedMemory(const char *objectName) : mapped(false), data(nullptr), mutex(nullptr) {
    const char *given = objectName ? objectName : "";
    name = given[0] == '/' ? given : std::string("/") + given;

    char systemName[NAME_MAX + 2];
    if (KT48Host_SystemName(name.c_str(), systemName, sizeof systemName) != 0) return;
    const off_t size = static_cast<off_t>(sizeof(SharedObject<T>));

    errno = 0;
    int fd = shm_open(systemName, O_RDWR | O_CREAT | O_EXCL, 0777);
    bool creator = fd >= 0;
    if (creator) {
        errno = 0;
        bool sized = ftruncate(fd, size) == 0;
        if (!sized) {
            close(fd);
            return;
        }
    } else {
        errno = 0;
        fd = shm_open(systemName, O_RDWR, 0777);
        if (fd < 0) return;
        if (!awaitSize(fd, size)) {
            close(fd);
            return;
        }
    }
    errno = 0;
    void *p = mmap(nullptr, static_cast<size_t>(size), PROT_READ | PROT_WRITE, MAP_SHARED, fd, 0);
    close(fd);
    if (p == MAP_FAILED) return;
    auto *obj = static_cast<SharedObject<T> *>(p);
    if (!awaitConstruction(obj, creator)) {
        munmap(p, static_cast<size_t>(size));
        return;
    }
    mutex = new (std::nothrow) pthread_mutex_t *(&obj->mutex);
    if (mutex == nullptr) {
        munmap(p, static_cast<size_t>(size));
        return;
    }
    data = &obj->value;
    mapped = true;
}

template <typename T>
SharedMemory<T>::~SharedMemory() {
    delete mutex;  // the mutex itself stays as it is, for the other processes
    mutex = nullptr;
    if (mapped) {
        errno = 0;
        munmap(data, sizeof(SharedObject<T>));
    }
}

template class SharedMemory<unsigned int>;

}  // namespace orva
