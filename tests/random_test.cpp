// Seeded pseudo-random generator: known sequences, fills on every path, failures.
#include <cstring>
#include <vector>

#include "support/feature_paths.h"
#include "support/scratch.h"
#include <zvutil/random.h>

namespace {

using Words = std::vector<uint64_t>;
using State = zv_util_prng_state;
const Words kSeed1 = {0xB85497A9BA510638, 0x68E100A50B479104, 0xD00B063876877E9D};

// Seeds a record full of junk, then draws |skip| words.
State seeded(uint64_t seed, uint64_t extra, size_t skip = 0)
{
    State state;
    std::memset(&state, 0xA5, sizeof state);
    EXPECT_EQ(zv_util_seed_prng(&state, seed, extra), ZV_OK);
    for (uint64_t word; skip-- > 0;)
        zv_util_prng(&state, &word);
    return state;
}

Words words(State &state, size_t count)
{
    Words out(count);
    for (uint64_t &word : out)
        EXPECT_EQ(zv_util_prng(&state, &word), ZV_OK);
    return out;
}

bool same(const State &a, const State &b)
{
    return a.position == b.position && a.weyl == b.weyl && !std::memcmp(a.pool, b.pool, sizeof a.pool);
}

TEST(Prng, KnownSequences)
{
    State state = seeded(1, 0), zero = seeded(0, 0), ones = seeded(~0ull, 0), extra = seeded(1, 5);
    EXPECT_EQ(words(state, 3), kSeed1);
    EXPECT_EQ(words(zero, 2), words(ones, 2)) << "seed 0 acts as all ones";
    EXPECT_EQ(words(extra, 3), (Words{0xD85F17C16A4BD32D, kSeed1[1], kSeed1[2]}));
    uint64_t word = 0;
    state = seeded(1, 0);
    EXPECT_EQ(zv_util_mix_into_prng(&state, 7, &word), ZV_OK);
    EXPECT_EQ(word, 0xB85497AA02510643u);
    EXPECT_EQ(zv_util_prng_unpacked(&state.position, &state.weyl, state.pool, &word), ZV_OK);
    EXPECT_EQ(word, kSeed1[1]);
}

// Fills write the bytes of single steps and leave the same state, on every
// processor path: counts around the lane and pool-round thresholds, from pool
// positions that rotate the lanes' copy or wrap their short lag, unaligned,
// odd counts ending in a 5-byte tail; then runs long enough to stream past
// the caches, from an aligned and an unaligned start.
TEST(Prng, FillsMatchSingleStepsOnEveryPath)
{
    auto check = [](uint32_t start, uint32_t count, size_t offset) {
        State filled = seeded(count, start, start), stepped = filled;
        const Words steps = words(stepped, count);
        const uint32_t length = 8 * count - 3 * (count & 1);
        std::vector<unsigned char> out(8 * count + 16), expected(out.size());
        std::memcpy(expected.data() + offset, steps.data(), length);
        ASSERT_EQ(zv_util_prng_fill(&filled, out.data() + offset, length), ZV_OK);
        ASSERT_TRUE(out == expected && same(filled, stepped)) << start << " " << count;
    };
    zvt::for_each_feature_path([&](uint32_t) {
        for (uint32_t start : {0u, 1u, 2u, 3u, 11u, 52u, 53u, 63u})
            for (uint32_t count : {1u, 31u, 32u, 33u, 63u, 64u, 65u, 66u, 127u, 128u, 130u, 1000u})
                check(start, count, count % 8);
        for (size_t offset : {8, 20})
            check(0, (8u << 20) / 8 + 78, offset);
    });
}

TEST(Prng, FailuresLeaveStateAndOutputAlone)
{
    State state = seeded(1, 0);
    const State before = state;
    uint64_t out = 42;
    const char *unpacked = "zv_util_prng_unpacked", *batch = "zv_util_prng_batch",
               *fill = "zv_util_prng_batch,zv_util_prng_fill", *mix = "zv_util_mix_into_prng";
    const zv_status null = ZV_ERR_NULL_ARG;
    zvt::expect_failures({
        {"zv_util_seed_prng", null, ZVT_CALL(zv_util_seed_prng(nullptr, 1, 0))},
        {unpacked, null, ZVT_CALL(zv_util_prng(nullptr, &out))},
        {unpacked, null, ZVT_CALL(zv_util_prng(&state, nullptr))},
        {unpacked, null, ZVT_CALL(zv_util_prng_unpacked(nullptr, &state.weyl, state.pool, &out))},
        {unpacked, null, ZVT_CALL(zv_util_prng_unpacked(&state.position, &state.weyl, nullptr, &out))},
        {batch, null, ZVT_CALL(zv_util_prng_batch(nullptr, &out, 1))},
        {batch, null, ZVT_CALL(zv_util_prng_batch(&state, nullptr, 1))},
        {mix, ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_mix_into_prng(nullptr, 7, &out))},
        {mix, ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_mix_into_prng(&state, 7, nullptr))},
        {fill, null, ZVT_CALL(zv_util_prng_fill(nullptr, &out, 3))},
        {fill, null, ZVT_CALL(zv_util_prng_fill(&state, nullptr, 19))},
        {"zv_util_prng_fill", null, ZVT_CALL(zv_util_prng_fill(&state, nullptr, 5))},
        {"", ZV_OK, ZVT_CALL(zv_util_prng_batch(&state, &out, 0))},  // nothing to do
        {"", ZV_OK, ZVT_CALL(zv_util_prng_fill(nullptr, nullptr, 0))},
    });
    EXPECT_EQ(out, 42u);
    EXPECT_TRUE(same(state, before));
}

}  // namespace
