// Base64 text. Both directions work on whole 3-byte / 4-character groups
// through lookup tables, with vector kernels for long runs where the processor
// has them; only the decoder's skipping of characters outside the alphabet
// falls back to one character at a time.
#include <zvutil/base64.h>

#include <array>
#include <bit>
#include <cstring>

#include "base64_internal.h"
#include "cpu.h"
#include "internal.h"
#include "output_block.h"

namespace {

static_assert(std::endian::native == std::endian::little);

using zv::base64::kAlphabet;

// The two characters for each 12-bit half of a group.
constexpr auto kPairs = [] {
    std::array<std::array<char, 2>, 4096> pairs{};
    for (unsigned v = 0; v < pairs.size(); v++)
        pairs[v] = {kAlphabet[v >> 6], kAlphabet[v & 63]};
    return pairs;
}();

// The 6-bit value of each character; kSkip marks every character outside the
// alphabet, '=' included.
constexpr uint8_t kSkip = 0x80;
constexpr auto kValues = zv::inverse_table(kAlphabet, 64, kSkip);

// For each position in a quad, each character's bits already in place in the
// three output bytes (bytes 0..2 of the word in memory order), so a quad is the
// OR of four lookups. A character outside the alphabet sets byte 3, which a
// whole group never touches: one test per quad.
constexpr uint32_t kOutside = 0x01000000;
constexpr auto kQuadTables = [] {
    std::array<std::array<uint32_t, 256>, 4> tables{};
    for (unsigned c = 0; c < 256; c++) {
        uint32_t v = kValues[c];
        bool outside = (v & kSkip) != 0;
        uint32_t group[4] = {v << 18, v << 12, v << 6, v};
        for (unsigned k = 0; k < 4; k++) {
            uint32_t g = group[k];
            tables[k][c] = outside ? kOutside : (g >> 16 & 0xff) | (g >> 8 & 0xff) << 8 | (g & 0xff) << 16;
        }
    }
    return tables;
}();

// Longest input whose text length fits 32 bits.
constexpr uint32_t kMaxEncodable = 3221225469u;

inline void put_characters(char *out, uint32_t group)
{
    std::memcpy(out, kPairs[group >> 12].data(), 2);
    std::memcpy(out + 2, kPairs[group & 0xfff].data(), 2);
}

// The 24-bit group starting at |bytes|; reads four bytes.
inline uint32_t load_group(const uint8_t *bytes)
{
    uint32_t word;
    std::memcpy(&word, bytes, 4);
    return __builtin_bswap32(word) >> 8;
}

// Encodes the whole groups of |bytes|, |whole| a multiple of 3.
void encode_groups(const uint8_t *bytes, size_t whole, char *text)
{
    size_t i = 0;
    if (whole >= 16) {
#ifdef __x86_64__
        if (zv::cpu::has(zv::cpu::kAVX512VBMI))
            i = zv::base64::encode_avx512vbmi(bytes, whole, text);
        else if (zv::cpu::has(zv::cpu::kAVX2))
#else
        if (zv::cpu::has(zv::cpu::kAVX2))
#endif
            i = zv::base64::encode_avx2(bytes, whole, text);
        else if (zv::cpu::has(zv::cpu::kSSSE3))
            i = zv::base64::encode_ssse3(bytes, whole, text);
    }
    char *at = text + i / 3 * 4;
    for (; whole - i > 3; i += 3, at += 4)  // a fourth byte follows
        put_characters(at, load_group(bytes + i));
    if (i < whole)
        put_characters(at, uint32_t{bytes[i]} << 16 | uint32_t{bytes[i + 1]} << 8 | bytes[i + 2]);
}

inline uint32_t quad_of(const unsigned char *text)
{
    return kQuadTables[0][text[0]] | kQuadTables[1][text[1]] | kQuadTables[2][text[2]] |
           kQuadTables[3][text[3]];
}

using DecodeKernel = size_t (*)(const unsigned char *, size_t, uint8_t *, size_t);

DecodeKernel decode_kernel()
{
#ifdef __x86_64__
    if (zv::cpu::has(zv::cpu::kAVX512VBMI))
        return zv::base64::decode_avx512vbmi;
#endif
    if (zv::cpu::has(zv::cpu::kAVX2))
        return zv::base64::decode_avx2;
    if (zv::cpu::has(zv::cpu::kSSSE3))
        return zv::base64::decode_ssse3;
    return nullptr;
}

// Decodes whole quads of alphabet characters from text[*i] on, and returns
// where the output ends. Stops before the first quad holding another
// character, or at the end of the text.
uint8_t *decode_quads(const unsigned char *text, uint32_t length, uint32_t *i, uint8_t *at,
                      uint8_t *end, DecodeKernel kernel)
{
    uint32_t k = *i;
    if (kernel != nullptr && length - k >= 16) {
        auto used = static_cast<uint32_t>(kernel(text + k, length - k, at, end - at));
        k += used;
        at += used / 4 * 3;
    }
    for (; length - k >= 4; k += 4, at += 3) {
        uint32_t group = quad_of(text + k);
        if ((group & kOutside) != 0)
            break;
        if (end - at >= 4)
            std::memcpy(at, &group, 4);  // byte 3 (0) lies past the group
        else
            std::memcpy(at, &group, 3);
    }
    *i = k;
    return at;
}

}  // namespace

