/* libzvutil file operations: descriptors, durable sync, named files. */
#ifndef ZVUTIL_FILE_H
#define ZVUTIL_FILE_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

#ifdef __cplusplus
}
#endif

#endif
