// Runs a check once per processor path of the vector kernels: everything
// detected, SSSE3 and below, SSE2 only, and the plain scalar code.
#pragma once

#include <cstdint>

#include "cpu.h"

namespace zvt {

inline constexpr uint32_t kFeaturePaths[] = {
    ~0u, zv::cpu::kSSE2 | zv::cpu::kSSSE3, zv::cpu::kSSE2, 0};

template <typename Check>
void for_each_feature_path(Check check)
{
    struct Restore {
        ~Restore() { zv::cpu::restrict(~0u); }
    } restore;
    for (uint32_t mask : kFeaturePaths) {
        zv::cpu::restrict(mask);
        check(mask);
    }
}

}  // namespace zvt
