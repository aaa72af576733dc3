/* libzvutil environment and host name. */
#ifndef ZVUTIL_SYSTEM_H
#define ZVUTIL_SYSTEM_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
