// Framework start-up on the host: there are no framework components to
// wait for, so the wait returns at once.

#include "INI_OrvaComp.h"

extern "C" __attribute__((visibility("default"))) int INI_WaitInitOrvaComp(unsigned int) {
    return 0;
}
