// Hash, generator, running sums, overflow predicates, power-of-two rounding
// and the processor features behind the vector paths.
#include <random>

#include "support/zvt.h"

namespace {

using Words = std::vector<uint64_t>; using State = zv_util_prng_state;

// Lengths around the short forms, the block, the vector lane and the prefetch
// stride, on every path, at every alignment, ending where the buffer does.
TEST(Hash64, KnownValuesOnEveryPathAndFeatures)
{
    const std::pair<uint32_t, uint64_t> rows[] = {
        {1, 0x4EA1B5C9CD39377D},  {2, 0xD5D416E24FD047BA},    {3, 0xA9994E3BF75BB51C},
        {4, 0x4714B351008D61DE},  {7, 0xFD8D5351E3680679},    {8, 0xC0D30FAA34E547D4},
        {9, 0xD58695C1B0631FC3},  {16, 0xAC13DA68CBFAE1D0},   {31, 0x2952F3E1B542093B},
        {40, 0xF4E8773F1C385E58}, {2120, 0xEFE9A8285062F1FE}, {4099, 0xC2EF653F169937DD}};
    std::vector<unsigned char> bytes(4099);
    std::generate(bytes.begin(), bytes.end(), std::mt19937(5));
    // Detection agrees with the compiler's; restrict() hides features until lifted.
    const uint32_t all = zvt::detected_features();
    zvt::for_each_feature_path([&](uint32_t paths) {
        EXPECT_EQ(zv::cpu::features(), all & paths);
        for (const auto &[length, expected] : rows)
            for (size_t offset = 0; offset < 8; ++offset) {
                std::vector<unsigned char> buffer(offset + length);
                std::memcpy(buffer.data() + offset, bytes.data(), length);
                uint64_t hash = 0;
                EXPECT_EQ(zv_util_hash64(buffer.data() + offset, length, &hash), ZV_OK);
                EXPECT_EQ(hash, expected) << length << "@" << offset << " paths " << paths;
            }
    });
    uint64_t hash = 42;
    zvt::expect_failures({ROW(ZV_ERR_BAD_VALUE, hash64, (nullptr, 1, &hash)),
                          ROW(ZV_ERR_BAD_VALUE, hash64, ("a", 0, &hash))});
    EXPECT_EQ(std::make_tuple(hash, zv::cpu::features()), std::make_tuple(uint64_t{42}, all));
}

// A vector path the processor cannot run is tested by no other test either.
TEST(Cpu, EveryVectorPathRuns)
{
    using namespace zv::cpu;
    std::string missing;
    const std::pair<uint32_t, const char *> paths[] = {
        {kSSE2, " SSE2"}, {kSSSE3, " SSSE3"}, {kAVX2, " AVX2"}, {kAVX512VBMI, " AVX-512 VBMI"}};
    for (const auto &[feature, name] : paths)  // the i386 build has no AVX-512 paths
        if (!has(feature) && (feature != kAVX512VBMI || sizeof(void *) == 8))
            missing += name;
    if (!missing.empty())
        GTEST_SKIP() << "paths not run, the processor lacks:" << missing;
}

TEST(Prng, KnownSequencesFillsAndFailures)
{
    auto seeded = [](uint64_t seed, uint64_t extra, State state = {}) {
        return zv_util_seed_prng(&state, seed, extra) == ZV_OK ? state : State{};
    };
    // The next |count| words of single steps; 70 of them tell two states apart.
    auto words = [](State &state, size_t count = 70) {
        Words out(count);
        for (uint64_t &word : out) EXPECT_EQ(zv_util_prng(&state, &word), ZV_OK);
        return out;
    };
    State state = seeded(1, 0), zero = seeded(0, 0), ones = seeded(~0ull, 0), extra = seeded(1, 5);
    const Words first = {0xB85497A9BA510638, 0x68E100A50B479104, 0xD00B063876877E9D};
    EXPECT_EQ(words(state, 3), first);
    EXPECT_EQ(words(zero, 2), words(ones, 2)) << "seed 0 acts as all ones";
    EXPECT_EQ(words(extra, 3), (Words{0xD85F17C16A4BD32D, first[1], first[2]}));
    uint64_t mixed = 0, next = 0; state = seeded(1, 0);
    EXPECT_OK(zv_util_mix_into_prng(&state, 7, &mixed),
              zv_util_prng_unpacked(&state.position, &state.weyl, state.pool, &next));
    EXPECT_EQ(std::tie(mixed, next), std::make_tuple(0xB85497AA02510643u, first[1]));

    // Fills write the bytes of single steps and leave the same state, on every
    // path: counts around the lane and pool-round thresholds, from positions
    // that rotate the lanes' pool or wrap their short lag, unaligned, odd counts
    // ending in a 5-byte tail; then runs that stream past the caches if aligned.
    auto check = [&](uint32_t start, uint32_t count, size_t offset) {
        State filled = seeded(count, start), stepped = filled;
        words(filled, start), words(stepped, start);
        const Words steps = words(stepped, count);
        const uint32_t length = 8 * count - 3 * (count & 1);
        std::vector<unsigned char> out(8 * count + 32), expected(out.size());
        std::memcpy(expected.data() + offset, steps.data(), length);
        ASSERT_EQ(zv_util_prng_fill(&filled, out.data() + offset, length), ZV_OK);
        ASSERT_EQ(out, expected) << start << " " << count;
        ASSERT_EQ(words(filled), words(stepped)) << start << " " << count;
    };
    zvt::for_each_feature_path([&](uint32_t) {
        for (uint32_t start : {0u, 1u, 2u, 3u, 11u, 52u, 53u, 63u})
            for (uint32_t count : {1u, 31u, 32u, 33u, 63u, 64u, 65u, 66u, 127u, 128u, 130u, 1000u})
                check(start, count, count % 8);
        for (size_t offset : {8, 20})
            check(0, (8u << 20) / 8 + 78, offset);
    });

    // One NULL at a time.
    auto fill = [&](State *of, uint32_t length) { return zv_util_prng_fill(of, &next, length); };
    zvt::expect_failures({
        {"zv_util_prng_unpacked", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_prng(&state, nullptr))},
        ROW(ZV_ERR_NULL_ARG, prng_unpacked, (&state.position, nullptr, state.pool, &mixed)),
        ROW(ZV_ERR_NULL_ARG, prng_batch, (&state, nullptr, 1)),
        ROW(ZV_ERR_BAD_VALUE, mix_into_prng, (&state, 7, nullptr)),
        ROW(ZV_ERR_NULL_ARG, seed_prng, (nullptr, 1, 0)),
        {"zv_util_prng_unpacked", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_prng(nullptr, &mixed))},
        ROW(ZV_ERR_NULL_ARG, prng_fill, (&state, nullptr, 3)),
        {"zv_util_prng_batch,zv_util_prng_fill", ZV_ERR_NULL_ARG, ZVT_CALL(fill(nullptr, 8))},
        {"zv_util_prng_batch,zv_util_prng_fill", ZV_ERR_NULL_ARG, ZVT_CALL(fill(nullptr, 3))},
        {"", ZV_OK, ZVT_CALL(zv_util_prng_fill(nullptr, nullptr, 0))}});
}

