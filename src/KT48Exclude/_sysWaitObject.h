// The registry's lookup, for the single-object wait.
#ifndef KT48_SYSWAITOBJECT_H
#define KT48_SYSWAITOBJECT_H

#include "kt48api/waitobj.h"

// 1 and *kind set when handle is registered, 0 when it is not.
int WaitObject_Lookup(void *handle, HANDLE_KIND *kind);

#endif
