/* libzvutil time: deadlines, time values and durations, calendar time, wall
 * clock, timer points and the cycle counter.
 *
 * Deadlines are absolute readings of CLOCK_REALTIME, so they move when the
 * system clock is set. Seconds are bounded at 2147483647 (0x7FFFFFFF) on
 * every target: no operation here produces a later second. */
#ifndef ZVUTIL_TIMEUTIL_H
#define ZVUTIL_TIMEUTIL_H

/* The library is built with the 32-bit time_t of i386; with _TIME_BITS=64 a
 * caller's timespec, timeval, tm and time_t would no longer match it. */
#if defined(__i386__) && defined(_TIME_BITS)
#if _TIME_BITS == 64
#error "zvutil/timeutil.h: libzvutil uses the 32-bit time_t of i386; build without _TIME_BITS=64"
#endif
#endif

#include <stdint.h>
#include <sys/time.h>
#include <time.h>

#include <zvutil/status.h>

/* The same, for a caller whose <time.h> came earlier under 64-bit time. */
#if defined(__i386__) && defined(__USE_TIME_BITS64) && \
    !(defined(_TIME_BITS) && _TIME_BITS == 64)
#error "zvutil/timeutil.h: libzvutil uses the 32-bit time_t of i386; build without _TIME_BITS=64"
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* Strict ISO C modes of <time.h> do not declare these records. */
struct timespec;
struct timeval;
struct tm;

/* ---- Time values and durations ------------------------------------------ */

/* zv_util_timeval_cmp returns 1, -1 or 0 as |first| is later than, earlier
 * than or equal to |second|, comparing seconds, then microseconds, as stored.
 * Neither pointer may be NULL. */
ZV_EXPORT int32_t zv_util_timeval_cmp(const struct timeval *first,
                                      const struct timeval *second);

/* zv_util_time_greater_than returns 1 when |first| is strictly later than
 * |second|, else 0. Neither pointer may be NULL. */
ZV_EXPORT int32_t zv_util_time_greater_than(const struct timeval *first,
                                            const struct timeval *second);

/* zv_util_safe_add_seconds adds |seconds| to |tv->tv_sec|; |tv| must not be
 * NULL. ZV_ERR_OVERFLOW (frame, |*tv| unchanged) when the sum would pass
 * 2147483647. tv_usec is never touched. */
ZV_EXPORT zv_status zv_util_safe_add_seconds(struct timeval *tv, uint32_t seconds);

/* zv_util_time_diff_seconds returns |first| minus |second| in seconds. Neither
 * pointer may be NULL. */
ZV_EXPORT double zv_util_time_diff_seconds(const struct timeval *first,
                                           const struct timeval *second);

/* zv_util_snprintf_human_time renders the duration |seconds| into |text|
 * (|text_size| bytes) in the largest fitting unit of seconds, minutes, hours
 * or days, rounded to a whole number: "0 seconds", "1 second", "2 minutes",
 * "365 days". The unit is singular only when the unrounded value is exactly 1.
 * Truncation is not reported; always returns 0. */
ZV_EXPORT int32_t zv_util_snprintf_human_time(char *text, int32_t text_size, double seconds);

/* zv_util_ms_to_timeval stores |ms| milliseconds in |*tv|. ZV_ERR_NULL_ARG,
 * with no frame, for a NULL |tv|. */
ZV_EXPORT zv_status zv_util_ms_to_timeval(uint32_t ms, struct timeval *tv);

/* zv_util_timeval_to_ms stores the milliseconds of |*tv| (microseconds
 * truncated toward zero) in |*ms_out|, modulo 2^32: exact for durations up to
 * 4294967 seconds, never for calendar times. ZV_ERR_NULL_ARG (frame) for a
 * NULL pointer. */
ZV_EXPORT zv_status zv_util_timeval_to_ms(const struct timeval *tv, uint32_t *ms_out);

#ifdef __cplusplus
}
#endif

#endif
