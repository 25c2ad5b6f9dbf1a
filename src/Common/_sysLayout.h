// The signature of the shared layouts of this build. Processes of one
// system must lay out the shared tables alike: the first process records
// its signature in the region "KT48_LAYOUT", and a process whose build
// differs refuses its initialisation instead of reading garbage.
//
// Every family that keeps a record in shared memory adds it to
// kSharedLayoutSignature (size, alignment and the offsets that matter).
#ifndef KT48_SYSLAYOUT_H
#define KT48_SYSLAYOUT_H

#include "_sysSharedMemory.h"

#include <pthread.h>

#include <cstdint>

namespace layout {

// Raise when a shared record changes in a way the sizes do not show.
constexpr uint64_t kVersion = 1;

constexpr uint64_t mix(uint64_t h, uint64_t v) {
    for (int i = 0; i < 8; ++i) {
        h ^= (v >> (8 * i)) & 0xFFu;
        h *= 1099511628211ull;
    }
    return h;
}

constexpr uint64_t kSharedLayoutSignature =
    mix(mix(mix(mix(mix(mix(14695981039346656037ull, kVersion), sizeof(pthread_mutex_t)),
                    sizeof(pthread_cond_t)),
                sizeof(orva::SharedObject<unsigned int>)),
            offsetof(orva::SharedObject<unsigned int>, mutex)),
        offsetof(orva::SharedObject<unsigned int>, state));

static_assert(kSharedLayoutSignature != 0, "0 marks an unrecorded signature");

}  // namespace layout

// 0 when this build's layouts match the system's (recording them when
// this is the first process), -1 with a level-4 record otherwise.
int Layout_Check(const char *function);

#endif
