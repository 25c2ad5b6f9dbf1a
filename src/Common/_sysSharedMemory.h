// Shared layouts of named shared memory.
#ifndef KT48_SYSSHAREDMEMORY_H
#define KT48_SYSSHAREDMEMORY_H

#include <pthread.h>

#include <cstddef>
#include <cstdint>

namespace orva {

// The object behind orva::SharedMemory<T>: the value, then its mutex (at
// the next offset the host's mutex may live at), then the host's
// construction state. The state closes the window in which a process
// could open the object before its creator initialised the mutex: users
// wait until `state` reads kReady; whoever wins `initPid` (0 -> its pid)
// initialises the mutex, and a winner that died is replaced.
template <typename T>
struct SharedObject {
    T value;
    pthread_mutex_t mutex;
    uint32_t state;
    int32_t initPid;
};

constexpr uint32_t kSharedObjectReady = 0x4B543438u;  // "KT48"

static_assert(offsetof(SharedObject<unsigned int>, value) == 0, "the value leads the object");
static_assert(offsetof(SharedObject<unsigned int>, mutex) % alignof(pthread_mutex_t) == 0,
              "the mutex follows the value at its alignment");
static_assert(offsetof(SharedObject<unsigned int>, state) ==
                  offsetof(SharedObject<unsigned int>, mutex) + sizeof(pthread_mutex_t),
              "the construction state follows the mutex");

}  // namespace orva

#endif
