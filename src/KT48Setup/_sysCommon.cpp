// Initialisation entries: the once-per-process initialisation, the
// first-in-system initialisation elected through "KT48API_INIT", and the
// command-line switches of the log controls.

#include "kt48api/init.h"
#include "kt48api/log.h"
#include "kt48api/shm.h"

#include "../Common/_sysLayout.h"
#include "../Common/_sysLog.h"
#include "../KT48Exclude/_sysExcludeInit.h"

#include <pthread.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>

namespace {

const char kSourceFile[] = "KT48Setup/_sysCommon";

// Process initialisation guard: set once the initialisation was attempted,
// whether it succeeded or not, so that a failure is reported only once.
pthread_mutex_t g_processInitLock = PTHREAD_MUTEX_INITIALIZER;
uint32_t g_processInitDone = 0;

// The per-process hooks of the families, in their order; the first
// failure ends the sequence.
int processHooks() { return 0; }

}  // namespace

int KT48API_ProcessInit(unsigned int (*)()) {
    pthread_mutex_lock(&g_processInitLock);
    if (g_processInitDone != 0) {
        pthread_mutex_unlock(&g_processInitLock);
        return 0;
    }
    QelStd_ProcessInitialize();
    int result = Layout_Check("KT48API_ProcessInit");
    if (result == 0) result = processHooks();
    if (result == 0) QelMsg_Process_Init();
    _sys_SetupMcLog();
    _sys_SetupNsLog();
    _sys_SetupPLog();
    g_processInitDone = 1;
    pthread_mutex_unlock(&g_processInitLock);
    return result;
}

extern "C" int _sys_SetupKT48API(unsigned int word) {
    INI_WaitInitOrvaComp(word);
    // The word is only passed on; the initialisation does not use it.
    return KT48API_ProcessInit(reinterpret_cast<unsigned int (*)()>(static_cast<uintptr_t>(word)));
}

extern "C" int KT48API_SystemInit(void) { return _sys_SetupKT48API(0); }

extern "C" int KT48API_Init(unsigned int word) {
    orva::SharedMemory<unsigned int> init("KT48API_INIT");
    if (!init.mapped) {
        KT48_LOG(4, __LINE__, "KT48API_Init", "ERROR KT48API_INIT cannot be mapped");
        return -2;
    }
    pthread_mutex_t *lock = *init.mutex;
    int rc = pthread_mutex_lock(lock);
    if (rc == EOWNERDEAD) {
        // A process died during its election; its system part is redone
        // when it had not finished (the value is still 0).
        pthread_mutex_consistent(lock);
        KT48_LOG(4, __LINE__, "KT48API_Init", "WARNING KT48API_INIT holder died, lock recovered");
    } else if (rc != 0) {
        KT48_LOG(4, __LINE__, "KT48API_Init", "ERROR KT48API_INIT lock failed ErrNo[%d]", rc);
        return -2;
    }

    int result;
    if (*init.data != 0) {
        result = KT48API_ProcessInit(nullptr);
    } else {
        result = word != 0 ? -1 : 0;
        QelStd_ProcessInitialize();
        if (result == 0) result = Layout_Check("KT48API_Init");
        if (result == 0) result = Exclude_CreateSystemObjects();
        if (result == 0)
            KT48_LOG(1, 374, "KT48API_Init", "SUCCESS In Exclude_Init");
        else
            KT48_LOG(4, 380, "KT48API_Init", "ERROR In Exclude_Init");
        QelMsg_System_Init();
        if (result == 0) result = KT48API_ProcessInit(nullptr);
        *init.data = 1;
    }
    pthread_mutex_unlock(lock);
    return result;
}

extern "C" void _sys_ProcessArguments(int argc, char **argv) {
    if (argv == nullptr || argc <= 0) return;
    // getopt's process-wide scan state is used as it stands.
    int c;
    while ((c = getopt(argc, argv, "l:m:rt:")) != -1) {
        switch (c) {
            case 'l': ORVA_SetLogMethod(optarg); break;
            case 'm': ORVA_SetLogControlMask(optarg); break;
            case 'r': _sys_EnablePLog(); break;
            case 't': ORVA_SetTransmissionLog(optarg); break;
            default: break;  // unknown switches and missing arguments are ignored
        }
    }
}

__attribute__((destructor)) void my_fini() {}
