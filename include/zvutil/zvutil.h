/* libzvutil: every public header. */
#ifndef ZVUTIL_ZVUTIL_H
#define ZVUTIL_ZVUTIL_H

#include <zvutil/status.h>
#include <zvutil/memory.h>
#include <zvutil/format.h>

#endif
