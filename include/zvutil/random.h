/* libzvutil seeded pseudo-random generator: a 64-bit xorgens generator (a
 * 64-word lagged xorshift pool plus a Weyl sequence). The same seed and extra
 * value always give the same words; nothing outside the caller's values is
 * read. Not suitable for cryptography. */
#ifndef ZVUTIL_RANDOM_H
#define ZVUTIL_RANDOM_H

#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* The generator's whole state, owned by the caller. It holds no pointers: a
 * copy is an independent generator that continues the same sequence. Seed it
 * with zv_util_seed_prng before any other use. */
typedef struct zv_util_prng_state {
    uint32_t position; /* pool word replaced by the most recent step, 0..63 */
    uint64_t weyl;
    uint64_t pool[64];
} zv_util_prng_state;

/* zv_util_seed_prng fills |state| from |seed| (0 acts as all ones) and
 * |extra|. Seeding again restarts the sequence.
 *   ZV_ERR_NULL_ARG  state NULL (one frame). */
ZV_EXPORT zv_status zv_util_seed_prng(zv_util_prng_state *state, uint64_t seed, uint64_t extra);

/* zv_util_prng stores the next word in |*out|. It returns the status of
 * zv_util_prng_unpacked without a frame of its own: ZV_ERR_NULL_ARG when
 * state or out is NULL. */
ZV_EXPORT zv_status zv_util_prng(zv_util_prng_state *state, uint64_t *out);

/* zv_util_prng_unpacked is zv_util_prng on a state whose parts the caller
 * keeps apart: |pool| points to its 64 words.
 *   ZV_ERR_NULL_ARG  any pointer NULL (one frame). */
ZV_EXPORT zv_status zv_util_prng_unpacked(uint32_t *position, uint64_t *weyl, uint64_t *pool,
                                          uint64_t *out);

/* zv_util_prng_batch writes the next |count| words, in host byte order, to
 * the 8 * count bytes at |out| (any alignment): the same words and final
 * state as |count| calls of zv_util_prng. A count of 0 writes nothing and
 * leaves the state as it was.
 *   ZV_ERR_NULL_ARG  state or out NULL (one frame). */
ZV_EXPORT zv_status zv_util_prng_batch(zv_util_prng_state *state, void *out, uint32_t count);

/* zv_util_mix_into_prng is one step of zv_util_prng with |value| folded into
 * the pool word it writes; with value 0 it is zv_util_prng.
 *   ZV_ERR_BAD_VALUE  state or out NULL (one frame). */
ZV_EXPORT zv_status zv_util_mix_into_prng(zv_util_prng_state *state, uint64_t value,
                                          uint64_t *out);

/* zv_util_prng_fill fills |length| bytes at |buffer| with generator output:
 * the bytes of length / 8 words, then, for a tail of 1 to 7 bytes, the first
 * bytes of one more word (the rest of that word is dropped). Length 0 does
 * nothing and succeeds.
 *   ZV_ERR_NULL_ARG  state NULL, or buffer NULL with length 1 or more.
 *                    Frames: the batch's, then this one's; a NULL buffer with
 *                    length 1 to 7 records this one's only.
 * A failure changes neither the state nor the buffer. */
ZV_EXPORT zv_status zv_util_prng_fill(zv_util_prng_state *state, void *buffer, uint32_t length);

#ifdef __cplusplus
}
#endif

#endif