extern "C" {

ZV_EXPORT uint32_t zv_util_to_base64_size(uint32_t length)
{
    return (length / 3 + (length % 3 != 0 ? 1u : 0u)) * 4u;
}

ZV_EXPORT zv_status zv_util_base64_encode(const void *input, uint32_t length, char **out,
                                          uint32_t *out_length)
{
    // The coder's failures are returned without a frame or a log line.
    if (length > kMaxEncodable)
        return ZV_ERR_NO_MEMORY;
    uint32_t size = zv_util_to_base64_size(length);
    auto *text = static_cast<char *>(zv::malloc_output(size));
    if (text == nullptr) {
        *out = nullptr;
        return ZV_ERR_NO_MEMORY;
    }

    const auto *bytes = static_cast<const uint8_t *>(input);
    uint32_t rest = length % 3;
    uint32_t whole = length - rest;
    encode_groups(bytes, whole, text);
    if (rest != 0) {
        char *at = text + whole / 3 * 4;
        uint32_t second = rest == 2 ? bytes[whole + 1] : 0;
        put_characters(at, uint32_t{bytes[whole]} << 16 | second << 8);
        if (rest == 1)
            at[2] = '=';
        at[3] = '=';
    }
    *out = text;
    *out_length = size;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_base64_decode(const char *input, uint32_t length, uint8_t **out,
                                          uint32_t *out_length)
{
    // Room for a final partial group too, so unpadded text fits.
    uint32_t size = (length / 4 + (length % 4 != 0 ? 1u : 0u)) * 3u;
    auto *bytes = static_cast<uint8_t *>(zv::malloc_output(size));
    if (bytes == nullptr) {
        *out = nullptr;
        return ZV_ERR_NO_MEMORY;  // no frame, as in the encoder
    }

    const auto *text = reinterpret_cast<const unsigned char *>(input);
    DecodeKernel kernel = length >= 16 ? decode_kernel() : nullptr;
    uint8_t *at = bytes;
    uint32_t group = 0;
    unsigned held = 0;
    uint32_t i = 0;
    while (i < length) {
        if (held == 0) {
            at = decode_quads(text, length, &i, at, bytes + size, kernel);
            if (i == length)
                break;
        }
        uint32_t value = kValues[text[i++]];
        if ((value & kSkip) != 0)
            continue;
        group = group << 6 | value;
        if (++held == 4) {
            at[0] = static_cast<uint8_t>(group >> 16);
            at[1] = static_cast<uint8_t>(group >> 8);
            at[2] = static_cast<uint8_t>(group);
            at += 3;
            group = 0;
            held = 0;
        }
    }
    // A final group of 3 values carries 2 bytes, one of 2 values 1 byte; a lone
    // value is not Base64 and carries none.
    if (held == 3) {
        at[0] = static_cast<uint8_t>(group >> 10);
        at[1] = static_cast<uint8_t>(group >> 2);
        at += 2;
    } else if (held == 2) {
        at[0] = static_cast<uint8_t>(group >> 4);
        at += 1;
    }
    *out = bytes;
    *out_length = static_cast<uint32_t>(at - bytes);
    return ZV_OK;
}

}  // extern "C"
