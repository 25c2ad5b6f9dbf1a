/* The logger's parameter block and its initial image: the byte 2, the
 * category names in 24-byte slots from byte 1, and the control word at
 * byte 12052, 0 until the logger's mask is set. */

#include "kt48api/log.h"

#define SLOT(n) (1 + 24 * (n))

_Alignas(4) unsigned char g_VekLogParams[KT48_LOG_PARAMS_SIZE] = {
    [0] = 2,
    [SLOT(0)] = 'I', 'n', 'i', 't',
    [SLOT(1)] = 'F', 'u', 'n', 'c', 't', 'i', 'o', 'n',
    [SLOT(2)] = 'M', 'e', 'm', 'o', 'r', 'y',
    [SLOT(19)] = 'I', 'n', 'f', 'o',
    [SLOT(20)] = 'W', 'a', 'r', 'n', 'i', 'n', 'g',
    [SLOT(21)] = 'E', 'r', 'r', 'o', 'r',
};
