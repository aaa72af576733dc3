// Seeded pseudo-random generator: 64-bit xorgens with a 64-word pool
// (lags 64 and 53, shifts 33, 26, 27, 29) whose output is added to a Weyl
// sequence.
#include <zvutil/random.h>

#include <cstring>

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
    uint64_t *const pool = state->pool;
    auto *dest = static_cast<unsigned char *>(out);
    for (uint32_t n = 0; n < count; ++n, dest += 8) {
        uint64_t word = step(position, weyl, pool, 0);
        std::memcpy(dest, &word, sizeof word);
    }
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
