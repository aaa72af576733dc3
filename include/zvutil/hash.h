/* libzvutil 64-bit hash and power-of-two rounding. */
#ifndef ZVUTIL_HASH_H
#define ZVUTIL_HASH_H

#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_hash64 stores in |*hash_out| an unkeyed 64-bit hash of the |length|
 * bytes at |data| (any alignment). Not a cryptographic digest; it takes no
 * seed and does not mix in the length, so leading zero bytes of a tail that
 * does not fill a whole 8-byte block leave the hash unchanged.
 *   ZV_ERR_BAD_VALUE  data or hash_out NULL (checked first), or length 0.
 * One frame on failure, |*hash_out| untouched. */
ZV_EXPORT zv_status zv_util_hash64(const void *data, uint32_t length, uint64_t *hash_out);

/* round_up_power_2 returns |value| when it is 0 or a power of two, otherwise
 * the smallest power of two above it. Above 0x80000000 no 32-bit power of two
 * exists and the result is 0. */
ZV_EXPORT uint32_t round_up_power_2(uint32_t value);

/* round_down_power_2 returns |value| when it is 0 or a power of two, otherwise
 * the largest power of two below it (0x80000000 for every value above it). */
ZV_EXPORT uint32_t round_down_power_2(uint32_t value);

#ifdef __cplusplus
}
#endif

#endif
