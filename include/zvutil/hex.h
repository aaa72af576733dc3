/* libzvutil hexadecimal byte text. */
#ifndef ZVUTIL_HEX_H
#define ZVUTIL_HEX_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
