// Seeded pseudo-random generator: 64-bit xorgens with a 64-word pool
// (lags 64 and 53, shifts 33, 26, 27, 29) whose output is added to a Weyl
// sequence.
#include <zvutil/random.h>

#include <cstring>
#include <immintrin.h>

#include "cpu.h"
#include "internal.h"
#include "mix_internal.h"

namespace {

constexpr uint64_t kWeylIncrement = 0x61C8864680B583EBull;
constexpr uint32_t kPoolMask = 63;
constexpr uint32_t kShortLag = 11;  // pool[i + 11] is the word 53 steps back
constexpr int kSeedRounds = 256;    // four times the pool

// The lagged recurrence: replaces pool word i, with |mix| folded into the
// word it draws from the short lag, and returns the new word.
[[gnu::always_inline]] inline uint64_t recur(uint64_t *pool, uint32_t i, uint64_t mix)
{
    uint64_t t = pool[i];
    uint64_t v = pool[(i + kShortLag) & kPoolMask] + mix;
    t ^= t << 33;
    t ^= t >> 26;
    v ^= v << 27;
    v ^= v >> 29;
    return pool[i] = t ^ v;
}

// One output step. Callers pass locals where they can, so the position and
// the Weyl counter stay in registers across a loop.
[[gnu::always_inline]] inline uint64_t step(uint32_t &position, uint64_t &weyl, uint64_t *pool,
                                            uint64_t mix)
{
    uint32_t i = (position + 1) & kPoolMask;
    uint64_t word = recur(pool, i, mix);
    weyl += kWeylIncrement;
    position = i;
    return word + (weyl ^ (weyl >> 27));
}

// |count| single steps, each word stored at |dest| in host order; returns
// the end of what was written.
[[gnu::always_inline]] inline unsigned char *steps(uint32_t &position, uint64_t &weyl,
                                                   uint64_t *pool, unsigned char *dest,
                                                   uint32_t count)
{
    for (; count != 0; --count, dest += 8) {
        uint64_t word = step(position, weyl, pool, 0);
        std::memcpy(dest, &word, sizeof word);
    }
    return dest;
}

// Step n reads only the words of steps n - 64 and n - 53, so no step of a
// run of up to 53 consecutive steps reads a word that the run writes: a
// group of N consecutive steps can run in the N lanes of one vector, each
// lane with its own Weyl counter. Groups run in order, so every read sees
// the same pool word as the single steps would.
template <int N>
struct LaneVector;
template <>
struct LaneVector<2> {
    typedef uint64_t type __attribute__((vector_size(16)));
};
template <>
struct LaneVector<4> {
    typedef uint64_t type __attribute__((vector_size(32)));
};
template <>
struct LaneVector<8> {
    typedef uint64_t type __attribute__((vector_size(64)));
};
template <int N>
using Lanes = typename LaneVector<N>::type;

// Steps i to i + N - 1 (i a multiple of N) on a pool whose run began at
// word 0, their words stored at |out|. |weyl| holds the counters of the
// previous group's lanes.
template <int N>
[[gnu::always_inline]] inline void group(uint64_t *pool, uint32_t i, Lanes<N> &weyl,
                                         unsigned char *out)
{
    Lanes<N> t, v;
    std::memcpy(&t, pool + i, sizeof t);
    const uint32_t j = (i + kShortLag) & kPoolMask;
    if (j + N <= 64)
        std::memcpy(&v, pool + j, sizeof v);
    else  // the short lag of the group at word 52 wraps
        for (int k = 0; k < N; ++k)
            v[k] = pool[(j + k) & kPoolMask];
    t ^= t << 33;
    t ^= t >> 26;
    v ^= v << 27;
    v ^= v >> 29;
    const Lanes<N> word = t ^ v;
    std::memcpy(pool + i, &word, sizeof word);
    weyl += kWeylIncrement * N;
    const Lanes<N> output = word + (weyl ^ (weyl >> 27));
    std::memcpy(out, &output, sizeof output);
}

// The first |groups| (at most 64 / N) groups of a round of the pool,
// unrolled so that every index is a constant.
template <int N>
[[gnu::always_inline]] inline void run_round(uint64_t *pool, Lanes<N> &weyl, unsigned char *out,
                                             uint32_t groups)
{
#pragma GCC unroll 32
    for (uint32_t g = 0; g < 64 / N; ++g) {
        if (g == groups)
            return;
        group<N>(pool, N * g, weyl, out + 8 * N * g);
    }
}

// Copies |bytes| (a multiple of the vector) from |source| to |dest| with
// non-temporal stores, which need |dest| aligned to the vector. GCC gets
// inline assembly, since the intrinsics would not inline into this
// target-neutral template; clang checks an operand's size against the
// template's own target, so it gets its builtin, which emits the same
// instruction once inlined.
template <int N>
[[gnu::always_inline]] inline void stream_out(unsigned char *dest, const unsigned char *source,
                                              uint32_t bytes)
{
    for (uint32_t at = 0; at < bytes; at += 8 * N) {
        Lanes<N> lanes;
        std::memcpy(&lanes, source + at, sizeof lanes);
        auto *line = reinterpret_cast<Lanes<N> *>(dest + at);
#ifdef __clang__
        __builtin_nontemporal_store(lanes, line);
#else
        if constexpr (N == 8)
            __asm__("vmovntdq %1, %0" : "=m"(*line) : "v"(lanes));
        else if constexpr (N == 4)
            __asm__("vmovntdq %1, %0" : "=m"(*line) : "x"(lanes));
        else
            __asm__("movntdq %1, %0" : "=m"(*line) : "x"(lanes));
#endif
    }
}

#ifdef __x86_64__
// Whole rounds in eight lanes with the pool held in eight registers, group g
// in register g. Group g's short lag, words 8g + 11 to 8g + 18, is registers
// g + 1 and g + 2 (mod 8) shifted by three words: those two still hold the
// previous round for g below 6, and for groups 6 and 7 the wrapped words are
// this round's, as for the single steps. Only the output touches memory.
template <bool Stream>
ZV_TARGET("avx512f") void run_rounds_avx512(uint64_t *pool, Lanes<8> &weyl, unsigned char *dest,
                                            uint32_t rounds)
{
    Lanes<8> words[8];
    std::memcpy(words, pool, sizeof words);
    for (; rounds != 0; --rounds, dest += 512) {
#pragma GCC unroll 8
        for (int g = 0; g < 8; ++g) {
            // The full mask keeps GCC 12 from warning about an undefined source.
            const auto high = (__m512i)words[(g + 2) & 7], low = (__m512i)words[(g + 1) & 7];
            Lanes<8> t = words[g], v = (Lanes<8>)_mm512_maskz_alignr_epi64(0xff, high, low, 3);
            t ^= t << 33;
            t ^= t >> 26;
            v ^= v << 27;
            v ^= v >> 29;
            words[g] = t ^ v;
            weyl += kWeylIncrement * 8;
            const Lanes<8> output = words[g] + (weyl ^ (weyl >> 27));
            if constexpr (Stream)
                _mm512_stream_si512(reinterpret_cast<__m512i *>(dest + 64 * g), (__m512i)output);
            else
                std::memcpy(dest + 64 * g, &output, sizeof output);
        }
    }
    std::memcpy(pool, words, sizeof words);
}
#endif

// Runs |groups| groups a round at a time. Streamed rounds go through a
// buffer in the cache, from which whole lines leave in one burst; eight
// lanes run their whole rounds in registers first, storing each line as made.
template <int N>
[[gnu::always_inline]] inline void run_groups(uint64_t *pool, Lanes<N> &weyl, unsigned char *dest,
                                              uint32_t groups, bool stream)
{
#ifdef __x86_64__
    if constexpr (N == 8) {
        const uint32_t rounds = groups / 8;
        if (stream)
            run_rounds_avx512<true>(pool, weyl, dest, rounds);
        else
            run_rounds_avx512<false>(pool, weyl, dest, rounds);
        dest += 512 * size_t{rounds};
        groups %= 8;
    }
#endif
    alignas(64) unsigned char bounce[8 * 64];
    while (groups != 0) {
        const uint32_t now = groups < 64 / N ? groups : 64 / N;
        run_round<N>(pool, weyl, stream ? bounce : dest, now);
        if (stream)
            stream_out<N>(dest, bounce, 8 * N * now);
        dest += 8 * N * now;
        groups -= now;
    }
}

// Copies |count| (at most 64) pool words a vector at a time.
template <int N>
[[gnu::always_inline]] inline void copy_words(uint64_t *dest, const uint64_t *source,
                                              uint32_t count)
{
    for (; count >= N; count -= N, dest += N, source += N)
        std::memcpy(dest, source, 8 * N);
    for (; count != 0; --count)
        *dest++ = *source++;
}

// Runs of at least this many words stream their output past the caches:
// non-temporal stores halve the speed of fills that the caches hold.
constexpr uint32_t kStreamWords = (8u << 20) / 8;

// |count| steps in N lanes, with single steps before them (to align the
// output for streaming) and after them (the last count % N).
template <int N>
[[gnu::always_inline]] inline void generate_lanes(uint32_t &position, uint64_t &weyl,
                                                  uint64_t *pool, unsigned char *dest,
                                                  uint32_t count)
{
    const auto address = reinterpret_cast<uintptr_t>(dest);
    const bool stream = count >= kStreamWords && address % 8 == 0;
    const uint32_t head = stream ? (-address & (8 * N - 1)) / 8 : 0;
    dest = steps(position, weyl, pool, dest, head);
    count -= head;

    // The groups need a pool whose run begins at word 0, so that a round has
    // the same indices wherever the run began: the record's own pool when
    // it does, else a copy rotated into place (and aligned).
    alignas(64) uint64_t rotated[64];
    const uint32_t first = (position + 1) & kPoolMask;
    uint64_t *const lane_pool = first == 0 ? pool : rotated;
    if (first != 0) {
        copy_words<N>(rotated, pool + first, 64 - first);
        copy_words<N>(rotated + (64 - first), pool, first);
    }
    Lanes<N> lanes;
    for (int k = 0; k < N; ++k)
        lanes[k] = weyl + kWeylIncrement * static_cast<uint64_t>(k + 1 - N);
    const uint32_t groups = count / N;
    run_groups<N>(lane_pool, lanes, dest, groups, stream);
    if (stream)
        __asm__ volatile("sfence" ::: "memory");
    if (first != 0) {
        copy_words<N>(pool + first, rotated, 64 - first);
        copy_words<N>(pool, rotated + (64 - first), first);
    }

    weyl += kWeylIncrement * N * static_cast<uint64_t>(groups);
    position = (position + N * groups) & kPoolMask;
    steps(position, weyl, pool, dest + size_t{8} * N * groups, count % N);
}

ZV_TARGET("avx2") void generate_avx2(uint32_t &position, uint64_t &weyl, uint64_t *pool,
                                     unsigned char *dest, uint32_t count)
{
    generate_lanes<4>(position, weyl, pool, dest, count);
}

#ifdef __x86_64__
ZV_TARGET("avx512f") void generate_avx512(uint32_t &position, uint64_t &weyl, uint64_t *pool,
                                          unsigned char *dest, uint32_t count)
{
    generate_lanes<8>(position, weyl, pool, dest, count);
}
#endif

ZV_TARGET("sse2") void generate_sse2(uint32_t &position, uint64_t &weyl, uint64_t *pool,
                                     unsigned char *dest, uint32_t count)
{
    generate_lanes<2>(position, weyl, pool, dest, count);
}

// Shorter runs take single steps: the lanes first copy the pool.
constexpr uint32_t kLaneMinWords = 32;

// |count| steps from the given position and counter, the words stored at
// |dest| in host order.
void generate(uint32_t &position, uint64_t &weyl, uint64_t *pool, unsigned char *dest,
              uint32_t count)
{
    if (count >= kLaneMinWords) {
#ifdef __x86_64__
        if (zv::cpu::has(zv::cpu::kAVX512VBMI))
            return generate_avx512(position, weyl, pool, dest, count);
#endif
        if (zv::cpu::has(zv::cpu::kAVX2))
            return generate_avx2(position, weyl, pool, dest, count);
        if (zv::cpu::has(zv::cpu::kSSE2))
            return generate_sse2(position, weyl, pool, dest, count);
    }
    steps(position, weyl, pool, dest, count);
}

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_seed_prng(zv_util_prng_state *state, uint64_t seed, uint64_t extra)
{
    if (state == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);

    uint64_t v = seed != 0 ? seed : ~uint64_t{0};
    for (int round = 0; round < 64; ++round)
        v = zv::shift_mix(v);
    uint64_t weyl = v;
    for (uint64_t &word : state->pool) {
        v = zv::shift_mix(v);
        weyl += kWeylIncrement;
        word = weyl + v;
    }
    state->pool[0] += extra;
    state->weyl = weyl;

    // Warm the pool up; the Weyl counter stands still meanwhile. The rounds
    // start at word 0 and end on word 63, where the first step expects them.
    for (int round = 0; round < kSeedRounds; ++round)
        recur(state->pool, static_cast<uint32_t>(round) & kPoolMask, 0);
    state->position = kPoolMask;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_prng_unpacked(uint32_t *position, uint64_t *weyl, uint64_t *pool,
                                          uint64_t *out)
{
    if (position == nullptr || weyl == nullptr || pool == nullptr || out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    *out = step(*position, *weyl, pool, 0);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_prng(zv_util_prng_state *state, uint64_t *out)
{
    // zv_util_prng_unpacked reports the failure and records its frame.
    if (state == nullptr)
        return zv_util_prng_unpacked(nullptr, nullptr, nullptr, out);
    if (out == nullptr)
        return zv_util_prng_unpacked(&state->position, &state->weyl, state->pool, out);
    *out = step(state->position, state->weyl, state->pool, 0);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_prng_batch(zv_util_prng_state *state, void *out, uint32_t count)
{
    if (state == nullptr || out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);

    uint32_t position = state->position;
    uint64_t weyl = state->weyl;
    generate(position, weyl, state->pool, static_cast<unsigned char *>(out), count);
    state->position = position;
    state->weyl = weyl;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_mix_into_prng(zv_util_prng_state *state, uint64_t value,
                                          uint64_t *out)
{
    if (state == nullptr || out == nullptr)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    *out = step(state->position, state->weyl, state->pool, value);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_prng_fill(zv_util_prng_state *state, void *buffer, uint32_t length)
{
    auto *bytes = static_cast<unsigned char *>(buffer);
    const uint32_t words = length / 8;
    if (words != 0) {
        if (zv_status status = zv_util_prng_batch(state, bytes, words); status != ZV_OK)
            return ZV_FAIL(status);
    }
    const uint32_t rest = length % 8;
    if (rest == 0)
        return ZV_OK;
    // The tail goes through a scratch word, which the batch sees instead of
    // the buffer: check the buffer here so the state is left as it was.
    if (bytes == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    uint64_t scratch;
    if (zv_status status = zv_util_prng_batch(state, &scratch, 1); status != ZV_OK)
        return ZV_FAIL(status);
    std::memcpy(bytes + 8 * static_cast<size_t>(words), &scratch, rest);
    return ZV_OK;
}

}  // extern "C"
