// Processor features for the vector fast paths, detected once. The library's
// baseline stays i686 (x86-64 on the 64-bit build); a fast path is compiled
// with a per-function target attribute and taken only when features() has its
// bit.
#pragma once

#include <cstdint>

#include "internal.h"

// Compiles one function for the named processor features, e.g. ZV_TARGET("avx2").
#define ZV_TARGET(features) __attribute__((target(features)))

namespace zv::cpu {

enum : uint32_t {
    kSSE2 = 1u << 0,
    kSSSE3 = 1u << 1,
    kAVX2 = 1u << 2,
    // AVX-512 F, BW and VBMI together; only the 64-bit build has these paths.
    kAVX512VBMI = 1u << 3,
};

// The usable features: what the processor and the kernel support, less any
// that restrict() has taken away.
ZV_INTERNAL uint32_t features();

// Tests only: keep just the features in |mask| (0 forces every scalar path);
// restrict(~0u) brings back everything detected.
ZV_INTERNAL void restrict(uint32_t mask);

inline bool has(uint32_t feature) { return (features() & feature) == feature; }

}  // namespace zv::cpu
