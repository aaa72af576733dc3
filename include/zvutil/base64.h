/* libzvutil Base64 text. */
#ifndef ZVUTIL_BASE64_H
#define ZVUTIL_BASE64_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
