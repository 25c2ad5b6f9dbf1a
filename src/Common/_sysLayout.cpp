// The layout guard of the shared tables.

#include "_sysLayout.h"

#include "kt48api/shm.h"

#include "_sysLog.h"

namespace {
const char kSourceFile[] = "Common/_sysLayout";
const char kRegion[] = "KT48_LAYOUT";
}  // namespace

int Layout_Check(const char *function) {
    HSHAREDMEMORY h = CreateSharedMemory(kRegion, sizeof(uint64_t));
    if (h == nullptr) h = OpenSharedMemory(kRegion, sizeof(uint64_t));
    if (h == nullptr || GetSharedMemorySize(h) < sizeof(uint64_t)) {
        KT48_LOG(4, __LINE__, function, "ERROR KT48_LAYOUT cannot be reached");
        CloseSharedMemory(h);
        return -1;
    }
    // A new region reads 0: the first process records its signature.
    auto *word = static_cast<uint64_t *>(GetSharedMemoryPtr(h));
    uint64_t recorded = 0;
    if (__atomic_compare_exchange_n(word, &recorded, layout::kSharedLayoutSignature, false,
                                    __ATOMIC_ACQ_REL, __ATOMIC_ACQUIRE))
        recorded = layout::kSharedLayoutSignature;
    CloseSharedMemory(h);
    if (recorded != layout::kSharedLayoutSignature) {
        KT48_LOG(4, __LINE__, function,
                 "ERROR shared layout %016llx of this build differs from %016llx of the system",
                 static_cast<unsigned long long>(layout::kSharedLayoutSignature),
                 static_cast<unsigned long long>(recorded));
        return -1;
    }
    return 0;
}