TEST(PowerOfTwo, RoundsUpAndDown)
{
    for (auto [value, up, down] : std::initializer_list<std::tuple<uint32_t, uint32_t, uint32_t>>{
             {0, 0, 0}, {1, 1, 1}, {3, 4, 2}, {0x7FFFFFFF, 0x80000000, 0x40000000},
             {0x80000000, 0x80000000, 0x80000000}, {0x80000001, 0, 0x80000000}})
        EXPECT_EQ(std::make_tuple(round_up_power_2(value), round_down_power_2(value)),
                  std::make_tuple(up, down)) << value;
}

TEST(Sum, WindowAndFailures)
{
    zv_util_sum w;  // a window of two slots
    ASSERT_EQ(zv_util_sum_init(&w, 2), ZV_OK);
    EXPECT_EQ(w.current, 0u);
    zv_util_sum_inc(&w, 1), zv_util_sum_inc(&w, 2);
    const double first = zv_util_sum_next(&w);
    zv_util_sum_inc(&w, 4), zv_util_sum_set(&w, 5);  // replaces the 4
    // Then back to the first slot, dropping its 3, and on to the second.
    EXPECT_EQ((std::vector{first, zv_util_sum_partial(&w), zv_util_sum_get(&w),
                           zv_util_sum_next(&w), zv_util_sum_get(&w), zv_util_sum_partial(&w),
                           zv_util_sum_next(&w), zv_util_sum_get(&w), zv_util_sum_get_total(&w)}),
              (std::vector<double>{3, 5, 8, 8, 5, 0, 5, 0, 8}));
    zv_util_sum_free(&w), zv_util_sum_free(&w), zv_util_sum_free(nullptr);  // all accepted
    zvt::expect_failures({ROW(ZV_ERR_BAD_VALUE, sum_init, (&w, 0), .log = "N is zero"),
                          ROW(ZV_ERR_NULL_ARG, sum_init, (nullptr, 1))});
    zvt::sweep_allocations(ZVT_CALL(zv_util_sum_init(&w, 4) ?: (zv_util_sum_free(&w), 0u)),
                           {{"zv_util_sum_init", "calloc() failed, N=4"}});
}

// Whether the exact product fits: either side of each bound, the most negative values included.
TEST(Overflow, MultiplicationPredicates)
{
    auto *i32 = zv_util_check_multiply_overflow_i32;
    auto *i64 = zv_util_check_multiply_overflow_i64;
    auto u64 = zv_util_check_multiply_overflow_u64;
    EXPECT_EQ((std::vector{i32(-1, INT32_MIN), i32(-1, INT32_MAX), i32(46341, 46341),
                           i32(46340, 46341), i32(-46341, 46341), i32(INT32_MIN, 1),
                           i64(INT64_MIN, 1), i64(INT64_MIN, -1), i64(3037000500, 3037000500),
                           i64(3037000499, 3037000500), i64(-3037000500, 3037000500),
                           u64(1ull << 32, 1ull << 32), u64(1ull << 32, (1ull << 32) - 1),
                           u64(UINT64_MAX, 1), u64(UINT64_MAX, 2)}),
              (std::vector{1, 0, 1, 0, 1, 0, /* i64 */ 0, 1, 1, 0, 1, /* u64 */ 1, 0, 0, 1}));
}

}  // namespace
