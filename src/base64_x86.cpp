// SSSE3 and AVX2 kernels of the Base64 coder. Each 128-bit lane codes four
// groups: the bytes of each group are spread over one 32-bit word and its
// 6-bit values cut out with multiplies; characters and values are mapped
// through nibble-indexed shuffles. The AVX2 forms are the SSSE3 ones lane by
// lane. The AVX-512 VBMI forms (64-bit build only) code sixteen groups at a
// time, with byte permutes across the whole vector for the spreading and for
// both tables, and a multishift for cutting out the values.
#include <immintrin.h>

#include <array>

#include "base64_internal.h"
#include "cpu.h"

namespace zv::base64 {
namespace {

// Encoding. Each group b0 b1 b2 of a lane's low 12 bytes becomes the word
// b1 b0 b2 b1, whose four 6-bit values the multiplies move to bytes 0..3.
constexpr int32_t kKeepFirstThird = 0x0fc0fc00, kMoveFirstThird = 0x04000040;
constexpr int32_t kKeepSecondFourth = 0x003f03f0, kMoveSecondFourth = 0x01000010;

// A value picks one of five ranges (0..25, 26..51, 52..61, 62, 63) through a
// saturating subtract and a compare; the range picks the offset to add.
#define ZV_ENCODE_OFFSETS                                                                       \
    'a' - 26, '0' - 52, '0' - 52, '0' - 52, '0' - 52, '0' - 52, '0' - 52, '0' - 52, '0' - 52, \
        '0' - 52, '0' - 52, '+' - 62, '/' - 63, 'A', 0, 0

ZV_TARGET("ssse3") inline __m128i encode_lane(__m128i in)
{
    in = _mm_shuffle_epi8(in, _mm_setr_epi8(1, 0, 2, 1, 4, 3, 5, 4, 7, 6, 8, 7, 10, 9, 11, 10));
    __m128i values = _mm_or_si128(
        _mm_mulhi_epu16(_mm_and_si128(in, _mm_set1_epi32(kKeepFirstThird)),
                        _mm_set1_epi32(kMoveFirstThird)),
        _mm_mullo_epi16(_mm_and_si128(in, _mm_set1_epi32(kKeepSecondFourth)),
                        _mm_set1_epi32(kMoveSecondFourth)));
    __m128i range = _mm_subs_epu8(values, _mm_set1_epi8(51));
    __m128i upper = _mm_cmpgt_epi8(_mm_set1_epi8(26), values);
    range = _mm_or_si128(range, _mm_and_si128(upper, _mm_set1_epi8(13)));
    return _mm_add_epi8(_mm_shuffle_epi8(_mm_setr_epi8(ZV_ENCODE_OFFSETS), range), values);
}

ZV_TARGET("avx2") inline __m256i encode_lanes(__m256i in)
{
    const __m256i spread = _mm256_setr_epi8(1, 0, 2, 1, 4, 3, 5, 4, 7, 6, 8, 7, 10, 9, 11, 10,  //
                                            1, 0, 2, 1, 4, 3, 5, 4, 7, 6, 8, 7, 10, 9, 11, 10);
    in = _mm256_shuffle_epi8(in, spread);
    __m256i values = _mm256_or_si256(
        _mm256_mulhi_epu16(_mm256_and_si256(in, _mm256_set1_epi32(kKeepFirstThird)),
                           _mm256_set1_epi32(kMoveFirstThird)),
        _mm256_mullo_epi16(_mm256_and_si256(in, _mm256_set1_epi32(kKeepSecondFourth)),
                           _mm256_set1_epi32(kMoveSecondFourth)));
    __m256i range = _mm256_subs_epu8(values, _mm256_set1_epi8(51));
    __m256i upper = _mm256_cmpgt_epi8(_mm256_set1_epi8(26), values);
    range = _mm256_or_si256(range, _mm256_and_si256(upper, _mm256_set1_epi8(13)));
    const __m256i offsets = _mm256_setr_epi8(ZV_ENCODE_OFFSETS, ZV_ENCODE_OFFSETS);
    return _mm256_add_epi8(_mm256_shuffle_epi8(offsets, range), values);
}

// Decoding. A character is in the alphabet when the bit of its high nibble
// (0..7; none for 8..15) is set in the mask of its low nibble:
//   low 0: high 3, 5, 7     low 1..9: high 3..7   low A: high 4..7
//   low B, F: high 2, 4, 6  low C..E: high 4, 6
// Its value is the character plus an offset chosen by the high nibble, and
// '/' (high nibble 2, like '+') is corrected by -3.
#define ZV_DECODE_MASKS \
    0xa8, 0xf8, 0xf8, 0xf8, 0xf8, 0xf8, 0xf8, 0xf8, 0xf8, 0xf8, 0xf0, 0x54, 0x50, 0x50, 0x50, 0x54
#define ZV_DECODE_BITS 1, 2, 4, 8, 16, 32, 64, 0x80, 0, 0, 0, 0, 0, 0, 0, 0
#define ZV_DECODE_OFFSETS 0, 0, 62 - '+', 52 - '0', -'A', -'A', 26 - 'a', 26 - 'a', 0, 0, 0, 0, 0, 0, 0, 0
// Four values per word to three bytes: v0 v1 v2 v3 -> (v0 << 6 | v1) and
// (v2 << 6 | v3) -> the 24-bit group, whose bytes are then put in order.
constexpr int32_t kPairValues = 0x01400140, kPairPairs = 0x00011000;
#define ZV_DECODE_ORDER 2, 1, 0, 6, 5, 4, 10, 9, 8, 14, 13, 12, -1, -1, -1, -1

// The lane's 12 bytes in its low bytes, or false when a character lies outside
// the alphabet.
ZV_TARGET("ssse3") inline bool decode_lane(__m128i in, __m128i *out)
{
    __m128i high = _mm_and_si128(_mm_srli_epi32(in, 4), _mm_set1_epi8(0x0f));
    __m128i low = _mm_and_si128(in, _mm_set1_epi8(0x0f));
    __m128i hits = _mm_and_si128(_mm_shuffle_epi8(_mm_setr_epi8(ZV_DECODE_MASKS), low),
                                 _mm_shuffle_epi8(_mm_setr_epi8(ZV_DECODE_BITS), high));
    if (_mm_movemask_epi8(_mm_cmpeq_epi8(hits, _mm_setzero_si128())) != 0)
        return false;
    __m128i offset = _mm_add_epi8(
        _mm_shuffle_epi8(_mm_setr_epi8(ZV_DECODE_OFFSETS), high),
        _mm_and_si128(_mm_cmpeq_epi8(in, _mm_set1_epi8('/')), _mm_set1_epi8(-3)));
    __m128i values = _mm_add_epi8(in, offset);
    __m128i groups = _mm_madd_epi16(_mm_maddubs_epi16(values, _mm_set1_epi32(kPairValues)),
                                    _mm_set1_epi32(kPairPairs));
    *out = _mm_shuffle_epi8(groups, _mm_setr_epi8(ZV_DECODE_ORDER));
    return true;
}

ZV_TARGET("avx2") inline bool decode_lanes(__m256i in, __m256i *out)
{
    __m256i high = _mm256_and_si256(_mm256_srli_epi32(in, 4), _mm256_set1_epi8(0x0f));
    __m256i low = _mm256_and_si256(in, _mm256_set1_epi8(0x0f));
    const __m256i masks = _mm256_setr_epi8(ZV_DECODE_MASKS, ZV_DECODE_MASKS);
    const __m256i bits = _mm256_setr_epi8(ZV_DECODE_BITS, ZV_DECODE_BITS);
    __m256i hits = _mm256_and_si256(_mm256_shuffle_epi8(masks, low), _mm256_shuffle_epi8(bits, high));
    if (_mm256_movemask_epi8(_mm256_cmpeq_epi8(hits, _mm256_setzero_si256())) != 0)
        return false;
    const __m256i offsets = _mm256_setr_epi8(ZV_DECODE_OFFSETS, ZV_DECODE_OFFSETS);
    __m256i offset = _mm256_add_epi8(
        _mm256_shuffle_epi8(offsets, high),
        _mm256_and_si256(_mm256_cmpeq_epi8(in, _mm256_set1_epi8('/')), _mm256_set1_epi8(-3)));
    __m256i values = _mm256_add_epi8(in, offset);
    __m256i groups = _mm256_madd_epi16(_mm256_maddubs_epi16(values, _mm256_set1_epi32(kPairValues)),
                                       _mm256_set1_epi32(kPairPairs));
    groups = _mm256_shuffle_epi8(groups, _mm256_setr_epi8(ZV_DECODE_ORDER, ZV_DECODE_ORDER));
    // Both lanes' 12 bytes side by side.
    *out = _mm256_permutevar8x32_epi32(groups, _mm256_setr_epi32(0, 1, 2, 4, 5, 6, 3, 7));
    return true;
}

#ifdef __x86_64__
#define ZV_AVX512VBMI "avx512f,avx512bw,avx512vbmi"

// Encoding: group k's bytes b0 b1 b2 (at 3k) go to word k as b1 b0 b2 b1, as
// in the lanes above; in each 64-bit half of a word pair the values of the text
// start at bits 10, 4, 22 and 16.
constexpr auto kSpread = [] {
    std::array<uint8_t, 64> spread{};
    for (uint8_t k = 0; k < 16; k++) {
        const uint8_t at = 3 * k, from[4] = {1, 0, 2, 1};
        for (int b = 0; b < 4; b++)
            spread[4 * k + b] = at + from[b];
    }
    return spread;
}();
constexpr int64_t kValueShifts = 0x3036242a1016040a;
constexpr __mmask64 kLow48 = (__mmask64{1} << 48) - 1;
// GCC 12's unmasked permute and multishift leave their merge source
// undefined and then warn about it: the full-mask forms are the same code.
constexpr __mmask64 kAll = ~__mmask64{0};

// The characters of the 16 groups in the low 48 bytes of |bytes|.
ZV_TARGET(ZV_AVX512VBMI) inline __m512i encode_block(__m512i bytes)
{
    __m512i words = _mm512_maskz_permutexvar_epi8(kAll, _mm512_loadu_si512(kSpread.data()), bytes);
    __m512i values =
        _mm512_maskz_multishift_epi64_epi8(kAll, _mm512_set1_epi64(kValueShifts), words);
    // The permute reads the low six bits of each index.
    return _mm512_maskz_permutexvar_epi8(kAll, values, _mm512_loadu_si512(kAlphabet));
}

// Decoding: the value of each character below 0x80, or 0x80 outside the
// alphabet; a character with its own top bit set is caught by the same test.
constexpr auto kDecodeValues = zv::inverse_table(kAlphabet, 64, 0x80);
// Byte j of group k's output lies at byte 2 - j of word k after the multiplies.
constexpr auto kGather = [] {
    std::array<uint8_t, 64> order{};
    for (uint8_t k = 0; k < 16; k++)
        for (uint8_t j = 0; j < 3; j++)
            order[3 * k + j] = 4 * k + 2 - j;
    return order;
}();

// The values of the 64 characters of |text|, and in |outside| a bit for each
// character outside the alphabet.
ZV_TARGET(ZV_AVX512VBMI) inline __m512i decode_values(__m512i text, __mmask64 *outside)
{
    const __m512i values = _mm512_permutex2var_epi8(_mm512_loadu_si512(kDecodeValues.data()), text,
                                                    _mm512_loadu_si512(kDecodeValues.data() + 64));
    *outside = _mm512_movepi8_mask(_mm512_or_si512(values, text));
    return values;
}

// The 16 groups' 48 bytes in the low bytes.
ZV_TARGET(ZV_AVX512VBMI) inline __m512i decode_groups(__m512i values)
{
    __m512i groups = _mm512_madd_epi16(_mm512_maddubs_epi16(values, _mm512_set1_epi32(kPairValues)),
                                       _mm512_set1_epi32(kPairPairs));
    return _mm512_maskz_permutexvar_epi8(kAll, _mm512_loadu_si512(kGather.data()), groups);
}
#endif

}  // namespace

ZV_TARGET("ssse3") size_t encode_ssse3(const uint8_t *in, size_t n, char *out)
{
    size_t i = 0;
    for (; n - i >= 16; i += 12, out += 16) {
        __m128i bytes = _mm_loadu_si128(reinterpret_cast<const __m128i *>(in + i));
        _mm_storeu_si128(reinterpret_cast<__m128i *>(out), encode_lane(bytes));
    }
    return i;
}

ZV_TARGET("avx2") size_t encode_avx2(const uint8_t *in, size_t n, char *out)
{
    size_t i = 0;
    for (; n - i >= 28; i += 24, out += 32) {  // lanes at +0 and +12, 16 bytes each
        __m256i bytes = _mm256_inserti128_si256(
            _mm256_castsi128_si256(_mm_loadu_si128(reinterpret_cast<const __m128i *>(in + i))),
            _mm_loadu_si128(reinterpret_cast<const __m128i *>(in + i + 12)), 1);
        _mm256_storeu_si256(reinterpret_cast<__m256i *>(out), encode_lanes(bytes));
    }
    return i + encode_ssse3(in + i, n - i, out);
}

ZV_TARGET("ssse3")
size_t decode_ssse3(const unsigned char *in, size_t n, uint8_t *out, size_t room)
{
    size_t i = 0;
    __m128i bytes;
    for (; n - i >= 16 && room >= 16; i += 16, out += 12, room -= 12) {
        if (!decode_lane(_mm_loadu_si128(reinterpret_cast<const __m128i *>(in + i)), &bytes))
            break;
        _mm_storeu_si128(reinterpret_cast<__m128i *>(out), bytes);
    }
    return i;
}

ZV_TARGET("avx2")
size_t decode_avx2(const unsigned char *in, size_t n, uint8_t *out, size_t room)
{
    size_t i = 0;
    __m256i bytes;
    for (; n - i >= 32 && room >= 32; i += 32, out += 24, room -= 24) {
        if (!decode_lanes(_mm256_loadu_si256(reinterpret_cast<const __m256i *>(in + i)), &bytes))
            break;
        _mm256_storeu_si256(reinterpret_cast<__m256i *>(out), bytes);
    }
    // The first half of a block that held another character may still pass.
    return i + decode_ssse3(in + i, n - i, out, room);
}

#ifdef __x86_64__
ZV_TARGET(ZV_AVX512VBMI) size_t encode_avx512vbmi(const uint8_t *in, size_t n, char *out)
{
    size_t i = 0;
    // Two blocks a turn, loaded as whole vectors: from memory, a run of masked
    // loads goes at about 2/3 of their speed here (AMD Zen 5), as if the
    // prefetcher ignored them.
    for (; n - i >= 112; i += 96, out += 128) {
        _mm512_storeu_si512(out, encode_block(_mm512_loadu_si512(in + i)));
        _mm512_storeu_si512(out + 64, encode_block(_mm512_loadu_si512(in + i + 48)));
    }
    for (; n - i >= 48; i += 48, out += 64)
        _mm512_storeu_si512(out, encode_block(_mm512_maskz_loadu_epi8(kLow48, in + i)));
    // The last whole groups, fewer than 16, under masks.
    const size_t groups = (n - i) / 3;
    if (groups != 0) {
        __m512i bytes = _mm512_maskz_loadu_epi8((__mmask64{1} << 3 * groups) - 1, in + i);
        _mm512_mask_storeu_epi8(out, (__mmask64{1} << 4 * groups) - 1, encode_block(bytes));
    }
    return i + 3 * groups;
}

ZV_TARGET(ZV_AVX512VBMI)
size_t decode_avx512vbmi(const unsigned char *in, size_t n, uint8_t *out, size_t room)
{
    size_t i = 0;
    __mmask64 outside, next;
    // Two blocks a turn, tested together; a pair that fails is taken again
    // one block at a time.
    for (; n - i >= 128 && room >= 112; i += 128, out += 96, room -= 96) {
        __m512i first = decode_values(_mm512_loadu_si512(in + i), &outside);
        __m512i second = decode_values(_mm512_loadu_si512(in + i + 64), &next);
        if ((outside | next) != 0)
            break;
        _mm512_storeu_si512(out, decode_groups(first));
        _mm512_storeu_si512(out + 48, decode_groups(second));
    }
    for (; n - i >= 64 && room >= 64; i += 64, out += 48, room -= 48) {
        __m512i values = decode_values(_mm512_loadu_si512(in + i), &outside);
        if (outside != 0)
            break;
        _mm512_storeu_si512(out, decode_groups(values));
    }
    // Then, under masks, the whole quads before the first character outside
    // the alphabet among the next 64 at most; the zeros past the text are
    // outside too.
    const __mmask64 left = n - i < 64 ? (__mmask64{1} << (n - i)) - 1 : kAll;
    __m512i values = decode_values(_mm512_maskz_loadu_epi8(left, in + i), &outside);
    size_t quads = (outside != 0 ? static_cast<size_t>(__builtin_ctzll(outside)) : 64) / 4;
    quads = 3 * quads <= room ? quads : room / 3;
    _mm512_mask_storeu_epi8(out, (__mmask64{1} << 3 * quads) - 1, decode_groups(values));
    return i + 4 * quads;
}
#endif

}  // namespace zv::base64
