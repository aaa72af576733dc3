// Runs a check once per processor path of the vector kernels: everything
// detected, SSSE3 and below, SSE2 only, and the plain scalar code.
#pragma once

#include <cstdint>

#include "cpu.h"

namespace zvt {

template <typename Check>
void for_each_feature_path(Check check)
{
    for (uint32_t mask : {~0u, zv::cpu::kSSE2 | zv::cpu::kSSSE3, +zv::cpu::kSSE2, 0u}) {
        zv::cpu::restrict(mask);
        check(mask);
    }
    zv::cpu::restrict(~0u);
}

}  // namespace zvt
