// Deadlines, time values, calendar time, wall clock and timers.
#include <cmath>
#include <tuple>

#include "support/scratch.h"
#include "support/wrap_time.h"
#include "time/time_internal.h"
#include <zvutil/timeutil.h>

namespace {

template <class... T>
using Rows = std::initializer_list<std::tuple<T...>>;
constexpr time_t kMax = 0x7FFFFFFF;
constexpr zv_status kOk = ZV_OK, kOver = ZV_ERR_OVERFLOW, kBad = ZV_ERR_BAD_VALUE,
                    kNull = ZV_ERR_NULL_ARG, kSys = ZV_ERR_SYSTEM;

// The clock reads |now| for the scope; the zone is UTC from then on, which
// nothing else reads.
struct Pinned {
    explicit Pinned(timespec now) { zvt::pin_clock(now), setenv("TZ", "UTC", 1), tzset(); }
    ~Pinned() { zvt::pin_clock(std::nullopt); }
};

auto key(const timespec &ts) { return std::pair(int64_t{ts.tv_sec}, int64_t{ts.tv_nsec}); }

TEST(Deadline, OffsetCarriesAndStopsAtTheLastSecond)
{
    // Nanoseconds far out of range, which a 64-bit long holds, overflow too.
    const long far = static_cast<long>(sizeof(long) == 8 ? 4000000000 : 0);
    for (auto [start, val, scale, status, end] : Rows<timespec, int, int, zv_status, timespec>{
             {{10, 600000000}, 1500, 1000, kOk, {12, 100000000}},
             {{10, 600000000}, 400000000, 1000000000, kOk, {11, 0}},
             {{10, 600000000}, 0, 1, kOk, {10, 600000000}},
             {{0, 5}, 3, 3, kOk, {1, 5}},  // whole units, not 3 * 333333333 ns
             {{kMax - 1, 999999999}, 1, 1, kOk, {kMax, 999999999}},
             {{kMax - 5, 0}, INT32_MAX, 1, kOver, {kMax - 5, 0}},
             {{kMax - 1, 900000000}, 1100, 1000, kOver, {kMax, 0}},  // at the carry
             {{4, 5}, -1, 1000, kBad, {4, 5}}, {{4, 5}, 5, 1000000001, kBad, {4, 5}},
             {{0, far}, 0, 1, far ? kOver : kOk, {far != 0, 0}}}) {
        EXPECT_STATUS(status, zv_util_abs_time_offset(&start, val, scale));
        EXPECT_EQ(key(start), key(end)) << val << "/" << scale;
    }
}

TEST(Deadline, ExpiryOrderAndTimeLeft)
{
    const timespec now{50, 500000000};
    Pinned clock(now);
    for (auto [deadline, order, left] : Rows<timespec, int, std::string>{
             {{50, 500000000}, 0, "0.000000e+00"}, {{50, 500000001}, 1, "1.000000e-09"},
             {{52, 250000000}, 1, "1.750000e+00"}, {{49, 750000000}, -1, "-7.500000e-01"}}) {
        uint32_t expired = 7;
        int32_t forth = 7, back = 7;
        char text[32];
        EXPECT_EQ(zv_util_query_timeout_expired(&deadline, &expired) |
                      zv_util_query_timeout_left(&deadline, text, 32) |
                      zv_util_cmp_timeout(&deadline, &now, &forth) | zv_util_cmp_timeout(&now, &deadline, &back),
                  kOk);
        EXPECT_TRUE(expired == (order < 1) && forth == order && back == -order) << left;
        EXPECT_EQ(text, left + " seconds");
    }
}

TEST(Clock, PinnedReadings)
{
    Pinned clock({kMax - 5, 123456789});
    timespec ts{};
    EXPECT_TRUE(zv_util_future_timeout(&ts, 5500, 1000) == kOk && key(ts) == key({kMax, 623456789}));
    EXPECT_STATUS(kOver, zv_util_future_timeout(&ts, 6, 1));
    EXPECT_EQ(key(ts), key({kMax - 5, 123456789})) << "the clock reading stays";
    timeval tv{};
    for (int32_t seconds : {0, 5, 6}) {
        EXPECT_STATUS(seconds < 6 ? kOk : kOver, zv_util_future_time(seconds, &tv));
        EXPECT_TRUE(tv.tv_sec == kMax - 5 + seconds % 6 && tv.tv_usec == 123456) << seconds;
    }
    EXPECT_EQ(zv_util_walltime_msec(), (kMax - 5) * int64_t{1000} + 123);
    EXPECT_EQ(zv_util_walltime_usec(), (kMax - 5) * int64_t{1000000} + 123456);
    EXPECT_EQ(zv_util_timer_point(), (kMax - 5) * uint64_t{1000000000} + 123456789);

    char text[26];
    uint32_t length = 26;
    EXPECT_TRUE(zv_util_now_str(text, &length, nullptr) == kOk && length == 24);
    EXPECT_STREQ(text, "Tue Jan 19 03:14:02 2038");
    tm now{}, utc{};
    EXPECT_EQ(zv_util_get_broken_down_time(&now), kOk);
    EXPECT_TRUE(now.tm_year == 138 && now.tm_hour == 3 && now.tm_sec == 2);
    const time_t when = 951782400;
    EXPECT_EQ(zv_util_gmtime(&when, &utc) | zv_util_asctime(&utc, text, 26), kOk);
    EXPECT_STREQ(text, "Tue Feb 29 00:00:00 2000\n");
    EXPECT_TRUE(zv_util_localtime_r(&when, &now) == &now && now.tm_yday == 59 && now.tm_hour == 0);
}

// A failure row of |fn| called with |args|: its frame with |code|, then any
// of FailureRow's other fields by name.
#define ROW(code, fn, args, ...)                                                     \
    zvt::FailureRow                                                                    \
    {                                                                                  \
        .frames = #fn, .status = code, .call = ZVT_CALL(fn args) __VA_OPT__(, ) __VA_ARGS__ \
    }

TEST(Time, Failures)
{
    timespec ts{5, 0};
    timeval tv{};
    tm out{};
    const time_t zero = 0;
    uint32_t ms = 7, expired = 7, size = 26, small = 25;
    int32_t order = 7, *err = &zvt::row_errno;
    char text[32] = "untouched", null_line[80];
    std::snprintf(null_line, sizeof null_line, "NULL argument detected: %p %p %p",
                  static_cast<void *>(&ts), nullptr, static_cast<void *>(&order));
    const char *no_clock = "Failed to get current time.", *clock = "clock_gettime";
    zvt::expect_failures({
        ROW(kBad, zv_util_abs_time_offset, (&ts, 5, 0), .log = "Bad value, val: 5 scale_to_sec: 0"),
        {"zv_util_abs_time_offset,zv_util_future_timeout", kOver,
         ZVT_CALL(zv_util_future_timeout(&ts, INT32_MAX, 1)), nullptr, 1, zvt::kUntouched,
         "Overflow detected when trying to set phase timeout tmp hack", 2},
        ROW(kSys, zv_util_future_timeout, (&ts, 1, 1), .point = clock, .log = no_clock),
        ROW(kSys, zv_util_query_timeout_expired, (&ts, &expired), .point = clock),
        ROW(kSys, zv_util_query_timeout_left, (&ts, text, 32), .point = clock, .log = no_clock),
        ROW(kNull, zv_util_cmp_timeout, (&ts, nullptr, &order), .log = null_line),
        ROW(kNull, zv_util_future_time, (1, nullptr)),
        ROW(kBad, zv_util_future_time, (-1, &tv), .point = "gettimeofday"),  // checked first
        ROW(kSys, zv_util_future_time, (1, &tv), .point = "gettimeofday"),
        {"zv_util_safe_add_seconds", kOver, ZVT_CALL(zv_util_future_time(INT32_MAX, &tv))},
        ROW(kNull, zv_util_timeval_to_ms, (nullptr, &ms)),
        ROW(kNull, zv_util_timeval_to_ms, (&tv, nullptr)),
        {"", kNull, ZVT_CALL(zv_util_ms_to_timeval(1, nullptr))},
        ROW(kSys, zv_util_get_broken_down_time, (&out), .point = "time", .log = "Failed to read time"),
        ROW(kSys, zv_util_get_broken_down_time, (&out), .point = "localtime_r",
            .log = "Failed to unpick time"),
        ROW(kSys, zv_util_gmtime, (&zero, &out), .point = "gmtime_r"),
        ROW(kSys, zv_util_asctime, (&out, text, 26), .point = "asctime_r"),
        ROW(kNull, zv_util_asctime, (nullptr, text, 26)),
        ROW(kNull, zv_util_asctime, (&out, nullptr, 26)),
        ROW(ZV_ERR_TOO_SMALL, zv_util_asctime, (&out, text, 25)),
        ROW(kNull, zv_util_now_str, (nullptr, &size, nullptr)),
        ROW(kNull, zv_util_now_str, (text, nullptr, nullptr)),
        ROW(kBad, zv_util_now_str, (text, &small, nullptr)),
        ROW(kSys, zv_util_now_str, (text, &size, err), .point = "time", .err = EIO),
    });
    EXPECT_STREQ(text, "untouched");
    zvt::expect_failures({ROW(kSys, zv_util_now_str, (text, &size, err), .point = "ctime_r", .err = EIO)});
    EXPECT_STREQ(text, "") << "a failed rendering leaves the empty string";
    // These report a failed reading by their result alone.
    EXPECT_EQ(zvt::with_fault("gettimeofday", 1, EIO, zv_util_walltime_msec), 0);
    EXPECT_EQ(zvt::with_fault("gettimeofday", 1, EIO, zv_util_walltime_usec), 0);
    EXPECT_EQ(zvt::with_fault(clock, 1, EIO, zv_util_timer_point), 0u);
}

TEST(TimeValue, OrderSumsDifferencesAndDurations)
{
    for (auto [first, second, cmp] : Rows<timeval, timeval, int>{
             {{5, 20}, {5, 10}, 1}, {{6, 0}, {5, 999999}, 1}, {{5, 10}, {5, 10}, 0},
             {{3, 2000000}, {4, 0}, -1}})  // as stored
        EXPECT_TRUE(zv_util_timeval_cmp(&first, &second) == cmp &&
                    zv_util_timeval_cmp(&second, &first) == -cmp &&
                    zv_util_time_greater_than(&first, &second) == (cmp == 1) &&
                    zv_util_time_greater_than(&second, &first) == (cmp == -1)) << first.tv_sec << " " << cmp;
    for (auto [start, add, status] : Rows<time_t, uint32_t, zv_status>{
             {kMax - 1, 1, kOk}, {kMax - 1, 2, kOver}, {-5, ~0u, kOver}, {INT32_MIN, ~0u, kOk}}) {
        timeval tv{start, 123};
        EXPECT_STATUS(status, zv_util_safe_add_seconds(&tv, add));
        EXPECT_TRUE(tv.tv_sec == (status ? start : start + add) && tv.tv_usec == 123) << start;
    }
    // The second difference rounds otherwise with 80-bit intermediates.
    const timeval a{10, 500000}, b{8, 750000}, c{982368312, 152888}, d{982353189, 459291};
    EXPECT_EQ(zv_util_time_diff_seconds(&a, &b), 1.75);
    EXPECT_EQ(zv_util_time_diff_seconds(&c, &d), 0x1.d8958c7c9p+13);
    EXPECT_EQ(zv_util_timer_elapsed_seconds(1, 1500000001), 1.5);
    EXPECT_EQ(zv_util_timer_elapsed_seconds(1, 0), 0x1.12e0be826d695p+34);  // set back: wraps
    const uint64_t cycles = zv_util_read_cycles();
    EXPECT_LT(cycles, zv_util_read_cycles());

    for (auto [seconds, expected] : Rows<double, const char *>{
             {1, "1 second"}, {1.4, "1 seconds"}, {60, "1 minute"}, {90, "2 minutes"},
             {3600, "1 hour"}, {86400, "1 day"}, {NAN, "nan days"}}) {
        char text[32] = "junk";
        EXPECT_EQ(zv_util_snprintf_human_time(text, sizeof text, seconds), 0);
        EXPECT_STREQ(text, expected) << seconds;
    }
    for (auto [tv, ms] : Rows<timeval, uint32_t>{{{1, 500000}, 1500}, {{4294967, 295000}, ~0u}}) {
        timeval back{};
        uint32_t out = 7;
        EXPECT_EQ(zv_util_timeval_to_ms(&tv, &out) | zv_util_ms_to_timeval(ms, &back), kOk);
        EXPECT_TRUE(out == ms && back.tv_sec == tv.tv_sec && back.tv_usec == tv.tv_usec) << ms;
    }
}

// An i386 caller that builds with 64-bit time_t is refused by the header.
TEST(TimeHeader, RefusesI386CallersWith64BitTime)
{
    auto compile = [](const std::string &flags) {
        return std::system(("echo '#include <zvutil/timeutil.h>' | cc -m32 -std=c99 -x c "
                            "-fsyntax-only -I" ZVT_SOURCE_DIR "/include - " + flags).c_str());
    };
    if (compile("2>/dev/null") != 0)
        GTEST_SKIP() << "no 32-bit C compiler";
    EXPECT_EQ(compile("-D_FILE_OFFSET_BITS=64 -D_TIME_BITS=64 2>&1 | grep -q 'without _TIME'"), 0);
}

}  // namespace
