/* The interface header compiles as C, and its plain-name functions link
 * from C. */
#include "kt48api.h"

#include <stddef.h>

int kt48_c_api_smoke(void) {
    if (GetSharedMemoryPtr(NULL) != NULL) return 1;
    if (GetSharedMemorySize(NULL) != 0) return 2;
    if (CreateSharedMemory(NULL, 8) != NULL) return 3;
    if (_sys_WaitObjectDel(NULL) != 0) return 4;
    _sys_SetLastError(7);
    if (_sys_GetLastError() != 7) return 5;
    if (WAIT_TIMEOUT != 258 || INFINITE != 0xFFFFFFFFu || HANDLE_KIND_THREAD != 4) return 6;
    return 0;
}
