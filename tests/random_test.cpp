// Seeded pseudo-random generator: sequences, batches, fills and failures.
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "support/trace.h"
#include <zvutil/random.h>

namespace {

constexpr uint64_t kSeed1[] = {0xB85497A9BA510638, 0x68E100A50B479104, 0xD00B063876877E9D};

zv_util_prng_state seeded(uint64_t seed, uint64_t extra)
{
    zv_util_prng_state state;
    std::memset(&state, 0xA5, sizeof state);  // seeding must not depend on old contents
    EXPECT_EQ(zv_util_seed_prng(&state, seed, extra), ZV_OK);
    return state;
}

std::vector<uint64_t> words(zv_util_prng_state &state, size_t count)
{
    std::vector<uint64_t> out(count);
    for (uint64_t &word : out)
        EXPECT_EQ(zv_util_prng(&state, &word), ZV_OK);
    return out;
}

bool same_state(const zv_util_prng_state &a, const zv_util_prng_state &b)
{
    return a.position == b.position && a.weyl == b.weyl &&
           std::memcmp(a.pool, b.pool, sizeof a.pool) == 0;
}

TEST(Prng, KnownSequences)
{
    using Words = std::vector<uint64_t>;
    auto state = seeded(1, 0);
    EXPECT_EQ(words(state, 3), Words(kSeed1, kSeed1 + 3));
    for (uint64_t seed : {uint64_t{0}, ~uint64_t{0}}) {
        state = seeded(seed, 0);
        EXPECT_EQ(words(state, 2), (Words{0x6B9B02117A0BE24C, 0x9A98CE2956464C05}));
    }
    state = seeded(1, 5);  // extra reaches only the first pool word
    EXPECT_EQ(words(state, 3), (Words{0xD85F17C16A4BD32D, kSeed1[1], kSeed1[2]}));

    state = seeded(1, 0);
    uint64_t mixed = 0;
    EXPECT_EQ(zv_util_mix_into_prng(&state, 7, &mixed), ZV_OK);
    EXPECT_EQ(mixed, 0xB85497AA02510643u);
    EXPECT_EQ(words(state, 1), Words{kSeed1[1]});
    EXPECT_NO_FRAMES();
}

TEST(Prng, ReseedingRestarts)
{
    auto state = seeded(99, 3);
    const auto first = words(state, 70);  // wraps the pool
    EXPECT_EQ(zv_util_seed_prng(&state, 99, 3), ZV_OK);
    EXPECT_EQ(words(state, 70), first);
}

TEST(Prng, UnpackedAndMixZeroMatchTheRecord)
{
    auto state = seeded(1, 0);
    auto copy = state;
    uint64_t word = 0;
    for (uint64_t expected : kSeed1) {
        EXPECT_EQ(zv_util_prng_unpacked(&copy.position, &copy.weyl, copy.pool, &word), ZV_OK);
        EXPECT_EQ(word, expected);
    }
    for (uint64_t expected : kSeed1) {
        EXPECT_EQ(zv_util_mix_into_prng(&state, 0, &word), ZV_OK);
        EXPECT_EQ(word, expected);
    }
    EXPECT_TRUE(same_state(state, copy));
}

TEST(PrngBatch, EqualsSingleStepsAtAnyAlignment)
{
    auto reference = seeded(7, 0);
    const auto expected = words(reference, 100);
    for (size_t offset : {0, 3}) {
        auto state = seeded(7, 0);
        std::vector<unsigned char> buffer(8 * 100 + offset);
        EXPECT_EQ(zv_util_prng_batch(&state, buffer.data() + offset, 100), ZV_OK);
        EXPECT_EQ(std::memcmp(buffer.data() + offset, expected.data(), 800), 0);
        EXPECT_TRUE(same_state(state, reference));
    }
    auto state = seeded(7, 0);
    uint64_t untouched = 5;
    EXPECT_EQ(zv_util_prng_batch(&state, &untouched, 0), ZV_OK);
    EXPECT_EQ(untouched, 5u);
    EXPECT_TRUE(same_state(state, seeded(7, 0)));
}

TEST(PrngFill, WholeWordsThenTail)
{
    auto state = seeded(1, 0);
    unsigned char three[4] = {0, 0, 0, 0xEE};
    EXPECT_EQ(zv_util_prng_fill(&state, three, 3), ZV_OK);
    EXPECT_EQ(std::vector<unsigned char>(three, three + 4),
              (std::vector<unsigned char>{0x38, 0x06, 0x51, 0xEE}));
    EXPECT_EQ(words(state, 1), std::vector<uint64_t>{kSeed1[1]});

    for (uint32_t length : {0u, 8u, 16u, 17u, 23u, 1001u}) {
        auto filled = seeded(3, 4), stepped = seeded(3, 4);
        const auto expected = words(stepped, (length + 7) / 8);
        std::vector<unsigned char> buffer(length + 1, 0xEE);
        EXPECT_EQ(zv_util_prng_fill(&filled, buffer.data() + 1, length), ZV_OK);
        EXPECT_TRUE(length == 0 || std::memcmp(buffer.data() + 1, expected.data(), length) == 0) << length;
        EXPECT_EQ(buffer[0], 0xEE);
        EXPECT_TRUE(same_state(filled, stepped)) << length;  // a tail costs a whole word
    }
    EXPECT_EQ(zv_util_prng_fill(nullptr, nullptr, 0), ZV_OK);
    EXPECT_NO_FRAMES();
}

TEST(Prng, FailuresLeaveStateAndOutputAlone)
{
    auto state = seeded(1, 0);
    const auto before = state;
    uint64_t out = 42;
    const char *unpacked = "zv_util_prng_unpacked", *batch = "zv_util_prng_batch",
               *fill = "zv_util_prng_fill";
    struct Row {
        zv_status status, expected;
        std::vector<const char *> frames;
    } rows[] = {
        {zv_util_seed_prng(nullptr, 1, 0), ZV_ERR_NULL_ARG, {"zv_util_seed_prng"}},
        {zv_util_prng(nullptr, &out), ZV_ERR_NULL_ARG, {unpacked}},
        {zv_util_prng(&state, nullptr), ZV_ERR_NULL_ARG, {unpacked}},
        {zv_util_prng_unpacked(nullptr, &state.weyl, state.pool, &out), ZV_ERR_NULL_ARG, {unpacked}},
        {zv_util_prng_unpacked(&state.position, nullptr, state.pool, &out), ZV_ERR_NULL_ARG, {unpacked}},
        {zv_util_prng_unpacked(&state.position, &state.weyl, nullptr, &out), ZV_ERR_NULL_ARG, {unpacked}},
        {zv_util_prng_batch(nullptr, &out, 1), ZV_ERR_NULL_ARG, {batch}},
        {zv_util_prng_batch(&state, nullptr, 1), ZV_ERR_NULL_ARG, {batch}},
        {zv_util_mix_into_prng(nullptr, 7, &out), ZV_ERR_BAD_VALUE, {"zv_util_mix_into_prng"}},
        {zv_util_mix_into_prng(&state, 7, nullptr), ZV_ERR_BAD_VALUE, {"zv_util_mix_into_prng"}},
        {zv_util_prng_fill(nullptr, &out, 8), ZV_ERR_NULL_ARG, {batch, fill}},
        {zv_util_prng_fill(nullptr, &out, 3), ZV_ERR_NULL_ARG, {batch, fill}},
        {zv_util_prng_fill(&state, nullptr, 19), ZV_ERR_NULL_ARG, {batch, fill}},
        {zv_util_prng_fill(&state, nullptr, 5), ZV_ERR_NULL_ARG, {fill}},
    };
    std::vector<zvt::Frame> frames = zvt::frames();
    size_t next = 0;
    for (size_t k = 0; k < std::size(rows); ++k) {
        EXPECT_EQ(rows[k].status, rows[k].expected) << k;
        for (const char *function : rows[k].frames) {
            ASSERT_LT(next, frames.size());
            EXPECT_EQ(frames[next].function, function) << k;
            EXPECT_EQ(frames[next++].status, rows[k].expected) << k;
        }
    }
    EXPECT_EQ(next, frames.size());
    EXPECT_EQ(out, 42u);
    EXPECT_TRUE(same_state(state, before));
}

}  // namespace
