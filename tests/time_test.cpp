// Deadlines, time values, calendar time, wall clock and timers.
#include <gtest/gtest.h>

#include <cerrno>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <sstream>
#include <string>
#include <unistd.h>

#include "support/fault.h"
#include "support/trace.h"
#include "support/wrap_time.h"
#include "time/time_internal.h"
#include <zvutil/timeutil.h>

namespace {

constexpr time_t kMax = 0x7FFFFFFF;

struct PinnedClock {
    explicit PinnedClock(timespec now) { zvt::pin_clock(now); }
    ~PinnedClock() { zvt::pin_clock(std::nullopt); }
};

// TZ=UTC for the scope; the previous setting comes back afterwards.
struct UtcZone {
    bool had = std::getenv("TZ") != nullptr;
    std::string saved = had ? std::getenv("TZ") : "";
    UtcZone() { setenv("TZ", "UTC", 1), tzset(); }
    ~UtcZone() { had ? setenv("TZ", saved.c_str(), 1) : unsetenv("TZ"), tzset(); }
};

TEST(Deadline, OffsetCarriesAndStopsAtTheLastSecond)
{
    const struct {
        timespec start;
        int32_t val, scale;
        zv_status status;
        timespec end;
    } rows[] = {
        {{10, 600000000}, 1500, 1000, ZV_OK, {12, 100000000}},
        {{10, 600000000}, 400000000, 1000000000, ZV_OK, {11, 0}},
        {{10, 600000000}, 0, 1, ZV_OK, {10, 600000000}},
        {{0, 0}, 7, 3, ZV_OK, {2, 333333333}},
        {{-3, 0}, INT32_MAX, 1, ZV_OK, {kMax - 3, 0}},
        {{kMax - 1, 999999999}, 1, 1, ZV_OK, {kMax, 999999999}},
        {{kMax - 5, 0}, INT32_MAX, 1, ZV_ERR_OVERFLOW, {kMax - 5, 0}},
        {{kMax, 0}, 1000, 1000, ZV_ERR_OVERFLOW, {kMax, 0}},
        {{kMax - 1, 900000000}, 1100, 1000, ZV_ERR_OVERFLOW, {kMax, 0}},  // at the carry
        {{4, 5}, -1, 1000, ZV_ERR_BAD_VALUE, {4, 5}}, {{4, 5}, 5, 0, ZV_ERR_BAD_VALUE, {4, 5}},
        {{4, 5}, 5, -5, ZV_ERR_BAD_VALUE, {4, 5}}, {{4, 5}, 5, 1000000001, ZV_ERR_BAD_VALUE, {4, 5}},
    };
    for (const auto &row : rows) {
        zvt::clear_trace();
        zvt::LogCapture log;
        timespec ts = row.start;
        EXPECT_STATUS(row.status, zv_util_abs_time_offset(&ts, row.val, row.scale));
        EXPECT_TRUE(ts.tv_sec == row.end.tv_sec && ts.tv_nsec == row.end.tv_nsec)
            << row.val << "/" << row.scale << " gave " << ts.tv_sec << "." << ts.tv_nsec;
        std::string line = "Bad value, val: " + std::to_string(row.val) +
                           " scale_to_sec: " + std::to_string(row.scale);
        EXPECT_TRUE(row.status ? zvt::FramesAre({{"zv_util_abs_time_offset", row.status}})
                               : zvt::FramesAre({}));
        EXPECT_TRUE(row.status == ZV_ERR_BAD_VALUE ? zvt::LogIs(log, {{3, line.c_str()}})
                                                   : zvt::LogIs(log, {}));
    }
}

TEST(Deadline, FutureTimeoutPassesOnAFailingOffset)
{
    PinnedClock clock({kMax, 7});
    zvt::LogCapture log;
    timespec ts{};
    EXPECT_EQ(zv_util_future_timeout(&ts, 0, 1), ZV_OK);
    EXPECT_STATUS(ZV_ERR_OVERFLOW, zv_util_future_timeout(&ts, 1, 1));
    EXPECT_TRUE(ts.tv_sec == kMax && ts.tv_nsec == 7) << "the clock reading stays";
    EXPECT_FRAMES({"zv_util_abs_time_offset", ZV_ERR_OVERFLOW},
                  {"zv_util_future_timeout", ZV_ERR_OVERFLOW});
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Overflow detected when trying to set phase timeout tmp hack"}}));
    EXPECT_EQ(log.lines().at(0).frames_before, 2u);
}

TEST(Deadline, ExpiryAndOrder)
{
    const timespec now{50, 500};
    PinnedClock clock(now);
    const struct {
        timespec deadline;
        uint32_t expired;
        int32_t order;  // against now
    } rows[] = {{{50, 500}, 1, 0}, {{49, 999999999}, 1, -1}, {{50, 501}, 0, 1},
                {{51, 0}, 0, 1},   {{-1, 0}, 1, -1}};
    for (const auto &row : rows) {
        uint32_t expired = 7;
        int32_t order = 7;
        EXPECT_EQ(zv_util_query_timeout_expired(&row.deadline, &expired), ZV_OK);
        EXPECT_EQ(zv_util_cmp_timeout(&row.deadline, &now, &order), ZV_OK);
        EXPECT_EQ(expired, row.expired) << row.deadline.tv_sec << "." << row.deadline.tv_nsec;
        EXPECT_EQ(order, row.order) << row.deadline.tv_sec << "." << row.deadline.tv_nsec;
    }
    EXPECT_NO_FRAMES();
}

TEST(Deadline, TimeLeftAsText)
{
    const struct {
        timespec now, deadline;
        const char *text;
    } rows[] = {
        {{10, 500000000}, {12, 0}, "1.500000e+00 seconds"},
        {{10, 250000000}, {10, 0}, "-2.500000e-01 seconds"},
        {{0, 1}, {kMax, 999999999}, "2.147484e+09 seconds"},
        // 80-bit steps near 2^30 seconds are 2^-34 s; doubles would give 0.
        {{1000000000, 0}, {1000000000, 1}, "9.895302e-10 seconds"},
    };
    for (const auto &row : rows) {
        PinnedClock clock(row.now);
        char text[64];
        EXPECT_EQ(zv_util_query_timeout_left(&row.deadline, text, sizeof text), ZV_OK);
        EXPECT_STREQ(text, row.text);
        EXPECT_EQ(zv_util_query_timeout_left(&row.deadline, text, 8), ZV_OK);
        EXPECT_EQ(std::string(text), std::string(row.text).substr(0, 7));
    }
}

TEST(Time, ClockAndCalendarFailures)
{
    timespec ts{5, 0};
    timeval tv{};
    tm out{};
    time_t zero = 0;
    uint32_t expired = 7;
    char text[32] = "untouched";
    const char *no_clock = "Failed to get current time.";
    const struct {
        const char *point, *function, *log;
        std::function<zv_status()> call;
    } rows[] = {
        {"clock_gettime", "zv_util_future_timeout", no_clock,
         [&] { return zv_util_future_timeout(&ts, 1, 1); }},
        {"clock_gettime", "zv_util_query_timeout_expired", nullptr,
         [&] { return zv_util_query_timeout_expired(&ts, &expired); }},
        {"clock_gettime", "zv_util_query_timeout_left", no_clock,
         [&] { return zv_util_query_timeout_left(&ts, text, sizeof text); }},
        {"gettimeofday", "zv_util_future_time", nullptr, [&] { return zv_util_future_time(1, &tv); }},
        {"time", "zv_util_get_broken_down_time", "Failed to read time",
         [&] { return zv_util_get_broken_down_time(&out); }},
        {"localtime_r", "zv_util_get_broken_down_time", "Failed to unpick time",
         [&] { return zv_util_get_broken_down_time(&out); }},
        {"gmtime_r", "zv_util_gmtime", nullptr, [&] { return zv_util_gmtime(&zero, &out); }},
        {"asctime_r", "zv_util_asctime", nullptr,
         [&] { return zv_util_asctime(&out, text, sizeof text); }},
    };
    for (const auto &row : rows) {
        zvt::clear_trace();
        zvt::LogCapture log;
        EXPECT_STATUS(ZV_ERR_SYSTEM, zvt::with_fault(row.point, 1, EIO, row.call)) << row.function;
        EXPECT_FRAMES({row.function, ZV_ERR_SYSTEM});
        EXPECT_TRUE(row.log ? zvt::LogIs(log, {{3, row.log}}) : zvt::LogIs(log, {}));
        EXPECT_TRUE(!row.log || log.lines().at(0).frames_before == 0) << "logged before the frame";
    }
    EXPECT_EQ(expired, 7u);
    EXPECT_STREQ(text, "untouched");

    // These report a failed reading by their result alone.
    zvt::clear_trace();
    EXPECT_EQ(zvt::with_fault("gettimeofday", 1, EIO, zv_util_walltime_msec), 0);
    EXPECT_EQ(zvt::with_fault("gettimeofday", 1, EIO, zv_util_walltime_usec), 0);
    EXPECT_EQ(zvt::with_fault("clock_gettime", 1, EIO, zv_util_timer_point), 0u);
    EXPECT_EQ(zvt::with_fault("localtime_r", 1, EIO, [&] { return zv_util_localtime_r(&zero, &out); }),
              nullptr);
    EXPECT_NO_FRAMES();
}

TEST(Time, NullArguments)
{
    zvt::LogCapture log;
    timespec ts{};
    int32_t order = 7;
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_ms_to_timeval(1, nullptr));
    EXPECT_NO_FRAMES();
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_cmp_timeout(&ts, nullptr, &order));
    EXPECT_EQ(order, 7);
    EXPECT_FRAMES({"zv_util_cmp_timeout", ZV_ERR_NULL_ARG});
    char line[128];
    std::snprintf(line, sizeof line, "NULL argument detected: %p %p %p", static_cast<void *>(&ts),
                  nullptr, static_cast<void *>(&order));
    EXPECT_TRUE(zvt::LogIs(log, {{3, line}}));
    EXPECT_EQ(log.lines().at(0).frames_before, 0u);
}

