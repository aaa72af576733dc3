// Overflow predicates for multiplication at the edges of each type.
#include <gtest/gtest.h>

#include <cstdint>

#include "support/trace.h"
#include <zvutil/overflow.h>

namespace {

template <class Int>
struct Row {
    Int factor1, factor2;
    int32_t overflows;
};

template <class Int, class Predicate>
void check(Predicate predicate, std::initializer_list<Row<Int>> rows)
{
    for (const Row<Int> &row : rows) {
        EXPECT_EQ(predicate(row.factor1, row.factor2), row.overflows)
            << row.factor1 << " * " << row.factor2;
        EXPECT_EQ(predicate(row.factor2, row.factor1), row.overflows)
            << row.factor2 << " * " << row.factor1;
    }
}

TEST(MultiplyOverflow, Signed32)
{
    check<int32_t>(zv_util_check_multiply_overflow_i32,
                   {{0, INT32_MIN, 0},
                    {0, 0, 0},
                    {46340, 46340, 0},
                    {46341, 46341, 1},
                    {-46341, -46341, 1},
                    {-1, INT32_MIN, 1},
                    {INT32_MAX, -1, 0},
                    {INT32_MIN, 1, 0},
                    {INT32_MIN, INT32_MIN, 1},
                    {65536, -32768, 0},
                    {65536, -32769, 1},
                    {-65536, -32768, 1},
                    {65536, 32767, 0}});
}

TEST(MultiplyOverflow, Signed64)
{
    const int64_t two32 = int64_t{1} << 32, two31 = int64_t{1} << 31;
    check<int64_t>(zv_util_check_multiply_overflow_i64,
                   {{0, INT64_MIN, 0},
                    {3037000499, 3037000499, 0},
                    {3037000500, 3037000500, 1},
                    {-3037000500, -3037000500, 1},
                    {-1, INT64_MIN, 1},
                    {INT64_MAX, -1, 0},
                    {INT64_MIN, 1, 0},
                    {two32, -two31, 0},
                    {two32, -two31 - 1, 1},
                    {two32, two31, 1},
                    {two32, two31 - 1, 0}});
}

TEST(MultiplyOverflow, Unsigned64)
{
    const uint64_t two32 = uint64_t{1} << 32;
    check<uint64_t>(zv_util_check_multiply_overflow_u64,
                    {{0, UINT64_MAX, 0},
                     {two32, two32 - 1, 0},
                     {two32, two32, 1},
                     {UINT64_MAX, 1, 0},
                     {UINT64_MAX, 2, 1},
                     {UINT64_MAX, UINT64_MAX, 1}});
    EXPECT_NO_FRAMES();
}

}  // namespace
