// Unkeyed 64-bit hash and power-of-two rounding.
#include <zvutil/hash.h>

#include <bit>
#include <cstring>

#include "internal.h"
#include "mix_internal.h"

namespace {

// Whole blocks are little-endian words; one unaligned load each.
inline uint64_t load_le64(const unsigned char *bytes)
{
    uint64_t word;
    std::memcpy(&word, bytes, sizeof word);
    if constexpr (std::endian::native == std::endian::big)
        word = __builtin_bswap64(word);
    return word;
}

// The tail of 1 to 7 bytes reads big-endian: its last byte is the lowest.
inline uint64_t load_tail_be(const unsigned char *bytes, uint32_t count)
{
    uint64_t value = 0;
    for (uint32_t k = 0; k < count; ++k)
        value = (value << 8) | bytes[k];
    return value;
}

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_hash64(const void *data, uint32_t length, uint64_t *hash_out)
{
    if (data == nullptr || hash_out == nullptr)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    if (length == 0)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);

    const auto *bytes = static_cast<const unsigned char *>(data);
    const unsigned char *const blocks_end = bytes + (length & ~7u);
    uint64_t state = 1;
    for (; bytes != blocks_end; bytes += 8)
        state = zv::shift_mix(state + load_le64(bytes));
    if (uint32_t tail = length & 7u; tail != 0)
        state = zv::shift_mix(state + load_tail_be(bytes, tail));
    for (int round = 0; round < 16; ++round)
        state = zv::shift_mix(state);
    *hash_out = state;
    return ZV_OK;
}

ZV_EXPORT uint32_t round_up_power_2(uint32_t value)
{
    if ((value & (value - 1)) == 0)
        return value;
    // No 32-bit power of two lies above 2^31.
    return value > 0x80000000u ? 0 : std::bit_ceil(value);
}

ZV_EXPORT uint32_t round_down_power_2(uint32_t value)
{
    return std::bit_floor(value);
}

}  // extern "C"
