/* Process and system initialisation. */
#ifndef KT48API_INIT_H
#define KT48API_INIT_H

#include "types.h"

KT48_C_BEGIN
/* INI_WaitInitOrvaComp(word), then KT48API_ProcessInit. */
KT48_API int _sys_SetupKT48API(unsigned int word);
/* _sys_SetupKT48API(0). */
KT48_API int KT48API_SystemInit(void);
/* Elects the first caller of the system to create the system objects,
 * then runs this process's initialisation. Only 0 is accepted: the first
 * call with any other word gives -1. -2 when the election object cannot
 * be reached. */
KT48_API int KT48API_Init(unsigned int word);
/* Maps the switches -l <method>, -m <mask>, -r and -t <text>. */
KT48_API void _sys_ProcessArguments(int argc, char **argv);
KT48_C_END

#ifdef __cplusplus
/* Once per process: the hooks of every family, then the log settings.
 * The argument is accepted and not used. */
KT48_API int KT48API_ProcessInit(unsigned int (*unused)());
/* Start-up process of the system: removes every region left from before
 * and creates the system objects. */
KT48_API int Exclude_SystemInit();
KT48_API void my_fini();
#endif

#endif
