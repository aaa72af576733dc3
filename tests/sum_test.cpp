// Sliding-window running sums.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/sum.h>

namespace {

// Runs |ops| on a fresh window of |n| slots: 'i' inc, 's' set, 'n' next (its
// result must equal the value given), then checks window sum and total.
void run(uint32_t n, std::initializer_list<std::pair<char, double>> ops, double window,
         double total, double partial)
{
    zv_util_sum sum;
    ASSERT_EQ(zv_util_sum_init(&sum, n), ZV_OK);
    for (const auto &[op, value] : ops) {
        if (op == 'i')
            zv_util_sum_inc(&sum, value);
        else if (op == 's')
            zv_util_sum_set(&sum, value);
        else
            EXPECT_EQ(zv_util_sum_next(&sum), value);
    }
    EXPECT_EQ(zv_util_sum_get(&sum), window);
    EXPECT_EQ(zv_util_sum_get_total(&sum), total);
    EXPECT_EQ(zv_util_sum_partial(&sum), partial);
    zv_util_sum_free(&sum);
    zv_util_sum_free(&sum);  // a freed record is accepted
}

TEST(Sum, Sequences)
{
    run(3, {{'i', 1}, {'n', 1}, {'i', 2}, {'n', 3}, {'i', 4}}, 7, 7, 4);
    run(3, {{'i', 1}, {'n', 1}, {'i', 2}, {'n', 3}, {'i', 4}, {'n', 7}}, 6, 7, 0);
    run(1, {{'i', 2.5}, {'i', 0.5}, {'n', 3}}, 0, 3, 0);
    run(2, {{'i', 10}, {'n', 10}, {'i', 5}, {'s', 2}}, 12, 12, 2);  // set replaces
    // Each operation rounds once, to double, whatever the target's arithmetic:
    // 1 + (2^-53 + 2^-105) rounds up; rounded to 64 bits first, it would end on
    // the halfway point and round to even (1.0).
    run(2, {{'i', 1.0}, {'i', 0x1p-53 + 0x1p-105}}, 1.0 + 0x1p-52, 1.0 + 0x1p-52, 1.0 + 0x1p-52);
    // (total - old) + value: 1 - 2^-60 is 1.0 as a double, so the total is 0,
    // not -2^-60.
    run(2, {{'i', 1.0}, {'n', 1.0}, {'i', 0x1p-60}, {'s', -1.0}}, 0.0, 0.0, -1.0);
    EXPECT_NO_FRAMES();
}

TEST(Sum, InitFailures)
{
    zv_util_sum sum;
    std::memset(&sum, 0x5A, sizeof sum);
    const zv_util_sum before = sum;
    zvt::LogCapture log;
    EXPECT_EQ(zv_util_sum_init(nullptr, 4), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_sum_init(&sum, 0), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(std::memcmp(&sum, &before, sizeof sum), 0);
    EXPECT_EQ(zvt::with_fault("alloc", 1, ENOMEM, [&] { return zv_util_sum_init(&sum, 4); }),
              ZV_ERR_NO_MEMORY);
    EXPECT_EQ(sum.slots, nullptr);
    EXPECT_EQ(sum.slot_count, before.slot_count);
    EXPECT_FRAMES({"zv_util_sum_init", ZV_ERR_NULL_ARG}, {"zv_util_sum_init", ZV_ERR_BAD_VALUE},
                  {"zv_util_sum_init", ZV_ERR_NO_MEMORY});
    ASSERT_TRUE(zvt::LogIs(log, {{3, "N is zero"}, {3, "calloc() failed, N=4"}}));
    EXPECT_EQ(log.lines()[0].frames_before, 1u);  // each line precedes its frame
    EXPECT_EQ(log.lines()[1].frames_before, 2u);
    zv_util_sum_free(nullptr);
}

}  // namespace