TEST(TimeValue, Compare)
{
    const struct {
        timeval first, second;
        int32_t cmp;
    } rows[] = {{{5, 10}, {5, 20}, -1}, {{6, 0}, {5, 999999}, 1}, {{5, 10}, {5, 10}, 0},
                {{-2, 0}, {-1, 0}, -1}, {{3, 2000000}, {4, 0}, -1} /* as stored */};
    for (const auto &row : rows) {
        EXPECT_EQ(zv_util_timeval_cmp(&row.first, &row.second), row.cmp);
        EXPECT_EQ(zv_util_time_greater_than(&row.first, &row.second), row.cmp == 1 ? 1 : 0);
    }
}

TEST(TimeValue, AddingSecondsStopsAtTheLastSecond)
{
    const struct {
        time_t start;
        uint32_t seconds;
        zv_status status;
    } rows[] = {{kMax - 1, 1, ZV_OK},           {kMax - 1, 2, ZV_ERR_OVERFLOW},
                {0, 0x80000000u, ZV_ERR_OVERFLOW}, {-5, 0xFFFFFFFFu, ZV_ERR_OVERFLOW},
                {INT32_MIN, 0xFFFFFFFFu, ZV_OK}, {kMax, 0, ZV_OK}};
    for (const auto &row : rows) {
        zvt::clear_trace();
        timeval tv{row.start, 123};
        EXPECT_STATUS(row.status, zv_util_safe_add_seconds(&tv, row.seconds));
        EXPECT_EQ(tv.tv_sec, row.status ? row.start : row.start + row.seconds);
        EXPECT_EQ(tv.tv_usec, 123);
        EXPECT_TRUE(row.status ? zvt::FramesAre({{"zv_util_safe_add_seconds", row.status}})
                               : zvt::FramesAre({}));
    }

    PinnedClock clock({kMax - 5, 123456789});
    timeval tv{};
    EXPECT_EQ(zv_util_future_time(5, &tv), ZV_OK);
    EXPECT_TRUE(tv.tv_sec == kMax && tv.tv_usec == 123456);
    EXPECT_STATUS(ZV_ERR_OVERFLOW, zv_util_future_time(6, &tv));
    EXPECT_EQ(tv.tv_sec, kMax - 5) << "the clock reading stays";
    zvt::fault_arm("gettimeofday", 1, EIO);
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_future_time(-1, &tv));
    EXPECT_EQ(zvt::fault_calls("gettimeofday"), 0u) << "checked before the clock is read";
    zvt::fault_clear();
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_future_time(1, nullptr));
    EXPECT_FRAMES({"zv_util_safe_add_seconds", ZV_ERR_OVERFLOW},
                  {"zv_util_future_time", ZV_ERR_BAD_VALUE}, {"zv_util_future_time", ZV_ERR_NULL_ARG});
}

