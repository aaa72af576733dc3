// Unkeyed 64-bit hash and power-of-two rounding.
#include <zvutil/hash.h>

#include <bit>
#include <cstring>

#include "internal.h"
#include "mix_internal.h"

#if defined(__i386__)
#include <emmintrin.h>

#include "cpu.h"
#endif

namespace {

template <class Word>
inline Word load(const unsigned char *bytes)
{
    Word word;
    std::memcpy(&word, bytes, sizeof word);
    return word;
}

// Whole blocks are little-endian words; one unaligned load each.
inline uint64_t load_le64(const unsigned char *bytes)
{
    uint64_t word = load<uint64_t>(bytes);
    return std::endian::native == std::endian::big ? __builtin_bswap64(word) : word;
}

inline uint64_t load_be64(const unsigned char *bytes)
{
    uint64_t word = load<uint64_t>(bytes);
    return std::endian::native == std::endian::little ? __builtin_bswap64(word) : word;
}

inline uint32_t load_be32(const unsigned char *bytes)
{
    uint32_t word = load<uint32_t>(bytes);
    return std::endian::native == std::endian::little ? __builtin_bswap32(word) : word;
}

// The |count| (1 to 7) bytes at |bytes| as a big-endian number, read without
// touching a byte past them: two overlapping 4-byte loads, or for 1 to 3
// bytes the first, middle and last byte (which may coincide).
inline uint64_t load_short_be(const unsigned char *bytes, uint32_t count)
{
    if (count >= 4) {
        const uint64_t head = load_be32(bytes);
        return (head << (8 * (count - 4))) | load_be32(bytes + count - 4);
    }
    const uint32_t middle = count / 2;
    return (uint64_t{bytes[0]} << (8 * (count - 1))) |
           (uint64_t{bytes[middle]} << (8 * (count - 1 - middle))) | bytes[count - 1];
}

// The mix of the last word and the 16 closing mixes are shifts and xors
// only: one GF(2)-linear map of the state. The map of a word is thus the xor
// of the maps of its eight bytes, each taken from a 256-entry table.
constexpr int kClosingMixes = 17;

struct ClosingTables {
    uint64_t of_byte[8][256];
};

constexpr ClosingTables make_closing_tables()
{
    ClosingTables tables{};
    for (int k = 0; k < 8; ++k)
        for (uint64_t byte = 0; byte < 256; ++byte) {
            uint64_t word = byte << (8 * k);
            for (int round = 0; round < kClosingMixes; ++round)
                word = zv::shift_mix(word);
            tables.of_byte[k][byte] = word;
        }
    return tables;
}

alignas(64) constexpr ClosingTables kClosing = make_closing_tables();

inline uint64_t close_state(uint64_t state)
{
    // Bytes of two 32-bit halves take fewer instructions to pick out on both
    // targets.
    const auto low = static_cast<uint32_t>(state), high = static_cast<uint32_t>(state >> 32);
    const auto &table = kClosing.of_byte;
    return table[0][low & 255] ^ table[1][(low >> 8) & 255] ^ table[2][(low >> 16) & 255] ^
           table[3][low >> 24] ^ table[4][high & 255] ^ table[5][(high >> 8) & 255] ^
           table[6][(high >> 16) & 255] ^ table[7][high >> 24];
}

// The chain costs 9 dependent operations per block, so it reads memory too
// slowly for the hardware prefetcher to keep enough lines in flight: long
// inputs ask for the line this far ahead, once per line.
constexpr uint32_t kPrefetchBlocks = 2048 / 8;
constexpr uint32_t kLineBlocks = 64 / 8;

uint64_t absorb_plain(uint64_t state, const unsigned char *bytes, uint32_t blocks)
{
    for (; blocks >= kPrefetchBlocks + kLineBlocks; blocks -= kLineBlocks) {
        __builtin_prefetch(bytes + 8 * kPrefetchBlocks);
#pragma GCC unroll 8
        for (uint32_t k = 0; k < kLineBlocks; ++k, bytes += 8)
            state = zv::shift_mix(state + load_le64(bytes));
    }
    for (; blocks != 0; --blocks, bytes += 8)
        state = zv::shift_mix(state + load_le64(bytes));
    return state;
}

#if defined(__i386__)
// Plain i386 code spends two or three instructions on each 64-bit shift; one
// SSE2 lane does the chain at one operation per step.
ZV_TARGET("sse2") inline __m128i mix_lane(__m128i x)
{
    x = _mm_xor_si128(x, _mm_slli_epi64(x, 10));
    x = _mm_xor_si128(x, _mm_srli_epi64(x, 15));
    x = _mm_xor_si128(x, _mm_slli_epi64(x, 4));
    return _mm_xor_si128(x, _mm_srli_epi64(x, 13));
}

ZV_TARGET("sse2") inline __m128i block_lane(const unsigned char *bytes)
{
    return _mm_loadl_epi64(reinterpret_cast<const __m128i *>(bytes));
}

ZV_TARGET("sse2") uint64_t absorb_sse2(uint64_t state, const unsigned char *bytes,
                                       uint32_t blocks)
{
    __m128i lane = _mm_loadl_epi64(reinterpret_cast<const __m128i *>(&state));
    for (; blocks >= kPrefetchBlocks + kLineBlocks; blocks -= kLineBlocks) {
        __builtin_prefetch(bytes + 8 * kPrefetchBlocks);
#pragma GCC unroll 8
        for (uint32_t k = 0; k < kLineBlocks; ++k, bytes += 8)
            lane = mix_lane(_mm_add_epi64(lane, block_lane(bytes)));
    }
    for (; blocks != 0; --blocks, bytes += 8)
        lane = mix_lane(_mm_add_epi64(lane, block_lane(bytes)));
    _mm_storel_epi64(reinterpret_cast<__m128i *>(&state), lane);
    return state;
}

// Below this many blocks, moving the state into the lane and back costs more
// than it saves.
constexpr uint32_t kLaneMinBlocks = 4;
#endif

// Adds and mixes |blocks| whole blocks into |state|.
inline uint64_t absorb(uint64_t state, const unsigned char *bytes, uint32_t blocks)
{
#if defined(__i386__)
    if (blocks >= kLaneMinBlocks && zv::cpu::has(zv::cpu::kSSE2))
        return absorb_sse2(state, bytes, blocks);
#endif
    return absorb_plain(state, bytes, blocks);
}

// Stores the hash of more than 8 bytes. The chain takes every block but the
// last word: the last whole block, or the big-endian tail. Out of line and
// reached by a tail call, so that short inputs need no saved registers.
[[gnu::noinline]] zv_status hash_long(const unsigned char *bytes, uint32_t length,
                                      uint64_t *hash_out)
{
    const uint64_t state = absorb(1, bytes, (length - 1) / 8);
    const unsigned char *end = bytes + length;
    const uint32_t tail = length & 7u;
    const uint64_t last = tail == 0 ? load_le64(end - 8)
                                    : load_be64(end - 8) & ((uint64_t{1} << (8 * tail)) - 1);
    *hash_out = close_state(state + last);
    return ZV_OK;
}

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_hash64(const void *data, uint32_t length, uint64_t *hash_out)
{
    if (data == nullptr || hash_out == nullptr) [[unlikely]]
        return ZV_FAIL(ZV_ERR_BAD_VALUE);

    // A single word, the usual key, takes one test of the length (0 wraps
    // round to the other side) and no taken branch.
    const auto *bytes = static_cast<const unsigned char *>(data);
    if (length - 1 < 8) [[likely]] {
        // The last block, or a tail of 1 to 7 bytes.
        const uint64_t word = __builtin_expect(length == 8, 1) ? load_le64(bytes)
                                                               : load_short_be(bytes, length);
        *hash_out = close_state(1 + word);
        return ZV_OK;
    }
    if (length == 0)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    return hash_long(bytes, length, hash_out);
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
