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

/* ---- Deadlines ---------------------------------------------------------- */

/* zv_util_abs_time_offset adds |val| units of 1/|scale_to_sec| second (1 for
 * seconds, 1000 for milliseconds, ... up to 1000000000 for nanoseconds) to the
 * deadline |*ts| in place; |ts| must not be NULL. A scale that does not divide
 * 1000000000 loses the fraction of a nanosecond per unit.
 * ZV_ERR_BAD_VALUE (frame, after the log line "Bad value, val: %ld
 * scale_to_sec: %ld") for a negative |val| or a scale outside 1..1000000000;
 * ZV_ERR_OVERFLOW (frame) when the seconds would pass 2147483647. After an
 * overflow at the nanosecond carry the deadline holds the whole seconds
 * already added and tv_nsec 0: treat it as invalid after any failure. */
ZV_EXPORT zv_status zv_util_abs_time_offset(struct timespec *ts, int32_t val,
                                            int32_t scale_to_sec);

/* zv_util_future_timeout sets |*ts| to the current CLOCK_REALTIME reading plus
 * the offset, as zv_util_abs_time_offset takes it; |ts| must not be NULL.
 * ZV_ERR_SYSTEM (log line "Failed to get current time.", frame) when the clock
 * cannot be read. When the offset fails, its status comes back with
 * zv_util_abs_time_offset's frame, then this function's frame and the log line
 * "Overflow detected when trying to set phase timeout tmp hack"; |*ts| then
 * holds the current time. */
ZV_EXPORT zv_status zv_util_future_timeout(struct timespec *ts, int32_t val,
                                           int32_t scale_to_sec);

/* zv_util_cmp_timeout stores in |*result| -1, 0 or 1 as deadline |first| is
 * earlier than, equal to or later than |second|. ZV_ERR_NULL_ARG (log line
 * "NULL argument detected: %p %p %p" with the three pointers, then frame)
 * when any pointer is NULL. */
ZV_EXPORT zv_status zv_util_cmp_timeout(const struct timespec *first,
                                        const struct timespec *second, int32_t *result);

/* zv_util_query_timeout_left writes the seconds left until the deadline |*ts|
 * into |text| (|text_size| bytes) as "%le seconds", for example
 * "1.500000e+00 seconds"; negative once the deadline has passed. Truncation is
 * not reported. Neither pointer may be NULL. ZV_ERR_SYSTEM (log line "Failed
 * to get current time.", frame; |text| untouched) when the clock cannot be
 * read. */
ZV_EXPORT zv_status zv_util_query_timeout_left(const struct timespec *ts, char *text,
                                               uint32_t text_size);

/* zv_util_future_time sets |*tv| to the current time of day plus |seconds|.
 * ZV_ERR_NULL_ARG for a NULL |tv|, ZV_ERR_BAD_VALUE for negative |seconds|
 * (checked before the clock is read), ZV_ERR_SYSTEM when gettimeofday fails,
 * each with a frame. ZV_ERR_OVERFLOW, with only zv_util_safe_add_seconds'
 * frame, when the result would pass 2147483647; |*tv| then holds the current
 * time. */
ZV_EXPORT zv_status zv_util_future_time(int32_t seconds, struct timeval *tv);

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

/* ---- Calendar time, wall clock, timers ---------------------------------- */

/* zv_util_now_str writes the current local time as the 24 characters of
 * ctime(3) without its newline, for example "Thu Jan  1 00:00:00 1970", into
 * |text|. |*text_length| holds the buffer's size on entry (at least 26) and
 * the text's length (24) on success; it is unchanged on failure.
 * ZV_ERR_NULL_ARG for a NULL |text| or |text_length|, ZV_ERR_BAD_VALUE for a
 * size below 26, ZV_ERR_SYSTEM when the clock cannot be read or the time
 * cannot be rendered (|text| then holds the empty string), each with a frame.
 * On ZV_ERR_SYSTEM a non-NULL |errno_out| receives errno. */
ZV_EXPORT zv_status zv_util_now_str(char *text, uint32_t *text_length, int32_t *errno_out);

/* zv_util_get_broken_down_time fills |*tm_out| with the current local time;
 * |tm_out| must not be NULL. ZV_ERR_SYSTEM with the log line "Failed to read
 * time" or "Failed to unpick time", then a frame. */
ZV_EXPORT zv_status zv_util_get_broken_down_time(struct tm *tm_out);

/* zv_util_gmtime converts |*when| into UTC in |*tm_out|; neither pointer may
 * be NULL. ZV_ERR_SYSTEM (frame) when gmtime_r fails. */
ZV_EXPORT zv_status zv_util_gmtime(const time_t *when, struct tm *tm_out);

/* zv_util_asctime writes the asctime(3) text of |*tm_in|, newline included
 * (25 characters and a NUL), into |text| of |text_size| bytes.
 * ZV_ERR_NULL_ARG for a NULL pointer, ZV_ERR_TOO_SMALL for a size of 25 or
 * less, ZV_ERR_SYSTEM when asctime_r fails, each with a frame. */
ZV_EXPORT zv_status zv_util_asctime(const struct tm *tm_in, char *text, uint32_t text_size);

/* zv_util_localtime_r is localtime_r(3): |tm_out|, or NULL on failure. No
 * frame. */
ZV_EXPORT struct tm *zv_util_localtime_r(const time_t *when, struct tm *tm_out);

/* zv_util_walltime_msec returns the milliseconds since the epoch, 0 when the
 * time of day cannot be read. */
ZV_EXPORT int64_t zv_util_walltime_msec(void);

/* zv_util_walltime_usec returns the microseconds since the epoch, 0 when the
 * time of day cannot be read. */
ZV_EXPORT int64_t zv_util_walltime_usec(void);

/* zv_util_timer_point returns the nanoseconds since the epoch on
 * CLOCK_REALTIME, exact for every second up to 2147483647; 0 when the clock
 * cannot be read. */
ZV_EXPORT uint64_t zv_util_timer_point(void);

/* zv_util_timer_elapsed_seconds returns the seconds from timer point |start|
 * to |end|. Never negative: when |end| lies before |start| (the clock was set
 * back) the difference wraps modulo 2^64. */
ZV_EXPORT double zv_util_timer_elapsed_seconds(uint64_t start, uint64_t end);

/* zv_util_read_cycles returns the processor's time-stamp counter (RDTSC),
 * unserialized and unscaled. */
ZV_EXPORT uint64_t zv_util_read_cycles(void);

#ifdef __cplusplus
}
#endif

#endif
