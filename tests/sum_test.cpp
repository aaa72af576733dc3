// Sliding-window running sums.
#include <gtest/gtest.h>

#include <cerrno>
#include <cfloat>
#include <cmath>
#include <cstring>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/sum.h>

namespace {

struct Window {
    zv_util_sum sum;
    explicit Window(uint32_t n) { EXPECT_EQ(zv_util_sum_init(&sum, n), ZV_OK); }
    ~Window() { zv_util_sum_free(&sum); }
};

TEST(Sum, SlidingWindow)
{
    Window three(3);
    zv_util_sum *sum = &three.sum;
    zv_util_sum_inc(sum, 1);
    EXPECT_EQ(zv_util_sum_next(sum), 1.0);
    zv_util_sum_inc(sum, 2);
    zv_util_sum_next(sum);
    zv_util_sum_inc(sum, 4);
    EXPECT_EQ(zv_util_sum_get(sum), 7.0);
    EXPECT_EQ(zv_util_sum_next(sum), 7.0);  // wraps to the slot that held 1
    EXPECT_EQ(zv_util_sum_get(sum), 6.0);
    EXPECT_EQ(zv_util_sum_partial(sum), 0.0);
    EXPECT_EQ(zv_util_sum_get_total(sum), 7.0);

    Window one(1);
    zv_util_sum_inc(&one.sum, 2.5);
    zv_util_sum_inc(&one.sum, 0.5);
    EXPECT_EQ(zv_util_sum_partial(&one.sum), 3.0);
    EXPECT_EQ(zv_util_sum_next(&one.sum), 3.0);
    EXPECT_EQ(zv_util_sum_get(&one.sum), 0.0);
    EXPECT_EQ(zv_util_sum_get_total(&one.sum), 3.0);
    EXPECT_NO_FRAMES();
}

TEST(Sum, SetReplacesTheCurrentSlot)
{
    Window two(2);
    zv_util_sum *sum = &two.sum;
    zv_util_sum_inc(sum, 10);
    zv_util_sum_next(sum);
    zv_util_sum_inc(sum, 5);
    zv_util_sum_set(sum, 2);
    EXPECT_EQ(zv_util_sum_partial(sum), 2.0);
    EXPECT_EQ(zv_util_sum_get(sum), 12.0);
    EXPECT_EQ(zv_util_sum_get_total(sum), 12.0);
}

// Sequences whose doubles differ when x87 keeps 64-bit significands: each
// operation must round once, to double, as SSE does.
TEST(Sum, EveryOperationRoundsToDouble)
{
    // 1 + (2^-53 + 2^-105) rounds up; rounding to 64 bits first lands on the
    // halfway point, which then rounds to even (1.0).
    Window window(2);
    zv_util_sum *sum = &window.sum;
    zv_util_sum_inc(sum, 1.0);
    zv_util_sum_inc(sum, 0x1p-53 + 0x1p-105);
    EXPECT_EQ(zv_util_sum_partial(sum), 1.0 + 0x1p-52);
    EXPECT_EQ(zv_util_sum_get(sum), 1.0 + 0x1p-52);
    EXPECT_EQ(zv_util_sum_get_total(sum), 1.0 + 0x1p-52);

    // (total - old) + value: 1 - 2^-60 is 1.0 as a double, so the total is 0,
    // not -2^-60.
    Window other(2);
    sum = &other.sum;
    zv_util_sum_inc(sum, 1.0);
    zv_util_sum_next(sum);
    zv_util_sum_inc(sum, 0x1p-60);
    zv_util_sum_set(sum, -1.0);
    EXPECT_EQ(zv_util_sum_get_total(sum), 0.0);
    EXPECT_EQ(zv_util_sum_get(sum), 0.0);
    // Advancing takes 1.0 out of the window: 0 - 1.0.
    EXPECT_EQ(zv_util_sum_next(sum), 0.0);
    EXPECT_EQ(zv_util_sum_get(sum), -1.0);

    Window huge(1);
    zv_util_sum_inc(&huge.sum, DBL_MAX);
    zv_util_sum_inc(&huge.sum, DBL_MAX);
    EXPECT_EQ(zv_util_sum_get(&huge.sum), INFINITY);
}

TEST(Sum, InitFailures)
{
    zv_util_sum sum;
    std::memset(&sum, 0x5A, sizeof sum);
    const zv_util_sum before = sum;
    zvt::LogCapture log;
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_sum_init(nullptr, 4));
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_sum_init(&sum, 0));
    EXPECT_EQ(std::memcmp(&sum, &before, sizeof sum), 0);
    EXPECT_STATUS(ZV_ERR_NO_MEMORY,
                  zvt::with_fault("alloc", 1, ENOMEM, [&] { return zv_util_sum_init(&sum, 4); }));
    EXPECT_EQ(sum.slots, nullptr);
    EXPECT_EQ(sum.slot_count, before.slot_count);
    EXPECT_FRAMES({"zv_util_sum_init", ZV_ERR_NULL_ARG}, {"zv_util_sum_init", ZV_ERR_BAD_VALUE},
                  {"zv_util_sum_init", ZV_ERR_NO_MEMORY});
    ASSERT_TRUE(zvt::LogIs(log, {{3, "N is zero"}, {3, "calloc() failed, N=4"}}));
    EXPECT_EQ(log.lines()[0].frames_before, 1u);  // each line precedes its frame
    EXPECT_EQ(log.lines()[1].frames_before, 2u);
}

TEST(Sum, FreeIsIdempotentAndAllowsReinit)
{
    zv_util_sum sum;
    ASSERT_EQ(zv_util_sum_init(&sum, 2), ZV_OK);
    zv_util_sum_inc(&sum, 3);
    zv_util_sum_free(&sum);
    EXPECT_EQ(sum.slots, nullptr);
    zv_util_sum_free(&sum);
    zv_util_sum_free(nullptr);
    ASSERT_EQ(zv_util_sum_init(&sum, 2), ZV_OK);
    EXPECT_EQ(zv_util_sum_get_total(&sum), 0.0);
    zv_util_sum_free(&sum);
}

}  // namespace
