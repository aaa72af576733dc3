// Time values and durations.
#include <gtest/gtest.h>

#include <cmath>
#include <string>

#include "support/trace.h"
#include <zvutil/timeutil.h>

namespace {

constexpr time_t kMax = 0x7FFFFFFF;

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

}  // namespace
