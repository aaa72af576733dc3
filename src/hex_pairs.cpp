// Bytes to digit pairs. The vector forms look up both nibbles of 16 or 32
// bytes at once in the 16-digit table and interleave the results.
#include "hex_pairs.h"

#include <cstring>
#include <immintrin.h>

#include "cpu.h"

namespace zv {
namespace {

#define ZV_HEX_DIGITS '0', '1', '2', '3', '4', '5', '6', '7', '8', '9', 'a', 'b', 'c', 'd', 'e', 'f'

ZV_TARGET("ssse3") size_t put_hex_ssse3(char *out, const uint8_t *bytes, size_t n)
{
    const __m128i digits = _mm_setr_epi8(ZV_HEX_DIGITS);
    const __m128i nibble = _mm_set1_epi8(0x0f);
    size_t i = 0;
    for (; n - i >= 16; i += 16) {
        __m128i in = _mm_loadu_si128(reinterpret_cast<const __m128i *>(bytes + i));
        __m128i high = _mm_shuffle_epi8(digits, _mm_and_si128(_mm_srli_epi16(in, 4), nibble));
        __m128i low = _mm_shuffle_epi8(digits, _mm_and_si128(in, nibble));
        auto *at = reinterpret_cast<__m128i *>(out + 2 * i);
        _mm_storeu_si128(at, _mm_unpacklo_epi8(high, low));
        _mm_storeu_si128(at + 1, _mm_unpackhi_epi8(high, low));
    }
    return i;
}

ZV_TARGET("avx2") size_t put_hex_avx2(char *out, const uint8_t *bytes, size_t n)
{
    const __m256i digits = _mm256_setr_epi8(ZV_HEX_DIGITS, ZV_HEX_DIGITS);
    const __m256i nibble = _mm256_set1_epi8(0x0f);
    size_t i = 0;
    for (; n - i >= 32; i += 32) {
        __m256i in = _mm256_loadu_si256(reinterpret_cast<const __m256i *>(bytes + i));
        __m256i high = _mm256_shuffle_epi8(digits, _mm256_and_si256(_mm256_srli_epi16(in, 4), nibble));
        __m256i low = _mm256_shuffle_epi8(digits, _mm256_and_si256(in, nibble));
        // Interleaving works within 128-bit lanes: bytes 0-7 and 16-23, then
        // 8-15 and 24-31; the permutes put the halves in order.
        __m256i first = _mm256_unpacklo_epi8(high, low), second = _mm256_unpackhi_epi8(high, low);
        auto *at = reinterpret_cast<__m256i *>(out + 2 * i);
        _mm256_storeu_si256(at, _mm256_permute2x128_si256(first, second, 0x20));
        _mm256_storeu_si256(at + 1, _mm256_permute2x128_si256(first, second, 0x31));
    }
    return i + put_hex_ssse3(out + 2 * i, bytes + i, n - i);
}

}  // namespace

void put_hex_pairs(char *out, const uint8_t *bytes, size_t n)
{
    size_t i = 0;
    if (n >= 16) {
        if (cpu::has(cpu::kAVX2))
            i = put_hex_avx2(out, bytes, n);
        else if (cpu::has(cpu::kSSSE3))
            i = put_hex_ssse3(out, bytes, n);
    }
    for (; i < n; i++)
        std::memcpy(out + 2 * i, kHexPairs[bytes[i]].data(), 2);
}

}  // namespace zv
