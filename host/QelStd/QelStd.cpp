// Platform standard library on the host: named memory regions on POSIX
// shared memory, listed one entry per region under "/tmp/SHM/".
//
// A region handle is an index into this process's table of open region
// descriptors. A region is made complete under a private name and then
// linked to its own name, so that nobody ever opens a region of the wrong
// size or one that is still being made.

#include "QelStd.h"

#include "kt48host.h"

#include <fcntl.h>
#include <limits.h>
#include <pthread.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>

#define QELSTD_API extern "C" __attribute__((visibility("default")))

namespace {

constexpr char kShmDir[] = "/dev/shm";  // where the host keeps POSIX shared memory
constexpr char kListing[] = "/tmp/SHM/";
constexpr unsigned int kMaxHandles = 1024;

struct HandleTable {
    pthread_mutex_t lock = PTHREAD_MUTEX_INITIALIZER;
    int fd[kMaxHandles];
    bool used[kMaxHandles];
};

HandleTable g_handles;

bool validRegionName(const char *name) {
    if (name == nullptr || name[0] == '\0') return false;
    if (std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0) return false;
    return std::strchr(name, '/') == nullptr && std::strlen(name) <= NAME_MAX;
}

// "/<name>" for this session.
bool objectName(const char *region, char *out, size_t size) {
    char target[NAME_MAX + 2];
    int n = std::snprintf(target, sizeof target, "/%s", region);
    if (n < 0 || static_cast<size_t>(n) >= sizeof target) return false;
    return KT48Host_SystemName(target, out, size) == 0 && std::strlen(out) <= NAME_MAX;
}

bool listingDir(char *out, size_t size) { return KT48Host_SystemName(kListing, out, size) == 0; }

unsigned int allocHandle(int fd) {
    unsigned int h = 0;
    pthread_mutex_lock(&g_handles.lock);
    for (unsigned int i = 0; i < kMaxHandles; ++i) {
        if (!g_handles.used[i]) {
            g_handles.used[i] = true;
            g_handles.fd[i] = fd;
            h = i + 1;
            break;
        }
    }
    pthread_mutex_unlock(&g_handles.lock);
    return h;
}

int handleFd(unsigned int h) {
    int fd = -1;
    pthread_mutex_lock(&g_handles.lock);
    if (h >= 1 && h <= kMaxHandles && g_handles.used[h - 1]) fd = g_handles.fd[h - 1];
    pthread_mutex_unlock(&g_handles.lock);
    return fd;
}

void releaseHandle(unsigned int h) {
    int fd = -1;
    pthread_mutex_lock(&g_handles.lock);
    if (h >= 1 && h <= kMaxHandles && g_handles.used[h - 1]) {
        fd = g_handles.fd[h - 1];
        g_handles.used[h - 1] = false;
    }
    pthread_mutex_unlock(&g_handles.lock);
    if (fd >= 0) close(fd);
}

bool addListingEntry(const char *region) {
    char dir[PATH_MAX];
    if (!listingDir(dir, sizeof dir)) return false;
    if (mkdir(dir, 0777) != 0 && errno != EEXIST) return false;
    char path[PATH_MAX];
    int n = std::snprintf(path, sizeof path, "%s%s", dir, region);
    if (n < 0 || static_cast<size_t>(n) >= sizeof path) return false;
    int fd = open(path, O_WRONLY | O_CREAT | O_CLOEXEC, 0666);
    if (fd < 0) return false;
    close(fd);
    return true;
}

void removeListingEntry(const char *region) {
    char dir[PATH_MAX];
    if (!listingDir(dir, sizeof dir)) return;
    char path[PATH_MAX];
    int n = std::snprintf(path, sizeof path, "%s%s", dir, region);
    if (n < 0 || static_cast<size_t>(n) >= sizeof path) return;
    unlink(path);
}

// Makes a complete zero-filled region under a private name, then links it
// to its own name; link() fails when the name is taken, which makes the
// create exclusive.
int createRegion(const char *object, unsigned int size) {
    static unsigned int serial = 0;
    char temp[64];
    std::snprintf(temp, sizeof temp, "/.kt48new.%d.%u", static_cast<int>(getpid()),
                  __atomic_add_fetch(&serial, 1, __ATOMIC_RELAXED));
    int fd = shm_open(temp, O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
    if (fd < 0) return -1;
    fchmod(fd, 0666);  // regions are shared by all users of the system, whatever the umask
    int rc = ftruncate(fd, static_cast<off_t>(size));
    if (rc == 0) {
        char from[PATH_MAX], to[PATH_MAX];
        std::snprintf(from, sizeof from, "%s%s", kShmDir, temp);
        std::snprintf(to, sizeof to, "%s%s", kShmDir, object);
        rc = link(from, to);
    }
    int saved = errno;
    shm_unlink(temp);
    if (rc != 0) {
        close(fd);
        errno = saved;
        return -1;
    }
    return fd;
}

}  // namespace

QELSTD_API int QelStd_ProcessInitialize(void) { return 0; }

QELSTD_API int QelStd_SharedMemoryCreate(unsigned int *handle, unsigned int *size, const char *name,
                                         unsigned int reqSize, int create) {
    if (handle == nullptr || size == nullptr || !validRegionName(name)) return -1;
    char object[NAME_MAX + 2];
    if (!objectName(name, object, sizeof object)) return -1;
    int fd;
    unsigned int actual;
    if (create) {
        if (reqSize == 0) return -1;
        fd = createRegion(object, reqSize);
        if (fd < 0) return -1;
        if (!addListingEntry(name)) {
            shm_unlink(object);
            close(fd);
            return -1;
        }
        actual = reqSize;
    } else {
        fd = shm_open(object, O_RDWR | O_CLOEXEC, 0);
        if (fd < 0) return -1;
        struct stat st;
        if (fstat(fd, &st) != 0 || st.st_size <= 0 || st.st_size > 0xFFFFFFFFll) {
            close(fd);
            return -1;
        }
        actual = static_cast<unsigned int>(st.st_size);
    }
    unsigned int h = allocHandle(fd);
    if (h == 0) {
        if (create) {
            shm_unlink(object);
            removeListingEntry(name);
        }
        close(fd);
        return -1;
    }
    *handle = h;
    *size = actual;
    return 0;
}

QELSTD_API int QelStd_SharedMemoryLink(void **address, unsigned int handle, unsigned int size,
                                       int access) {
    if (address == nullptr || size == 0) return -1;
    int prot;
    switch (access) {
        case QELSTD_ACCESS_READ: prot = PROT_READ; break;
        case QELSTD_ACCESS_WRITE: prot = PROT_WRITE; break;
        case QELSTD_ACCESS_READWRITE: prot = PROT_READ | PROT_WRITE; break;
        default: return -1;
    }
    int fd = handleFd(handle);
    if (fd < 0) return -1;
    void *p = mmap(nullptr, size, prot, MAP_SHARED, fd, 0);
    if (p == MAP_FAILED) return -1;
    *address = p;
    return 0;
}

QELSTD_API int QelStd_SharedMemoryDelete(unsigned int *handle, const char *name, int mode) {
    if (handle == nullptr) return -1;
    if (mode != QELSTD_RELEASE_HANDLE && mode != QELSTD_REMOVE_REGION) return -1;
    if (*handle != 0) {
        releaseHandle(*handle);
        *handle = 0;
    }
    if (mode == QELSTD_RELEASE_HANDLE) return 0;
    if (!validRegionName(name)) return -1;
    char object[NAME_MAX + 2];
    if (!objectName(name, object, sizeof object)) return -1;
    int rc = shm_unlink(object);
    removeListingEntry(name);
    return rc == 0 ? 0 : -1;
}

QELSTD_API int QelStd_SharedMemoryUnlink(void *address, unsigned int size) {
    if (address == nullptr || size == 0) return -1;
    return munmap(address, size) == 0 ? 0 : -1;
}
