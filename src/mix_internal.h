// The 64-bit shift mix shared by the hash and the generator's seeding.
#pragma once

#include <cstdint>

namespace zv {

// Four xorshifts (left 10, right 15, left 4, right 13): a bijection on 64-bit
// words that maps 0 to 0 and every other word to a non-zero one.
[[gnu::always_inline]] constexpr uint64_t shift_mix(uint64_t x)
{
    x ^= x << 10;
    x ^= x >> 15;
    x ^= x << 4;
    x ^= x >> 13;
    return x;
}

}  // namespace zv
