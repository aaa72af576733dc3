// Deadline operations shared inside the library.
#pragma once

#include <cstdint>
#include <ctime>

#include <zvutil/timeutil.h>

#include "internal.h"

namespace zv {

// zv_util_query_timeout_expired sets |*expired| to 1 when the deadline |*ts|
// is at or before the current CLOCK_REALTIME reading, to the nanosecond, and
// to 0 while it lies ahead. Neither pointer may be NULL. ZV_ERR_SYSTEM (frame,
// no log line; |*expired| untouched) when the clock cannot be read. Build the
// deadline with zv_util_future_timeout.
ZV_INTERNAL zv_status zv_util_query_timeout_expired(const struct timespec *ts,
                                                    uint32_t *expired);

}  // namespace zv
