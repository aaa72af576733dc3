/* libzvutil option table parser. */
#ifndef ZVUTIL_GETOPT_H
#define ZVUTIL_GETOPT_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
