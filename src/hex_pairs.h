// The lower-case digit pair of every byte value, shared by the hexadecimal
// text builders and the stream printers.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

#include "internal.h"

namespace zv {

inline constexpr auto kHexPairs = [] {
    constexpr char digits[] = "0123456789abcdef";
    std::array<std::array<char, 2>, 256> pairs{};
    for (unsigned v = 0; v < pairs.size(); v++)
        pairs[v] = {digits[v >> 4], digits[v & 15]};
    return pairs;
}();

// Writes the 2 * n digits of |n| bytes at |out| (no terminator): through
// shuffles of the digit table, 32 bytes at a time where the processor has
// AVX2 and 16 where it has SSSE3, through kHexPairs otherwise.
ZV_INTERNAL void put_hex_pairs(char *out, const uint8_t *bytes, size_t n);

}  // namespace zv
