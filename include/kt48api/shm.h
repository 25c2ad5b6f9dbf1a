/* Named shared memory. */
#ifndef KT48API_SHM_H
#define KT48API_SHM_H

#include "types.h"

/* The record behind a shared-memory handle. */
typedef struct SHARED_MEMORY_RECORD {
    uint32_t size;     /* bytes: as requested by a create, as found by an open */
    uint32_t physical; /* always 0 */
    uint32_t reserved1;
    void *address;     /* the region in this process; NULL once unmapped */
    uint32_t created;  /* 1 from CreateSharedMemory, 0 from OpenSharedMemory */
    uint32_t reserved2;
} SHARED_MEMORY_RECORD;

typedef SHARED_MEMORY_RECORD *HSHAREDMEMORY;

KT48_C_BEGIN
KT48_API HSHAREDMEMORY CreateSharedMemory(const char *name, unsigned int size);
KT48_API HSHAREDMEMORY OpenSharedMemory(const char *name, unsigned int size);
KT48_API void CloseSharedMemory(HSHAREDMEMORY handle);
KT48_API void DeleteSharedMemory(const char *name);
KT48_API int DeleteAllSharedMemory(void);
KT48_API void *GetSharedMemoryPtr(HSHAREDMEMORY handle);
KT48_API unsigned int GetSharedMemorySize(HSHAREDMEMORY handle);
KT48_API HSHAREDMEMORY OpenSharedMemoryAtPhysical(const char *name, unsigned int size,
                                                  unsigned int physical);
KT48_C_END

#ifdef __cplusplus
#include <pthread.h>
#include <string>

namespace orva {

/* One value of type T in a POSIX shared-memory object of its own, with a
 * process-shared mutex to serialise its users. The first process to build
 * an object of a name creates it (value 0); later ones map it. The object
 * is never removed. Lock with pthread_mutex_lock(*mutex): the mutex is
 * robust, so a lock may report EOWNERDEAD after a holder died. */
template <typename T>
class KT48_API SharedMemory {
public:
    explicit SharedMemory(const char *name);
    ~SharedMemory();
    SharedMemory(const SharedMemory &) = delete;
    SharedMemory &operator=(const SharedMemory &) = delete;

    bool mapped;
    std::string name;        /* always begins with "/" */
    T *data;                 /* the value; NULL until mapped */
    pthread_mutex_t **mutex; /* heap word holding the mutex's address; NULL until mapped */
};

extern template class SharedMemory<unsigned int>;

}  // namespace orva
#endif

#endif
