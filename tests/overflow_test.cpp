// Overflow predicates at the edges of each type, factors both ways round.
#include <gtest/gtest.h>

#include <tuple>

#include <zvutil/overflow.h>

namespace {

template <class Int>
void check(int32_t (*predicate)(Int, Int), std::initializer_list<std::tuple<Int, Int, int32_t>> rows)
{
    for (const auto &[a, b, overflows] : rows) {
        EXPECT_EQ(predicate(a, b), overflows) << a << " * " << b;
        EXPECT_EQ(predicate(b, a), overflows) << b << " * " << a;
    }
}

TEST(MultiplyOverflow, AtTheBoundaries)
{
    check<int32_t>(zv_util_check_multiply_overflow_i32,
                   {{0, INT32_MIN, 0}, {0, 0, 0}, {46340, 46340, 0}, {46341, 46341, 1},
                    {-46341, -46341, 1}, {-1, INT32_MIN, 1}, {INT32_MAX, -1, 0}, {INT32_MIN, 1, 0},
                    {INT32_MIN, INT32_MIN, 1}, {65536, -32768, 0}, {65536, -32769, 1},
                    {-65536, -32768, 1}, {65536, 32767, 0}});
    const int64_t p32 = int64_t{1} << 32, p31 = int64_t{1} << 31;
    check<int64_t>(zv_util_check_multiply_overflow_i64,
                   {{0, INT64_MIN, 0}, {3037000499, 3037000499, 0}, {3037000500, 3037000500, 1},
                    {-3037000500, -3037000500, 1}, {-1, INT64_MIN, 1}, {INT64_MAX, -1, 0},
                    {INT64_MIN, 1, 0}, {p32, -p31, 0}, {p32, -p31 - 1, 1}, {p32, p31, 1}, {p32, p31 - 1, 0}});
    const uint64_t u32 = uint64_t{1} << 32;
    check<uint64_t>(zv_util_check_multiply_overflow_u64,
                    {{0, UINT64_MAX, 0}, {u32, u32 - 1, 0}, {u32, u32, 1}, {UINT64_MAX, 1, 0},
                     {UINT64_MAX, 2, 1}, {UINT64_MAX, UINT64_MAX, 1}});
}

}  // namespace
