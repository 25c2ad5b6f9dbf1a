/* libkt48api: the whole interface for an application.
 *
 * Plain-name functions have C linkage and this header compiles as C for
 * them; the few functions exported with their parameter list in the
 * symbol are declared for C++ only. */
#ifndef KT48API_H
#define KT48API_H

#include "kt48api/types.h"
#include "kt48api/init.h"
#include "kt48api/shm.h"
#include "kt48api/log.h"
#include "kt48api/internal.h"
#include "kt48api/waitobj.h"

#endif
