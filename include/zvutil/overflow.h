/* libzvutil overflow-checked multiplication. */
#ifndef ZVUTIL_OVERFLOW_H
#define ZVUTIL_OVERFLOW_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
