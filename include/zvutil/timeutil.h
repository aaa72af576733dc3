/* libzvutil time: deadlines, time values, calendar time, clocks. */
#ifndef ZVUTIL_TIMEUTIL_H
#define ZVUTIL_TIMEUTIL_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
