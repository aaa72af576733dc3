// Timer points on CLOCK_REALTIME and the processor's cycle counter.
#include <zvutil/timeutil.h>

#include <cstdint>
#include <ctime>

#include "internal.h"
#include "time/double_arith.h"

namespace {
namespace dbl = zv::time_double;
}

extern "C" {

ZV_EXPORT uint64_t zv_util_timer_point(void)
{
    struct timespec now;
    if (clock_gettime(CLOCK_REALTIME, &now) != 0)
        return 0;
    // The integer product, modulo 2^64: exact for every 32-bit second, as an
    // extended-precision product would be, without a detour through floats.
    return static_cast<uint64_t>(static_cast<int64_t>(now.tv_sec)) * 1000000000u +
           static_cast<uint64_t>(now.tv_nsec);
}

ZV_EXPORT double zv_util_timer_elapsed_seconds(uint64_t start, uint64_t end)
{
    // Unsigned: a clock set back between the points wraps instead of going negative.
    uint64_t elapsed = end - start;
    return dbl::divide(dbl::to_double(elapsed), 1e9);
}

ZV_EXPORT uint64_t zv_util_read_cycles(void)
{
    uint32_t low;
    uint32_t high;
    asm volatile("rdtsc" : "=a"(low), "=d"(high));
    return static_cast<uint64_t>(high) << 32 | low;
}

}  // extern "C"
