/* Log controls and front ends. */
#ifndef KT48API_LOG_H
#define KT48API_LOG_H

#include "types.h"

/* Size of the logger's parameter block. */
#define KT48_LOG_PARAMS_SIZE 12120
/* Control bits of ORVA_NsLog's records in the parameter block. */
#define KT48_LOG_CONTROL_LEVEL1 0x20000000u
#define KT48_LOG_CONTROL_LEVEL4 0x40000000u

KT48_C_BEGIN
/* The logger's parameter block; its 32-bit word at byte 12052 is the
 * control word, one bit per category. */
KT48_API extern unsigned char g_VekLogParams[KT48_LOG_PARAMS_SIZE];

/* "stderr" (default), "file:<path>", "syslog" or "none"; inherited by
 * child processes through ORVANsLogMethod. */
KT48_API void ORVA_SetLogMethod(const char *text);
/* Up to 16 comma-separated hexadecimal words; through ORVANsLogMask. */
KT48_API void ORVA_SetLogControlMask(const char *text);
KT48_API void _sys_SetupNsLog(void);
/* Level 1 or 4, when its control bit is set; at most 256 characters. */
KT48_API void ORVA_NsLog(int level, int line, const char *function, const char *format, ...)
    __attribute__((format(printf, 4, 5)));
/* Performance log on, for this process and (ORVAPLog) its children. */
KT48_API int _sys_EnablePLog(void);
KT48_API void _sys_SetupPLog(void);
/* A performance record while the performance log is on; at most 1023 characters. */
KT48_API void ORVA_PLog(unsigned short id, unsigned int value, const char *format, ...)
    __attribute__((format(printf, 3, 4)));
/* Message transmission logs; through ORVAMcLog. */
KT48_API void ORVA_SetTransmissionLog(const char *text);
KT48_API void _sys_SetupMcLog(void);
KT48_C_END

#endif
