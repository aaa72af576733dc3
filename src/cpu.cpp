#include "cpu.h"

#include <atomic>

namespace zv::cpu {
namespace {

constexpr uint32_t kUnknown = 1u << 31;

// Detected features; kUnknown until the first query. Racing first queries
// compute the same value, so plain atomic stores are enough.
constinit std::atomic<uint32_t> detected{kUnknown};
constinit std::atomic<uint32_t> allowed{~0u};

uint32_t detect()
{
    // libgcc's detection also checks that the kernel saves the AVX and
    // AVX-512 state.
    __builtin_cpu_init();
    uint32_t found = 0;
    if (__builtin_cpu_supports("sse2"))
        found |= kSSE2;
    if (__builtin_cpu_supports("ssse3"))
        found |= kSSSE3;
    if (__builtin_cpu_supports("avx2"))
        found |= kAVX2;
#ifdef __x86_64__
    if (__builtin_cpu_supports("avx512f") && __builtin_cpu_supports("avx512bw") &&
        __builtin_cpu_supports("avx512vbmi"))
        found |= kAVX512VBMI;
#endif
    return found;
}

}  // namespace

uint32_t features()
{
    uint32_t found = detected.load(std::memory_order_relaxed);
    if (found == kUnknown) {
        found = detect();
        detected.store(found, std::memory_order_relaxed);
    }
    return found & allowed.load(std::memory_order_relaxed);
}

void restrict(uint32_t mask) { allowed.store(mask, std::memory_order_relaxed); }

}  // namespace zv::cpu