// Values where 80-bit intermediates, or rounding each result twice, give
// another double than x86_64 does.
TEST(TimeValue, DifferenceRoundsLikeX86_64)
{
    const struct {
        timeval first, second;
        double expected;
    } rows[] = {
        {{10, 500000}, {8, 750000}, 1.75},
        {{982368312, 152888}, {982353189, 459291}, 0x1.d8958c7c9p+13},
        {{1234785205, 185298}, {1234762923, 166731}, 0x1.5c2813033p+14},
        {{1258504542, 509852}, {1258504505, 696489}, 0x1.2681c46p+5},
        {{58236638, 366563}, {2090351401, 225474}, -0x1.e47e712b6f866p+30},
    };
    for (const auto &row : rows) {
        double seconds = zv_util_time_diff_seconds(&row.first, &row.second);
        EXPECT_EQ(seconds, row.expected) << std::hexfloat << seconds;
    }
}

TEST(TimeValue, HumanReadableDurations)
{
    const std::pair<double, const char *> rows[] = {
        {0, "0 seconds"},     {1.0, "1 second"},        {1.4, "1 seconds"},  {59.6, "60 seconds"},
        {60, "1 minute"},     {90, "2 minutes"},        {3599, "60 minutes"}, {3600, "1 hour"},
        {86399, "24 hours"},  {86400, "1 day"},         {31536000, "365 days"}, {-5, "-5 seconds"},
        {NAN, "nan days"},    {INFINITY, "inf days"},
        {0x1.28397bb38fc77p+65, "494102498149092 days"},  // 80-bit intermediates give ...91
    };
    for (const auto &[seconds, expected] : rows) {
        char text[64] = "junk";
        EXPECT_EQ(zv_util_snprintf_human_time(text, sizeof text, seconds), 0);
        EXPECT_STREQ(text, expected) << seconds;
    }
    char text[8] = "junk";
    EXPECT_EQ(zv_util_snprintf_human_time(text, 5, 90), 0);
    EXPECT_STREQ(text, "2 mi");
}

