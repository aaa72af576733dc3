// A deadline in timeval form, from the time of day.
#include <zvutil/timeutil.h>

#include <sys/time.h>

#include "internal.h"

extern "C" {

ZV_EXPORT zv_status zv_util_future_time(int32_t seconds, struct timeval *tv)
{
    if (tv == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (seconds < 0)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    if (gettimeofday(tv, nullptr) < 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    // An overflow comes back with zv_util_safe_add_seconds' frame alone.
    return zv_util_safe_add_seconds(tv, static_cast<uint32_t>(seconds));
}

}  // extern "C"
