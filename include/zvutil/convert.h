/* libzvutil multibyte to wide conversion. */
#ifndef ZVUTIL_CONVERT_H
#define ZVUTIL_CONVERT_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
