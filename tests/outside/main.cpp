#include <kt48api.h>

#include <cstdio>

int main() {
    HSHAREDMEMORY h = CreateSharedMemory("OUTSIDE", 16);
    if (h == nullptr) return 1;
    CloseSharedMemory(h);
    int rc = KT48API_ProcessInit(nullptr);
    DeleteAllSharedMemory();
    std::printf("outside: init %d\n", rc);
    return rc;
}
