// Deadlines on CLOCK_REALTIME: offsets, expiry, ordering, time left.
#include <zvutil/timeutil.h>

#include <cstdint>
#include <ctime>

#include "internal.h"
#include "time/time_internal.h"

namespace {

constexpr int64_t kMaxSecond = 0x7FFFFFFF;
constexpr int64_t kMaxNanoseconds = 0x7FFFFFFF;
constexpr int32_t kNanosecondsPerSecond = 1000000000;

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_abs_time_offset(struct timespec *ts, int32_t val,
                                            int32_t scale_to_sec)
{
    if (val < 0 || scale_to_sec < 1 || scale_to_sec > kNanosecondsPerSecond)
        return ZV_LOG_FAIL(ZV_ERR_BAD_VALUE, "Bad value, val: %ld scale_to_sec: %ld\n",
                           static_cast<long>(val), static_cast<long>(scale_to_sec));

    // The bound tests are rearranged so that no intermediate overflows, even
    // for fields far outside their normal range (time_t and long are 64-bit on
    // x86_64).
    int32_t rest = val;
    if (val >= scale_to_sec) {
        int32_t whole = val / scale_to_sec;
        if (ts->tv_sec > kMaxSecond - whole)
            return ZV_FAIL(ZV_ERR_OVERFLOW);
        ts->tv_sec += whole;
        rest = val % scale_to_sec;
    }

    // Below 1000000000 in every case, since rest < scale_to_sec.
    int64_t ns = rest;
    if (scale_to_sec < kNanosecondsPerSecond)
        ns = static_cast<int64_t>(rest) * (kNanosecondsPerSecond / scale_to_sec);

    if (ts->tv_nsec >= kNanosecondsPerSecond - ns) {
        ns = ts->tv_nsec - (kNanosecondsPerSecond - ns);
        ts->tv_nsec = 0;
        if (ts->tv_sec >= kMaxSecond)
            return ZV_FAIL(ZV_ERR_OVERFLOW);
        ts->tv_sec += 1;
    }
    if (ts->tv_nsec > kMaxNanoseconds - ns)
        return ZV_FAIL(ZV_ERR_OVERFLOW);
    ts->tv_nsec += ns;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_future_timeout(struct timespec *ts, int32_t val,
                                           int32_t scale_to_sec)
{
    if (clock_gettime(CLOCK_REALTIME, ts) != 0)
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to get current time.\n");
    zv_status status = zv_util_abs_time_offset(ts, val, scale_to_sec);
    if (status != ZV_OK)
        // Fixed text, the same line for either status.
        return ZV_FAIL_THEN_LOG(status,
                                "Overflow detected when trying to set phase timeout tmp hack\n");
    return ZV_OK;
}

}  // extern "C"

zv_status zv::zv_util_query_timeout_expired(const struct timespec *ts, uint32_t *expired)
{
    struct timespec now;
    if (clock_gettime(CLOCK_REALTIME, &now) != 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    bool ahead = ts->tv_sec > now.tv_sec ||
                 (ts->tv_sec == now.tv_sec && ts->tv_nsec > now.tv_nsec);
    *expired = ahead ? 0 : 1;
    return ZV_OK;
}

extern "C" {

ZV_EXPORT zv_status zv_util_cmp_timeout(const struct timespec *first,
                                        const struct timespec *second, int32_t *result)
{
    if (first == nullptr || second == nullptr || result == nullptr)
        return ZV_LOG_FAIL(ZV_ERR_NULL_ARG, "NULL argument detected: %p %p %p\n",
                           static_cast<const void *>(first), static_cast<const void *>(second),
                           static_cast<const void *>(result));
    if (first->tv_sec != second->tv_sec)
        *result = first->tv_sec < second->tv_sec ? -1 : 1;
    else if (first->tv_nsec != second->tv_nsec)
        *result = first->tv_nsec < second->tv_nsec ? -1 : 1;
    else
        *result = 0;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_query_timeout_left(const struct timespec *ts, char *text,
                                               uint32_t text_size)
{
    struct timespec now;
    if (clock_gettime(CLOCK_REALTIME, &now) != 0)
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to get current time.\n");
    // Evaluated in 80-bit extended precision on both targets and rounded to a
    // double once.
    long double left = (static_cast<long double>(ts->tv_sec) + ts->tv_nsec * 1e-9L) -
                       (static_cast<long double>(now.tv_sec) + now.tv_nsec * 1e-9L);
    std::snprintf(text, text_size, "%le seconds", static_cast<double>(left));
    return ZV_OK;
}

}  // extern "C"
