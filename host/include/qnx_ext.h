/* QNX Neutrino extensions of the C library, supplied on the host. */
#ifndef QNX_EXT_H
#define QNX_EXT_H

#include <pthread.h>
#include <time.h>

#ifdef __cplusplus
extern "C" {
#endif

#define PTHREAD_RECURSIVE_DISABLE 0
#define PTHREAD_RECURSIVE_ENABLE 1

/* Make mutexes of this attribute recursive (ENABLE) or plain (DISABLE). */
int pthread_mutexattr_setrecursive(pthread_mutexattr_t *attr, int recursive);
int pthread_mutexattr_getrecursive(const pthread_mutexattr_t *attr, int *recursive);

/* Lock with an absolute deadline on CLOCK_MONOTONIC; ETIMEDOUT when it
 * passes, EOWNERDEAD as pthread_mutex_lock for a robust mutex. */
int pthread_mutex_timedlock_monotonic(pthread_mutex_t *mutex, const struct timespec *abstime);

/* Join with an absolute deadline on CLOCK_MONOTONIC; ETIMEDOUT when it passes. */
int pthread_timedjoin_monotonic(pthread_t thread, void **value, const struct timespec *abstime);

#ifdef __cplusplus
}
#endif

#endif
