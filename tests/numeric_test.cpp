// 64-bit hash, power-of-two rounding, overflow predicates, running sums and
// the processor features behind the vector paths.
#include <cstring>
#include <random>
#include <vector>

#include "support/feature_paths.h"
#include "support/scratch.h"
#include <zvutil/hash.h>
#include <zvutil/overflow.h>
#include <zvutil/sum.h>

namespace {

// Lengths around the short forms, the block, the vector lane and the prefetch
// stride, on every processor path, at every alignment, ending where the buffer does.
TEST(Hash64, KnownValuesOnEveryPath)
{
    const std::pair<uint32_t, uint64_t> rows[] = {
        {1, 0x4EA1B5C9CD39377D},    {2, 0xD5D416E24FD047BA},    {3, 0xA9994E3BF75BB51C},
        {4, 0x4714B351008D61DE},    {5, 0x92FA4C31D61D09E0},    {7, 0xFD8D5351E3680679},
        {8, 0xC0D30FAA34E547D4},    {9, 0xD58695C1B0631FC3},    {15, 0xF75D6042A309B071},
        {16, 0xAC13DA68CBFAE1D0},   {17, 0xDC1D76889BF21D5B},   {31, 0x2952F3E1B542093B},
        {33, 0xB77E43392CFF3F2C},   {40, 0xF4E8773F1C385E58},   {2111, 0x57B20033B8473AF5},
        {2120, 0xEFE9A8285062F1FE}, {4099, 0xC2EF653F169937DD}};
    std::mt19937 generator(5);
    std::vector<unsigned char> bytes(4099);
    for (unsigned char &byte : bytes)
        byte = static_cast<unsigned char>(generator());
    zvt::for_each_feature_path([&](uint32_t paths) {
        for (const auto &[length, expected] : rows)
            for (size_t offset = 0; offset < 8; ++offset) {
                std::vector<unsigned char> buffer(offset);
                buffer.insert(buffer.end(), bytes.begin(), bytes.begin() + length);
                uint64_t hash = 0;
                EXPECT_EQ(zv_util_hash64(buffer.data() + offset, length, &hash), ZV_OK);
                EXPECT_EQ(hash, expected) << length << "@" << offset << " paths " << paths;
            }
    });
    uint64_t hash = 42;
    zvt::expect_failures({
        {"zv_util_hash64", ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_hash64(nullptr, 1, &hash))},
        {"zv_util_hash64", ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_hash64("a", 0, &hash))}});
    EXPECT_EQ(hash, 42u);
}

TEST(Numeric, PowersOfTwoAndOverflow)
{
    const uint32_t rows[][3] = {  // value, up, down
        {0, 0, 0}, {1, 1, 1}, {2, 2, 2}, {3, 4, 2}, {5, 8, 4}, {0x7FFFFFFF, 0x80000000, 0x40000000},
        {0x80000000, 0x80000000, 0x80000000}, {0x80000001, 0, 0x80000000}, {~0u, 0, 0x80000000}};
    for (const auto &row : rows)
        EXPECT_TRUE(round_up_power_2(row[0]) == row[1] && round_down_power_2(row[0]) == row[2])
            << std::hex << row[0];
    // Whether the exact product fits, most negative values included.
    EXPECT_EQ(std::vector({zv_util_check_multiply_overflow_i32(46341, -46341),
                           zv_util_check_multiply_overflow_i32(-1, INT32_MIN),
                           zv_util_check_multiply_overflow_i32(INT32_MIN, 1),
                           zv_util_check_multiply_overflow_i32(65536, -32768),
                           zv_util_check_multiply_overflow_i64(INT64_MIN, -1),
                           zv_util_check_multiply_overflow_i64(-3037000499, 3037000499),
                           zv_util_check_multiply_overflow_u64(1ull << 32, 1ull << 32),
                           zv_util_check_multiply_overflow_u64(~0ull, 1)}),
              std::vector({1, 1, 0, 0, 1, 0, 1, 0}));
}

TEST(Sum, WindowAndTotal)
{
    zv_util_sum sum;
    ASSERT_EQ(zv_util_sum_init(&sum, 2), ZV_OK);
    zv_util_sum_inc(&sum, 1), zv_util_sum_inc(&sum, 2);
    EXPECT_EQ(zv_util_sum_next(&sum), 3.0);
    zv_util_sum_inc(&sum, 4), zv_util_sum_set(&sum, 5);  // replaces the 4
    EXPECT_TRUE(zv_util_sum_partial(&sum) == 5 && zv_util_sum_get(&sum) == 8);
    EXPECT_EQ(zv_util_sum_next(&sum), 8.0);  // back to the first slot, dropping its 3
    EXPECT_TRUE(zv_util_sum_get(&sum) == 5 && zv_util_sum_partial(&sum) == 0);
    EXPECT_EQ(zv_util_sum_next(&sum), 5.0);
    EXPECT_TRUE(zv_util_sum_get(&sum) == 0 && zv_util_sum_get_total(&sum) == 8);
    zv_util_sum_free(&sum);
    zv_util_sum_free(&sum);  // a freed record is accepted, and so is NULL
    zv_util_sum_free(nullptr);

    zv_util_sum record;
    std::memset(&record, 0x5A, sizeof record);
    const zv_util_sum before = record;
    zvt::expect_failures({
        {"zv_util_sum_init", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_sum_init(nullptr, 4))},
        {"zv_util_sum_init", ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_sum_init(&record, 0)), nullptr, 1,
         zvt::kUntouched, "N is zero"}});
    EXPECT_EQ(std::memcmp(&record, &before, sizeof record), 0);
    zvt::expect_failures({{"zv_util_sum_init", ZV_ERR_NO_MEMORY, ZVT_CALL(zv_util_sum_init(&record, 4)),
                           "alloc", 1, zvt::kUntouched, "calloc() failed, N=4"}});
    EXPECT_TRUE(record.slots == nullptr && record.slot_count == before.slot_count);
}

// Detection agrees with the compiler's view of the processor; restrict()
// hides features until lifted.
TEST(Cpu, FeaturesFollowTheProcessorAndTheMask)
{
    const uint32_t all = (__builtin_cpu_supports("sse2") ? uint32_t{zv::cpu::kSSE2} : 0) |
                         (__builtin_cpu_supports("ssse3") ? uint32_t{zv::cpu::kSSSE3} : 0) |
                         (__builtin_cpu_supports("avx2") ? uint32_t{zv::cpu::kAVX2} : 0);
    zvt::for_each_feature_path([&](uint32_t mask) { EXPECT_EQ(zv::cpu::features(), all & mask); });
    EXPECT_EQ(zv::cpu::features(), all);
}

}  // namespace
