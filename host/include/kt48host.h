/* Host support of the platform layer: system instance (session) naming.
 *
 * Every system-wide name (shared-memory objects, the region listing
 * directory, message nodes, server names) passes through
 * KT48Host_SystemName, so that one environment variable, KT48_SESSION,
 * separates whole simulated systems on one machine. On the target this
 * is the identity. */
#ifndef KT48HOST_H
#define KT48HOST_H

#include <stddef.h>

#ifdef __cplusplus
extern "C" {
#endif

#define KT48HOST_SESSION_VARIABLE "KT48_SESSION"
#define KT48HOST_SESSION_MAX 24

/* The session word, or NULL when KT48_SESSION is unset or empty.
 * A word that is not 1..24 characters of [A-Za-z0-9_-] is refused:
 * *valid is set to 0 and the word is still returned. */
const char *KT48Host_Session(int *valid);

/* Derive the system-wide name of targetName for the current session.
 *  - "/tmp/<dir>/..." (a directory path): the first component under
 *    /tmp gets ".<session>" appended: "/tmp/SHM/" -> "/tmp/SHM.<s>/".
 *  - "/<name>" (a POSIX IPC name): "/<session>.<name>"; a result longer
 *    than NAME_MAX keeps a prefix and ends in a 64-bit hash of the name.
 *  - "<name>" (a service or node name): "<session>.<name>".
 * Without a session the name is copied unchanged. Returns 0, or -1 when
 * the name does not fit outSize or the session word is invalid (then
 * nothing may be created: a bad word must never reach the real system's
 * objects). */
int KT48Host_SystemName(const char *targetName, char *out, size_t outSize);

#ifdef __cplusplus
}
#endif

#endif
