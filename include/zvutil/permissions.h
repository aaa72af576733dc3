/* libzvutil effective group. */
#ifndef ZVUTIL_PERMISSIONS_H
#define ZVUTIL_PERMISSIONS_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
