// Calendar time through the reentrant conversions, and the wall clock.
#include <zvutil/timeutil.h>

#include <cstdint>
#include <ctime>
#include <sys/time.h>

#include "internal.h"

namespace {

// asctime_r writes 24 characters, a newline and a NUL.
constexpr uint32_t kAsctimeSize = 26;

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_get_broken_down_time(struct tm *tm_out)
{
    time_t now = time(nullptr);
    if (now == static_cast<time_t>(-1))
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to read time\n");
    if (localtime_r(&now, tm_out) == nullptr)
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to unpick time\n");
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_gmtime(const time_t *when, struct tm *tm_out)
{
    if (gmtime_r(when, tm_out) == nullptr)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_asctime(const struct tm *tm_in, char *text, uint32_t text_size)
{
    if (tm_in == nullptr || text == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (text_size < kAsctimeSize)
        return ZV_FAIL(ZV_ERR_TOO_SMALL);
    if (asctime_r(tm_in, text) == nullptr)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    return ZV_OK;
}

ZV_EXPORT struct tm *zv_util_localtime_r(const time_t *when, struct tm *tm_out)
{
    return localtime_r(when, tm_out);
}

ZV_EXPORT int64_t zv_util_walltime_msec(void)
{
    struct timeval tv;
    if (gettimeofday(&tv, nullptr) != 0)
        return 0;
    return static_cast<int64_t>(tv.tv_sec) * 1000 + tv.tv_usec / 1000;
}

ZV_EXPORT int64_t zv_util_walltime_usec(void)
{
    struct timeval tv;
    if (gettimeofday(&tv, nullptr) != 0)
        return 0;
    return static_cast<int64_t>(tv.tv_sec) * 1000000 + tv.tv_usec;
}

}  // extern "C"
