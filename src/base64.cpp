// Base64 text. Both directions work on whole 3-byte / 4-character groups
// through lookup tables; only the decoder's skipping of characters outside the
// alphabet falls back to one character at a time.
#include <zvutil/base64.h>

#include <array>
#include <cstring>

#include "internal.h"

namespace {

constexpr char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

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
constexpr auto kValues = [] {
    std::array<uint8_t, 256> values{};
    values.fill(kSkip);
    for (uint8_t v = 0; v < 64; v++)
        values[static_cast<unsigned char>(kAlphabet[v])] = v;
    return values;
}();

// Longest input whose text length fits 32 bits.
constexpr uint32_t kMaxEncodable = 3221225469u;

inline void put_characters(char *out, uint32_t group)
{
    std::memcpy(out, kPairs[group >> 12].data(), 2);
    std::memcpy(out + 2, kPairs[group & 0xfff].data(), 2);
}

inline void put_bytes(uint8_t *out, uint32_t group)
{
    out[0] = static_cast<uint8_t>(group >> 16);
    out[1] = static_cast<uint8_t>(group >> 8);
    out[2] = static_cast<uint8_t>(group);
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
    if (length > kMaxEncodable)
        return ZV_ERR_NO_MEMORY;
    uint32_t size = zv_util_to_base64_size(length);
    auto *text = static_cast<char *>(std::malloc(size));
    if (text == nullptr) {
        *out = nullptr;
        return ZV_ERR_NO_MEMORY;
    }

    const auto *bytes = static_cast<const uint8_t *>(input);
    uint32_t rest = length % 3;
    uint32_t whole = length - rest;
    char *at = text;
    for (uint32_t i = 0; i < whole; i += 3, at += 4)
        put_characters(at, uint32_t{bytes[i]} << 16 | uint32_t{bytes[i + 1]} << 8 | bytes[i + 2]);
    if (rest != 0) {
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
    auto *bytes = static_cast<uint8_t *>(std::malloc(size));
    if (bytes == nullptr) {
        *out = nullptr;
        return ZV_ERR_NO_MEMORY;
    }

    const auto *text = reinterpret_cast<const unsigned char *>(input);
    uint8_t *at = bytes;
    uint32_t group = 0;
    unsigned held = 0;
    uint32_t i = 0;
    while (i < length) {
        if (held == 0) {
            // Whole groups of four alphabet characters, one test per group.
            for (; length - i >= 4; i += 4, at += 3) {
                uint32_t a = kValues[text[i]], b = kValues[text[i + 1]];
                uint32_t c = kValues[text[i + 2]], d = kValues[text[i + 3]];
                if (((a | b | c | d) & kSkip) != 0)
                    break;
                put_bytes(at, a << 18 | b << 12 | c << 6 | d);
            }
            if (i == length)
                break;
        }
        uint32_t value = kValues[text[i++]];
        if ((value & kSkip) != 0)
            continue;
        group = group << 6 | value;
        if (++held == 4) {
            put_bytes(at, group);
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
