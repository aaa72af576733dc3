/* libzvutil splitting, joining and appending strings. */
#ifndef ZVUTIL_STRING_OPS_H
#define ZVUTIL_STRING_OPS_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
