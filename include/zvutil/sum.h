/* libzvutil running sums. */
#ifndef ZVUTIL_SUM_H
#define ZVUTIL_SUM_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
