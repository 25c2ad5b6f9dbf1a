// System start-up clean-up: the start-up process removes every region
// left from before and creates the system objects.

#include "_sysExcludeInit.h"

#include "kt48api/init.h"
#include "kt48api/shm.h"

#include "../Common/_sysLayout.h"
#include "../Common/_sysLog.h"

namespace {

const char kSourceFile[] = "KT48Exclude/_sysExcludeInit";

}  // namespace

int Exclude_CreateSystemObjects() { return 0; }

int Exclude_SystemInit() {
    DeleteAllSharedMemory();  // nothing is left to fail on: the result is not examined
    int result = Layout_Check("Exclude_SystemInit");
    if (result == 0) result = Exclude_CreateSystemObjects();
    if (result == 0)
        KT48_LOG(1, 52, "Exclude_SystemInit", "SUCCESS In Exclude_SystemInit");
    else
        KT48_LOG(4, 57, "Exclude_SystemInit", "ERROR In Exclude_SystemInit");
    return result;
}