TEST(TimeValue, Milliseconds)
{
    for (uint32_t ms : {1500u, 0u, 0xFFFFFFFFu}) {
        timeval tv{-1, -1};
        uint32_t back = 7;
        EXPECT_EQ(zv_util_ms_to_timeval(ms, &tv), ZV_OK);
        EXPECT_TRUE(tv.tv_sec == time_t(ms / 1000) && tv.tv_usec == suseconds_t(ms % 1000 * 1000))
            << ms;
        EXPECT_EQ(zv_util_timeval_to_ms(&tv, &back), ZV_OK);
        EXPECT_EQ(back, ms);
    }
    // Microseconds truncate toward zero; the count wraps modulo 2^32.
    const std::pair<timeval, uint32_t> lossy[] = {
        {{2, 999999}, 2999}, {{4294968, 0}, 704}, {{0, -1500}, 0xFFFFFFFFu}};
    for (const auto &[tv, expected] : lossy) {
        uint32_t ms = 7;
        EXPECT_EQ(zv_util_timeval_to_ms(&tv, &ms), ZV_OK);
        EXPECT_EQ(ms, expected);
    }
    uint32_t ms = 7;
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_timeval_to_ms(nullptr, &ms));
    EXPECT_FRAMES({"zv_util_timeval_to_ms", ZV_ERR_NULL_ARG});
}

TEST(Calendar, NowString)
{
    UtcZone utc;
    PinnedClock clock({951782400, 0});
    char text[27];
    std::memset(text, '*', sizeof text);
    uint32_t length = 25;
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_now_str(text, &length, nullptr));
    EXPECT_EQ(length, 25u);
    length = 26;
    EXPECT_EQ(zv_util_now_str(text, &length, nullptr), ZV_OK);
    EXPECT_EQ(length, 24u);
    EXPECT_STREQ(text, "Tue Feb 29 00:00:00 2000");
    EXPECT_EQ(text[26], '*');

    // A failed clock leaves the text; a failed rendering leaves it empty.
    for (const char *point : {"time", "ctime_r"}) {
        for (bool with_errno : {true, false}) {
            zvt::clear_trace();
            int32_t err = 0;
            length = 26;
            std::strcpy(text, "previous");
            zv_status status = zvt::with_fault(point, 1, EOVERFLOW, [&] {
                return zv_util_now_str(text, &length, with_errno ? &err : nullptr);
            });
            EXPECT_STATUS(ZV_ERR_SYSTEM, status) << point;
            EXPECT_EQ(err, with_errno ? EOVERFLOW : 0);
            EXPECT_STREQ(text, std::strcmp(point, "time") == 0 ? "previous" : "");
            EXPECT_EQ(length, 26u);
            EXPECT_FRAMES({"zv_util_now_str", ZV_ERR_SYSTEM});
        }
    }
}

