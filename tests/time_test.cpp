// Deadlines, time values, calendar time, wall clock and timers.
#include <tuple>

#include "support/zvt.h"
#include "time/time_internal.h"

namespace {

using zv::zv_util_query_timeout_expired;  // internal: the rows name it without zv::

template <class... T> using Rows = std::initializer_list<std::tuple<T...>>;
constexpr time_t kMax = 0x7FFFFFFF;
constexpr zv_status kOk = ZV_OK, kOver = ZV_ERR_OVERFLOW, kBad = ZV_ERR_BAD_VALUE,
                    kNull = ZV_ERR_NULL_ARG, kSys = ZV_ERR_SYSTEM;
const char *kNoClock = "Failed to get current time.";

// The clock reads |now| for the scope; the zone is UTC from then on, which
// nothing else reads.
struct Pinned {
    explicit Pinned(timespec now) { zvt::pin_clock(now), setenv("TZ", "UTC", 1), tzset(); }
    ~Pinned() { zvt::pin_clock(std::nullopt); }
};

auto at(const timespec &ts) { return std::pair(int64_t{ts.tv_sec}, int64_t{ts.tv_nsec}); }

TEST(Deadline, OffsetsFromNowAndTheirBounds)
{
    // 3 / 3 is whole units, not 3 * 333333333 ns. Nanoseconds far out of
    // range, which a 64-bit long holds, overflow too.
    const long far = static_cast<long>(sizeof(long) == 8 ? 4000000000 : 0);
    const long edge = static_cast<long>(sizeof(long) == 8 ? 3147483646 : 0);  // carries to 2^31 - 1
    for (auto [start, val, scale, status, end] : Rows<timespec, int, int, zv_status, timespec>{
             {{10, 600000000}, 1500, 1000, kOk, {12, 100000000}},
             {{10, 600000000}, 400000000, 1000000000, kOk, {11, 0}},
             {{0, 5}, 3, 3, kOk, {1, 5}}, {{kMax - 1, 999999999}, 1, 1, kOk, {kMax, 999999999}},
             {{kMax - 5, 0}, INT32_MAX, 1, kOver, {kMax - 5, 0}},
             {{kMax - 1, 900000000}, 1100, 1000, kOver, {kMax, 0}},  // at the carry
             {{4, 5}, -1, 1000, kBad, {4, 5}}, {{4, 5}, 5, 1000000001, kBad, {4, 5}},
             {{0, far}, 0, 1, far ? kOver : kOk, {far != 0, 0}},
             {{0, edge}, 1, 1000000000, kOk, {edge != 0, edge ? 0x7FFFFFFF : 1}}}) {
        zv_status got = zv_util_abs_time_offset(&start, val, scale);
        EXPECT_EQ(std::make_tuple(got, at(start)), std::make_tuple(status, at(end)))
            << val << "/" << scale;
    }

    Pinned clock({kMax - 5, 623456789});
    timespec ts{}; timeval tv{};
    EXPECT_EQ(zv_util_future_timeout(&ts, 4500, 1000), kOk);
    EXPECT_EQ(at(ts), at({kMax, 123456789}));
    for (auto [seconds, status, end] : Rows<int32_t, zv_status, time_t>{
             {5, kOk, kMax}, {0, kOk, kMax - 5}, {6, kOver, kMax - 5}}) {
        zv_status got = zv_util_future_time(seconds, &tv);
        EXPECT_EQ(std::make_tuple(got, tv.tv_sec), std::make_tuple(status, end)) << seconds;
    }
    // A refused deadline keeps the clock reading.
    zvt::expect_failures({
        ROW(kBad, abs_time_offset, (&ts, 5, 0), .log = "Bad value, val: 5 scale_to_sec: 0"),
        {.frames = "zv_util_abs_time_offset,zv_util_future_timeout", .status = kOver,
         .call = ZVT_CALL(zv_util_future_timeout(&ts, 6, 1)),
         .log = "Overflow detected when trying to set phase timeout tmp hack", .log_after = 2},
        ROW(kNull, future_time, (5, nullptr)), ROW(kBad, future_time, (-1, &tv)),
        ROW(kSys, future_time, (5, &tv), .point = "gettimeofday"),
        ROW(kSys, future_timeout, (&ts, 1, 1), .point = "clock_gettime", .log = kNoClock),
    });
    EXPECT_EQ(at(ts), at({kMax - 5, 623456789}));
}

TEST(Deadline, ExpiryOrderAndTimeLeft)
{
    const timespec now{50, 500000000};
    Pinned clock(now);
    // A nanosecond either side takes 80-bit arithmetic: in double precision
    // the difference at 50 s reads 1.000004e-09.
    const bool exact = !zvt::under_valgrind();
    if (!exact)
        std::puts("valgrind rounds long double to double: nanosecond texts not checked");
    for (auto [deadline, order, left] : Rows<timespec, int, std::string>{
             {{50, 500000000}, 0, "0.000000e+00"}, {{52, 250000000}, 1, "1.750000e+00"},
             {{49, 750000000}, -1, "-7.500000e-01"}, {{50, 500000001}, 1, "1.000000e-09"},
             {{50, 499999999}, -1, "-1.000000e-09"}}) {
        uint32_t expired = 7; int32_t cmp = 7; char text[32];
        EXPECT_OK(zv_util_query_timeout_expired(&deadline, &expired),
                  zv_util_query_timeout_left(&deadline, text, 32),
                  zv_util_cmp_timeout(&deadline, &now, &cmp));
        std::string shown = exact || deadline.tv_nsec % 2 == 0 ? text : left + " seconds";
        EXPECT_EQ(std::make_tuple(expired, cmp, shown),
                  std::make_tuple(uint32_t{order < 1}, order, left + " seconds"));
    }
    uint32_t expired = 7; char text[32] = ""; timespec ts{};
    zvt::expect_failures({
        ROW(kSys, query_timeout_expired, (&ts, &expired), .point = "clock_gettime"),
        ROW(kSys, query_timeout_left, (&ts, text, 32), .point = "clock_gettime", .log = kNoClock),
    });
    EXPECT_STATUS(kNull, zv_util_cmp_timeout(&ts, nullptr, &zvt::row_errno));
    EXPECT_EQ(std::make_tuple(expired, std::string(text)), std::make_tuple(7u, ""));
}

TEST(Clock, PinnedReadingsAndFailures)
{
    Pinned clock({kMax - 5, 623456789});
    EXPECT_EQ(zv_util_walltime_msec(), (kMax - 5) * int64_t{1000} + 623);
    EXPECT_EQ(zv_util_walltime_usec(), (kMax - 5) * int64_t{1000000} + 623456);
    EXPECT_EQ(zv_util_timer_point(), (kMax - 5) * uint64_t{1000000000} + 623456789);

    char text[32]; uint32_t length = 26, size = 26, ms;
    tm now{}, utc{};
    EXPECT_OK(zv_util_now_str(text, &length, nullptr), zv_util_get_broken_down_time(&now));
    EXPECT_STREQ(text, "Tue Jan 19 03:14:02 2038");
    EXPECT_EQ(std::make_tuple(length, now.tm_year, now.tm_sec), std::make_tuple(24u, 138, 2));
    const time_t when = 951782400;
    EXPECT_OK(zv_util_gmtime(&when, &utc), zv_util_asctime(&utc, text, 26));
    EXPECT_STREQ(text, "Tue Feb 29 00:00:00 2000\n");
    EXPECT_EQ(zv_util_localtime_r(&when, &now), &now);
    EXPECT_EQ(std::make_tuple(now.tm_yday, now.tm_hour), std::make_tuple(59, 0));

    // What only a failure shows: a NULL after a valid pointer, a failed clock
    // or rendering.
    int32_t *err = &zvt::row_errno;
    zvt::expect_failures({
        ROW(kNull, asctime, (&now, nullptr, 26)),
        ROW(kNull, now_str, (text, nullptr, err)), ROW(kBad, now_str, (text, &(ms = 25), err)),
        ROW(ZV_ERR_TOO_SMALL, asctime, (&now, text, 25)),
        ROW(kSys, get_broken_down_time, (&now), .point = "time", .log = "Failed to read time"),
        ROW(kSys, now_str, (text, &size, err), .point = "time", .err = EIO),
        ROW(kSys, now_str, (text, &size, err), .point = "ctime_r", .err = EIO),
        ROW(kSys, asctime, (&now, text, 26), .point = "asctime_r"),
        ROW(kSys, gmtime, (&when, &now), .point = "gmtime_r"),
        ROW(kSys, get_broken_down_time, (&now), .point = "localtime_r",
            .log = "Failed to unpick time"),
    });
    // A failed rendering leaves the empty string.
    EXPECT_STREQ(text, "");
    // These report a failed reading by their result alone.
    EXPECT_EQ(zvt::with_fault("gettimeofday", 1, EIO, zv_util_walltime_msec), 0);
    EXPECT_EQ(zvt::with_fault("gettimeofday", 1, EIO, zv_util_walltime_usec), 0);
    EXPECT_EQ(zvt::with_fault("clock_gettime", 1, EIO, zv_util_timer_point), 0u);
}

TEST(TimeValue, OrderDifferencesAndDurations)
{
    for (auto [first, second, cmp] : Rows<timeval, timeval, int>{
             {{5, 20}, {5, 10}, 1}, {{6, 0}, {5, 999999}, 1}, {{5, 10}, {5, 10}, 0}})
        EXPECT_EQ(std::make_tuple(zv_util_timeval_cmp(&first, &second),
                                  zv_util_timeval_cmp(&second, &first),
                                  zv_util_time_greater_than(&first, &second),
                                  zv_util_time_greater_than(&second, &first)),
                  std::make_tuple(cmp, -cmp, cmp, 0)) << first.tv_sec << " " << cmp;
    // The difference rounds otherwise with 80-bit intermediates.
    const timeval a{10, 500000}, c{982368312, 152888}, d{982353189, 459291};
    EXPECT_EQ(zv_util_time_diff_seconds(&c, &d), 0x1.d8958c7c9p+13);
    EXPECT_EQ(zv_util_timer_elapsed_seconds(1, 1500000001), 1.5);
    const uint64_t before = __builtin_ia32_rdtsc(), cycles = zv_util_read_cycles();
    EXPECT_LE(before, cycles) << "the time-stamp counter";
    EXPECT_LE(cycles, __builtin_ia32_rdtsc());

    // Durations in words, each after the 0 returned.
    std::string all; char text[32];
    for (double seconds : {1.0, 1.4, 60.0, 90.0, 3600.0, 86400.0, __builtin_nan("")})
        all += std::to_string(zv_util_snprintf_human_time(text, sizeof text, seconds)) + text + ",";
    EXPECT_EQ(all, "01 second,01 seconds,01 minute,02 minutes,01 hour,01 day,0nan days,");
    timeval back{}, tv{}; uint32_t ms = 7;
    EXPECT_OK(zv_util_timeval_to_ms(&a, &ms), zv_util_ms_to_timeval(~0u, &back));
    EXPECT_EQ(std::make_tuple(ms, back.tv_sec, back.tv_usec),
              std::make_tuple(10500u, 4294967, 295000));
    zvt::expect_failures({
        {.frames = "", .status = kNull, .call = ZVT_CALL(zv_util_ms_to_timeval(1, nullptr))},
        ROW(kNull, timeval_to_ms, (&tv, nullptr)),
    });
}

}  // namespace
