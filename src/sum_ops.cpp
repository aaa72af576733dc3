// Sliding-window running sums.
#include <zvutil/sum.h>

#include "double_arith.h"
#include "internal.h"

namespace {

// Sums are the same doubles on both targets: each operation rounds once.
using zv::exact_double::add;
constexpr auto sub = zv::exact_double::subtract;

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
    double &slot = sum->slots[sum->current];
    const double old = slot;
    sum->total = add(sub(sum->total, old), value);
    sum->window_sum = sub(sum->window_sum, old);
    slot = value;
    sum->window_sum = add(sum->window_sum, value);
}

ZV_EXPORT void zv_util_sum_inc(zv_util_sum *sum, double value)
{
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
