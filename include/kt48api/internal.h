/* Deadlines, fatal stop and last error. */
#ifndef KT48API_INTERNAL_H
#define KT48API_INTERNAL_H

#include "types.h"

KT48_C_BEGIN
/* Ends the process (abort); the library's stop after a failure that
 * leaves it without an object it needs. */
KT48_API void _sys_Exit(void) __attribute__((noreturn));
/* The calling thread's errno. */
KT48_API DWORD _sys_GetLastError(void);
KT48_API void _sys_SetLastError(DWORD code);
KT48_C_END

#ifdef __cplusplus
#include <time.h>
/* *deadline = now on CLOCK_MONOTONIC + milliseconds (taken as 32 bits).
 * 0; EINVAL for a null deadline; clock_gettime's result when it fails. */
KT48_API int AddMsecToCurrenttime(struct timespec *deadline, unsigned long milliseconds);
#endif

#endif
