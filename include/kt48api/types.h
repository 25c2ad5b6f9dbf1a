/* Types, constants and result codes shared by every family of calls. */
#ifndef KT48API_TYPES_H
#define KT48API_TYPES_H

#include <stdint.h>

#define KT48_API __attribute__((visibility("default")))

#ifdef __cplusplus
#define KT48_C_BEGIN extern "C" {
#define KT48_C_END }
#else
#define KT48_C_BEGIN
#define KT48_C_END
#endif

typedef int BOOL;
typedef uint32_t DWORD; /* 32-bit, as on the target */
typedef void *HANDLE;

#ifndef TRUE
#define TRUE 1
#endif
#ifndef FALSE
#define FALSE 0
#endif

/* Timeouts are 32-bit milliseconds. */
#define INFINITE 0xFFFFFFFFu

/* Wait results. */
#define WAIT_OBJECT_0 0
#define WAIT_ABANDONED 128
#define WAIT_TIMEOUT 258
#define WAIT_FAILED (-1)

/* Kinds of handles in the wait-object registry. */
typedef enum HANDLE_KIND {
    HANDLE_KIND_MUTEX = 1,
    HANDLE_KIND_THREAD = 4
} HANDLE_KIND;

#endif
