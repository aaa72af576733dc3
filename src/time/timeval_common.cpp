// Time values: ordering, safe second addition, differences, milliseconds, and
// durations in words.
#include <zvutil/memory.h>
#include <zvutil/timeutil.h>

#include <cstdint>
#include <sys/time.h>

#include "internal.h"
#include "time/double_arith.h"

namespace {

namespace dbl = zv::time_double;

constexpr int64_t kMaxSecond = 0x7FFFFFFF;

// Seconds as a double, rounded after each operation as x86_64 does.
double seconds_of(const struct timeval *tv)
{
    return dbl::add(dbl::to_double(tv->tv_sec), dbl::multiply(dbl::to_double(tv->tv_usec), 1e-6));
}

}  // namespace

extern "C" {

ZV_EXPORT int32_t zv_util_timeval_cmp(const struct timeval *first, const struct timeval *second)
{
    if (first->tv_sec != second->tv_sec)
        return first->tv_sec > second->tv_sec ? 1 : -1;
    if (first->tv_usec != second->tv_usec)
        return first->tv_usec > second->tv_usec ? 1 : -1;
    return 0;
}

ZV_EXPORT int32_t zv_util_time_greater_than(const struct timeval *first,
                                            const struct timeval *second)
{
    return zv_util_timeval_cmp(first, second) > 0 ? 1 : 0;
}

ZV_EXPORT zv_status zv_util_safe_add_seconds(struct timeval *tv, uint32_t seconds)
{
    // Exact for every 32-bit |seconds|: the room lies in the int32_t range.
    int64_t room = kMaxSecond - static_cast<int64_t>(seconds);
    if (room < tv->tv_sec)
        return ZV_FAIL(ZV_ERR_OVERFLOW);
    tv->tv_sec = static_cast<time_t>(tv->tv_sec + static_cast<int64_t>(seconds));
    return ZV_OK;
}

ZV_EXPORT double zv_util_time_diff_seconds(const struct timeval *first,
                                           const struct timeval *second)
{
    return dbl::subtract(seconds_of(first), seconds_of(second));
}

ZV_EXPORT int32_t zv_util_snprintf_human_time(char *text, int32_t text_size, double seconds)
{
    // Each test asks whether the threshold is greater, so a NaN ends in days.
    double v = seconds;
    const char *unit = "second";
    if (!(60 > v)) {
        v = dbl::divide(v, 60);
        unit = "minute";
        if (!(60 > v)) {
            v = dbl::divide(v, 60);
            unit = "hour";
            if (!(24 > v)) {
                v = dbl::divide(v, 24);
                unit = "day";
            }
        }
    }
    const char *suffix = v == 1.0 ? "" : "s";
    (void)zv_util_snprintf(text, text_size, "%.0lf %s%s", v, unit, suffix);
    return 0;
}

ZV_EXPORT zv_status zv_util_ms_to_timeval(uint32_t ms, struct timeval *tv)
{
    if (tv == nullptr)
        return ZV_ERR_NULL_ARG;  // no frame on this path
    tv->tv_sec = static_cast<time_t>(ms / 1000u);
    tv->tv_usec = static_cast<suseconds_t>((ms % 1000u) * 1000u);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_timeval_to_ms(const struct timeval *tv, uint32_t *ms_out)
{
    if (tv == nullptr || ms_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    // Modulo 2^32: only the low 32 bits of the count are kept.
    *ms_out = static_cast<uint32_t>(tv->tv_sec) * 1000u +
              static_cast<uint32_t>(tv->tv_usec / 1000);
    return ZV_OK;
}

}  // extern "C"