TEST(Calendar, UtcConversionsAndText)
{
    UtcZone utc;
    PinnedClock clock({kMax, 0});
    tm now{};
    ASSERT_EQ(zv_util_get_broken_down_time(&now), ZV_OK);
    EXPECT_TRUE(now.tm_year == 138 && now.tm_hour == 3 && now.tm_sec == 7);
    const std::pair<time_t, const char *> rows[] = {{0, "Thu Jan  1 00:00:00 1970\n"},
                                                    {kMax, "Tue Jan 19 03:14:07 2038\n"}};
    for (const auto &[when, expected] : rows) {
        tm out{}, local{};
        ASSERT_EQ(zv_util_gmtime(&when, &out), ZV_OK);
        ASSERT_EQ(zv_util_localtime_r(&when, &local), &local);
        EXPECT_EQ(local.tm_hour, out.tm_hour);
        char text[27];
        std::memset(text, '*', sizeof text);
        EXPECT_STATUS(ZV_ERR_TOO_SMALL, zv_util_asctime(&out, text, 25));
        EXPECT_EQ(text[0], '*');
        EXPECT_EQ(zv_util_asctime(&out, text, 26), ZV_OK);
        EXPECT_STREQ(text, expected);
        EXPECT_EQ(text[26], '*');
    }
}

TEST(Clock, ReadingsAndElapsedSeconds)
{
    {
        PinnedClock clock({kMax, 999999999});
        EXPECT_EQ(zv_util_walltime_msec(), 2147483647999);
        EXPECT_EQ(zv_util_walltime_usec(), 2147483647999999);
        EXPECT_EQ(zv_util_timer_point(), 2147483647999999999u);
    }
    {
        PinnedClock clock({-2, 500000000});
        EXPECT_EQ(zv_util_walltime_msec(), -1500);
        EXPECT_EQ(zv_util_walltime_usec(), -1500000);
    }
    const struct {
        uint64_t start, end;
        double seconds;
    } rows[] = {
        {0, 1500000000, 1.5}, {42, 42, 0.0},
        {1, 0, 0x1.12e0be826d695p+34},  // a clock set back wraps
        {0, 2962572729275177, 0x1.69a465d58e395p+21}, {0, 3376288315314173, 0x1.9c250285c36ffp+21},
    };
    for (const auto &row : rows) {
        double seconds = zv_util_timer_elapsed_seconds(row.start, row.end);
        EXPECT_EQ(seconds, row.seconds) << std::hexfloat << seconds;
    }
    uint64_t cycles = zv_util_read_cycles();
    usleep(1000);
    EXPECT_GT(zv_util_read_cycles(), cycles);
}

// The public header refuses an i386 caller that builds with 64-bit time_t.
TEST(TimeHeader, RefusesI386CallersWith64BitTime)
{
    char dir[] = "/tmp/zvutil-time-XXXXXX";
    ASSERT_NE(mkdtemp(dir), nullptr);
    std::string probe = std::string(dir) + "/probe.c", errors = std::string(dir) + "/errors";
    std::ofstream(probe) << "#include <zvutil/timeutil.h>\nint main(void) { return 0; }\n";
    auto compile = [&](const std::string &flags) {
        std::string command = "cc -m32 -std=c99 -pedantic -Werror -fsyntax-only -I" ZVT_SOURCE_DIR
                              "/include " + flags + " " + probe + " 2>" + errors;
        return std::system(command.c_str());
    };
    bool compiler = compile("") == 0;
    int refused = compiler ? compile("-D_FILE_OFFSET_BITS=64 -D_TIME_BITS=64") : 0;
    std::stringstream message;
    message << std::ifstream(errors).rdbuf();
    std::system(("rm -rf " + std::string(dir)).c_str());
    if (!compiler)
        GTEST_SKIP() << "no 32-bit C compiler: " << message.str();
    EXPECT_NE(refused, 0);
    EXPECT_NE(message.str().find("build without _TIME_BITS=64"), std::string::npos) << message.str();
}

}  // namespace
