/* The per-process registry of waitable handles and their kinds. */
#ifndef KT48API_WAITOBJ_H
#define KT48API_WAITOBJ_H

#include "types.h"

KT48_C_BEGIN
/* 1 when a record was removed, 0 otherwise. */
KT48_API int _sys_WaitObjectDel(void *handle);
KT48_C_END

#ifdef __cplusplus
/* 1 when handle is registered with kind afterwards (kinds 1..5), 0 otherwise. */
KT48_API int _sys_WaitObjectAdd(void *handle, HANDLE_KIND kind);
/* Empties the registry; 1. */
KT48_API int _sys_WaitObjectInit();
/* 1. */
KT48_API int _sys_WaitObjectTerm();
#endif

#endif
