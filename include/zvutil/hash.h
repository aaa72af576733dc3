/* libzvutil 64-bit hash and power-of-two rounding. */
#ifndef ZVUTIL_HASH_H
#define ZVUTIL_HASH_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
