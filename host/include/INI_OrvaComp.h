/* Framework start-up: waiting for the framework's components. */
#ifndef INI_ORVACOMP_H
#define INI_ORVACOMP_H

#ifdef __cplusplus
extern "C" {
#endif

/* Returns once the framework's components are up (at once on the host). */
int INI_WaitInitOrvaComp(unsigned int word);

#ifdef __cplusplus
}
#endif

#endif
