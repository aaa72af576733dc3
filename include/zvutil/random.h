/* libzvutil seeded pseudo-random generator. */
#ifndef ZVUTIL_RANDOM_H
#define ZVUTIL_RANDOM_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
