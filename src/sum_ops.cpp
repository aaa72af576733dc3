// Sliding-window running sums.
#include <zvutil/sum.h>

#include "internal.h"

namespace {

#if defined(__i386__) && !defined(__SSE2_MATH__)
// x87 arithmetic carries 64-bit significands and a wider exponent, so sums
// could differ from those of SSE targets twice over: an intermediate kept in a
// register is never rounded to double, and rounding first to 64 bits and then
// to 53 on the store can differ from rounding once. So every operation runs
// with the precision control at 53 bits and its result is stored as a double
// before the next one reads it: each addition is then correctly rounded, as
// on x86_64 (sums of doubles that land below the normal range are exact, and
// one beyond it still becomes infinity when stored).
class DoubleRounding {
public:
    DoubleRounding()
    {
        asm volatile("fnstcw %0" : "=m"(saved_) : : "memory");
        uint16_t control = static_cast<uint16_t>((saved_ & ~kPrecisionMask) | kPrecision53);
        asm volatile("fldcw %0" : : "m"(control) : "memory");
    }
    ~DoubleRounding() { asm volatile("fldcw %0" : : "m"(saved_) : "memory"); }
    DoubleRounding(const DoubleRounding &) = delete;
    DoubleRounding &operator=(const DoubleRounding &) = delete;

private:
    static constexpr uint16_t kPrecisionMask = 0x300;
    static constexpr uint16_t kPrecision53 = 0x200;
    uint16_t saved_;
};

inline double stored(double value)
{
    volatile double memory = value;
    return memory;
}
#else
// SSE arithmetic already rounds every operation to double.
struct DoubleRounding {
    DoubleRounding() {}
    DoubleRounding(const DoubleRounding &) = delete;
    DoubleRounding &operator=(const DoubleRounding &) = delete;
};

inline double stored(double value) { return value; }
#endif

inline double add(double a, double b) { return stored(a + b); }
inline double sub(double a, double b) { return stored(a - b); }

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_sum_init(zv_util_sum *sum, uint32_t n)
{
    if (sum == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (n == 0)
        return ZV_LOG_FAIL(ZV_ERR_BAD_VALUE, "N is zero\n");
    sum->slots = static_cast<double *>(std::calloc(n, sizeof(double)));
    if (sum->slots == nullptr)
        return ZV_LOG_FAIL(ZV_ERR_NO_MEMORY, "calloc() failed, N=%zu\n", static_cast<size_t>(n));
    sum->slot_count = n;
    sum->current = 0;
    sum->window_sum = 0.0;
    sum->total = 0.0;
    return ZV_OK;
}

ZV_EXPORT void zv_util_sum_free(zv_util_sum *sum)
{
    if (sum == nullptr || sum->slots == nullptr)
        return;
    std::free(sum->slots);
    sum->slots = nullptr;
}

ZV_EXPORT void zv_util_sum_set(zv_util_sum *sum, double value)
{
    DoubleRounding rounding;
    double &slot = sum->slots[sum->current];
    const double old = slot;
    sum->total = add(sub(sum->total, old), value);
    sum->window_sum = sub(sum->window_sum, old);
    slot = value;
    sum->window_sum = add(sum->window_sum, value);
}

ZV_EXPORT void zv_util_sum_inc(zv_util_sum *sum, double value)
{
    DoubleRounding rounding;
    double &slot = sum->slots[sum->current];
    slot = add(slot, value);
    sum->window_sum = add(sum->window_sum, value);
    sum->total = add(sum->total, value);
}

ZV_EXPORT double zv_util_sum_partial(const zv_util_sum *sum)
{
    return sum->slots[sum->current];
}

ZV_EXPORT double zv_util_sum_get(const zv_util_sum *sum)
{
    return sum->window_sum;
}

ZV_EXPORT double zv_util_sum_next(zv_util_sum *sum)
{
    DoubleRounding rounding;
    const double before = sum->window_sum;
    if (++sum->current == sum->slot_count)
        sum->current = 0;
    double &slot = sum->slots[sum->current];
    sum->window_sum = sub(sum->window_sum, slot);
    slot = 0.0;
    return before;
}

ZV_EXPORT double zv_util_sum_get_total(const zv_util_sum *sum)
{
    return sum->total;
}

}  // extern "C"
