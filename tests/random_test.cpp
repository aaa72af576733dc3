// Seeded pseudo-random generator: sequences, batches, fills and failures.
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "cpu.h"
#include "support/trace.h"
#include <zvutil/random.h>

namespace {

using Words = std::vector<uint64_t>;
const Words kSeed1 = {0xB85497A9BA510638, 0x68E100A50B479104, 0xD00B063876877E9D};

zv_util_prng_state seeded(uint64_t seed, uint64_t extra)
{
    zv_util_prng_state state;
    std::memset(&state, 0xA5, sizeof state);  // seeding ignores what the record held
    EXPECT_EQ(zv_util_seed_prng(&state, seed, extra), ZV_OK);
    return state;
}

Words words(zv_util_prng_state &state, size_t count)
{
    Words out(count);
    for (uint64_t &word : out)
        EXPECT_EQ(zv_util_prng(&state, &word), ZV_OK);
    return out;
}

bool same(const zv_util_prng_state &a, const zv_util_prng_state &b)
{
    return a.position == b.position && a.weyl == b.weyl && !std::memcmp(a.pool, b.pool, sizeof a.pool);
}

TEST(Prng, KnownSequences)
{
    auto state = seeded(1, 0);
    EXPECT_EQ(words(state, 3), kSeed1);
    EXPECT_EQ(zv_util_seed_prng(&state, 1, 0), ZV_OK);  // reseeding restarts
    EXPECT_EQ(words(state, 3), kSeed1);
    for (uint64_t seed : {uint64_t{0}, ~uint64_t{0}}) {
        state = seeded(seed, 0);
        EXPECT_EQ(words(state, 2), (Words{0x6B9B02117A0BE24C, 0x9A98CE2956464C05}));
    }
    state = seeded(1, 5);  // extra reaches only the first pool word
    EXPECT_EQ(words(state, 3), (Words{0xD85F17C16A4BD32D, kSeed1[1], kSeed1[2]}));

    state = seeded(1, 0);
    uint64_t word = 0;
    EXPECT_EQ(zv_util_mix_into_prng(&state, 7, &word), ZV_OK);
    EXPECT_EQ(word, 0xB85497AA02510643u);
    EXPECT_EQ(words(state, 1), Words{kSeed1[1]});

    state = seeded(1, 0);  // value 0 mixes nothing; the unpacked form is the same step
    auto copy = state;
    for (uint64_t expected : kSeed1) {
        EXPECT_EQ(zv_util_mix_into_prng(&state, 0, &word), ZV_OK);
        EXPECT_EQ(zv_util_prng_unpacked(&copy.position, &copy.weyl, copy.pool, &word), ZV_OK);
        EXPECT_EQ(word, expected);
    }
    EXPECT_TRUE(same(state, copy));
    EXPECT_NO_FRAMES();
}

// Batches and fills write the words of single steps at any alignment, and a
// fill's tail costs a whole word.
TEST(Prng, BatchAndFillMatchSingleSteps)
{
    auto state = seeded(1, 0);
    unsigned char three[4] = {0, 0, 0, 0xEE};
    EXPECT_EQ(zv_util_prng_fill(&state, three, 3), ZV_OK);
    EXPECT_EQ(std::vector<unsigned char>(three, three + 4), (std::vector<unsigned char>{0x38, 0x06, 0x51, 0xEE}));
    EXPECT_EQ(words(state, 1), Words{kSeed1[1]});

    for (uint32_t length : {8u, 17u, 23u, 800u, 1001u}) {
        auto filled = seeded(3, 4), batched = seeded(3, 4), stepped = seeded(3, 4);
        const Words expected = words(stepped, (length + 7) / 8);
        std::vector<unsigned char> fill(length + 1), batch(8 * expected.size() + 1);
        EXPECT_EQ(zv_util_prng_fill(&filled, fill.data() + 1, length), ZV_OK);
        EXPECT_EQ(zv_util_prng_batch(&batched, batch.data() + 1, (length + 7) / 8), ZV_OK);
        EXPECT_EQ(std::memcmp(fill.data() + 1, expected.data(), length), 0) << length;
        EXPECT_EQ(std::memcmp(batch.data() + 1, expected.data(), 8 * expected.size()), 0);
        EXPECT_TRUE(same(filled, stepped) && same(batched, stepped)) << length;
    }
    EXPECT_NO_FRAMES();
}

// The vector paths (all features, SSE2 only) against single steps: counts
// around the lane and round thresholds, from every kind of pool position
// (a rotated pool copy, wraps at the short lag), into unaligned output.
TEST(Prng, LanesMatchSingleSteps)
{
    struct Restore {
        ~Restore() { zv::cpu::restrict(~0u); }
    } restore;
    std::vector<unsigned char> out(8 * 1000 + 8);
    for (uint32_t features : {~0u, uint32_t{zv::cpu::kSSE2}}) {
        zv::cpu::restrict(features);
        for (uint32_t start : {0u, 1u, 2u, 3u, 11u, 52u, 53u, 63u})
            for (uint32_t count : {31u, 32u, 33u, 63u, 64u, 65u, 66u, 127u, 128u, 130u, 1000u}) {
                auto batched = seeded(count, features), stepped = batched;
                words(batched, start);
                words(stepped, start);
                const size_t offset = count % 8;
                ASSERT_EQ(zv_util_prng_batch(&batched, out.data() + offset, count), ZV_OK);
                const Words expected = words(stepped, count);
                ASSERT_EQ(std::memcmp(out.data() + offset, expected.data(), 8 * count), 0)
                    << "start " << start << " count " << count << " features " << features;
                ASSERT_TRUE(same(batched, stepped)) << "start " << start << " count " << count;
            }
    }
}

// Runs past the caches leave through non-temporal stores once the output is
// aligned, which takes single steps first; unaligned output cannot stream.
TEST(Prng, StreamedBatchesMatchThePlainPath)
{
    struct Restore {
        ~Restore() { zv::cpu::restrict(~0u); }
    } restore;
    const uint32_t count = (8u << 20) / 8 + 77;
    std::vector<uint64_t> fast(count + 8), plain(count + 8);
    for (uint32_t features : {~0u, uint32_t{zv::cpu::kSSE2}})
        for (size_t offset : {size_t{8}, size_t{20}}) {  // head of 3 steps; no streaming
            auto *fast_out = reinterpret_cast<unsigned char *>(fast.data()) + offset;
            auto *plain_out = reinterpret_cast<unsigned char *>(plain.data()) + offset;
            auto streamed = seeded(9, offset), stepped = streamed;
            zv::cpu::restrict(features);
            ASSERT_EQ(zv_util_prng_batch(&streamed, fast_out, count), ZV_OK);
            zv::cpu::restrict(0);
            ASSERT_EQ(zv_util_prng_batch(&stepped, plain_out, count), ZV_OK);
            ASSERT_EQ(std::memcmp(fast_out, plain_out, 8 * size_t{count}), 0) << offset;
            ASSERT_TRUE(same(streamed, stepped)) << offset;
        }
}

TEST(Prng, FailuresLeaveStateAndOutputAlone)
{
    auto state = seeded(1, 0);
    const auto before = state;
    uint64_t out = 42;
    const char *unpacked = "zv_util_prng_unpacked", *batch = "zv_util_prng_batch", *fill = "zv_util_prng_fill";
    const zv_status null = ZV_ERR_NULL_ARG;
    const struct {
        zv_status status, expected;
        std::vector<const char *> frames;
    } rows[] = {
        {zv_util_seed_prng(nullptr, 1, 0), null, {"zv_util_seed_prng"}},
        {zv_util_prng(nullptr, &out), null, {unpacked}},
        {zv_util_prng(&state, nullptr), null, {unpacked}},
        {zv_util_prng_unpacked(&state.position, &state.weyl, nullptr, &out), null, {unpacked}},
        {zv_util_prng_batch(nullptr, &out, 1), null, {batch}},
        {zv_util_prng_batch(&state, nullptr, 1), null, {batch}},
        {zv_util_mix_into_prng(nullptr, 7, &out), ZV_ERR_BAD_VALUE, {"zv_util_mix_into_prng"}},
        {zv_util_prng_fill(nullptr, &out, 3), null, {batch, fill}},
        {zv_util_prng_fill(&state, nullptr, 19), null, {batch, fill}},
        {zv_util_prng_fill(&state, nullptr, 5), null, {fill}},
        {zv_util_prng_batch(&state, &out, 0), ZV_OK, {}},  // nothing to do
        {zv_util_prng_fill(nullptr, nullptr, 0), ZV_OK, {}},
    };
    std::vector<std::pair<std::string, zv_status>> expected, recorded;
    for (const auto &row : rows) {
        EXPECT_EQ(row.status, row.expected);
        for (const char *function : row.frames)
            expected.emplace_back(function, row.expected);
    }
    for (const zvt::Frame &frame : zvt::frames())
        recorded.emplace_back(frame.function, frame.status);
    EXPECT_EQ(recorded, expected);
    EXPECT_EQ(out, 42u);
    EXPECT_TRUE(same(state, before));
}

}  // namespace
