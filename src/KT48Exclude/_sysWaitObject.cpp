// The per-process registry of waitable handles: a list of (handle, kind)
// records in creation order, so that a wait on a bare handle knows what it
// waits on. The registry lock is innermost: it is taken while callers hold
// their own locks, and nothing is called under it that locks.

#include "_sysWaitObject.h"

#include <pthread.h>

#include <cstdlib>

namespace {

struct WAIT_OBJECT_NODE {
    void *handle;
    HANDLE_KIND kind;
    WAIT_OBJECT_NODE *next;
};

constexpr int kKindMin = 1;
constexpr int kKindMax = 5;

pthread_mutex_t g_lock = PTHREAD_MUTEX_INITIALIZER;
WAIT_OBJECT_NODE *g_head = nullptr;

// Caller holds g_lock.
WAIT_OBJECT_NODE *find(void *handle, WAIT_OBJECT_NODE **before) {
    WAIT_OBJECT_NODE *prev = nullptr;
    for (WAIT_OBJECT_NODE *n = g_head; n != nullptr; prev = n, n = n->next) {
        if (n->handle == handle) {
            if (before) *before = prev;
            return n;
        }
    }
    return nullptr;
}

}  // namespace

int _sys_WaitObjectAdd(void *handle, HANDLE_KIND kind) {
    if (handle == nullptr || static_cast<int>(kind) < kKindMin || static_cast<int>(kind) > kKindMax)
        return 0;
    pthread_mutex_lock(&g_lock);
    int result;
    WAIT_OBJECT_NODE *prev = nullptr;
    if (WAIT_OBJECT_NODE *found = find(handle, &prev)) {
        result = found->kind == kind ? 1 : 0;
    } else {
        auto *rec = static_cast<WAIT_OBJECT_NODE *>(std::calloc(1, sizeof(WAIT_OBJECT_NODE)));
        if (rec == nullptr) {
            result = 0;
        } else {
            rec->handle = handle;
            rec->kind = kind;
            rec->next = nullptr;
            WAIT_OBJECT_NODE **tail = &g_head;
            while (*tail != nullptr) tail = &(*tail)->next;
            *tail = rec;
            result = 1;
        }
    }
    pthread_mutex_unlock(&g_lock);
    return result;
}

extern "C" int _sys_WaitObjectDel(void *handle) {
    if (handle == nullptr) return 0;
    pthread_mutex_lock(&g_lock);
    WAIT_OBJECT_NODE *prev = nullptr;
    WAIT_OBJECT_NODE *found = find(handle, &prev);
    if (found != nullptr) {
        if (prev == nullptr)
            g_head = found->next;
        else
            prev->next = found->next;
    }
    pthread_mutex_unlock(&g_lock);
    std::free(found);
    return found != nullptr ? 1 : 0;
}

int _sys_WaitObjectInit() {
    pthread_mutex_lock(&g_lock);
    WAIT_OBJECT_NODE *n = g_head;
    g_head = nullptr;
    pthread_mutex_unlock(&g_lock);
    // The dropped records belong to nobody any more: free them.
    while (n != nullptr) {
        WAIT_OBJECT_NODE *next = n->next;
        std::free(n);
        n = next;
    }
    return 1;
}

int _sys_WaitObjectTerm() { return 1; }

int WaitObject_Lookup(void *handle, HANDLE_KIND *kind) {
    if (handle == nullptr) return 0;
    pthread_mutex_lock(&g_lock);
    WAIT_OBJECT_NODE *found = find(handle, nullptr);
    if (found != nullptr && kind != nullptr) *kind = found->kind;
    pthread_mutex_unlock(&g_lock);
    return found != nullptr ? 1 : 0;
}
