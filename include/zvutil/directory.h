/* libzvutil directories. */
#ifndef ZVUTIL_DIRECTORY_H
#define ZVUTIL_DIRECTORY_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
