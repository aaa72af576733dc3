/* libzvutil processes: spawn and wait, PID files, signals, /proc statistics. */
#ifndef ZVUTIL_PROCESS_H
#define ZVUTIL_PROCESS_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
