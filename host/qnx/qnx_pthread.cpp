// QNX thread extensions on the host's clock-based pthread calls.

#include "qnx_ext.h"

#include <cerrno>

#define QNX_API extern "C" __attribute__((visibility("default")))

QNX_API int pthread_mutexattr_setrecursive(pthread_mutexattr_t *attr, int recursive) {
    if (attr == nullptr) return EINVAL;
    switch (recursive) {
        case PTHREAD_RECURSIVE_ENABLE:
            return pthread_mutexattr_settype(attr, PTHREAD_MUTEX_RECURSIVE);
        case PTHREAD_RECURSIVE_DISABLE:
            return pthread_mutexattr_settype(attr, PTHREAD_MUTEX_DEFAULT);
        default:
            return EINVAL;
    }
}

QNX_API int pthread_mutexattr_getrecursive(const pthread_mutexattr_t *attr, int *recursive) {
    if (attr == nullptr || recursive == nullptr) return EINVAL;
    int type = 0;
    int rc = pthread_mutexattr_gettype(attr, &type);
    if (rc != 0) return rc;
    *recursive = type == PTHREAD_MUTEX_RECURSIVE ? PTHREAD_RECURSIVE_ENABLE : PTHREAD_RECURSIVE_DISABLE;
    return 0;
}

QNX_API int pthread_mutex_timedlock_monotonic(pthread_mutex_t *mutex, const struct timespec *abstime) {
    if (mutex == nullptr || abstime == nullptr) return EINVAL;
    return pthread_mutex_clocklock(mutex, CLOCK_MONOTONIC, abstime);
}

QNX_API int pthread_timedjoin_monotonic(pthread_t thread, void **value, const struct timespec *abstime) {
    if (abstime == nullptr) return EINVAL;
    return pthread_clockjoin_np(thread, value, CLOCK_MONOTONIC, abstime);
}
