// Overflow predicates for multiplication.
//
// The compiler's checked multiplication answers whether the exact product
// fits, for every input, the most negative values included, without undefined
// behaviour. It needs no division: on i386 a 64-bit division would be a call
// into libgcc_s, which the library does not link.
#include <zvutil/overflow.h>

#include "internal.h"

namespace {

template <class Int>
int32_t product_overflows(Int factor1, Int factor2)
{
    Int product;
    return __builtin_mul_overflow(factor1, factor2, &product) ? 1 : 0;
}

}  // namespace

extern "C" {

ZV_EXPORT int32_t zv_util_check_multiply_overflow_i32(int32_t factor1, int32_t factor2)
{
    return product_overflows(factor1, factor2);
}

ZV_EXPORT int32_t zv_util_check_multiply_overflow_i64(int64_t factor1, int64_t factor2)
{
    return product_overflows(factor1, factor2);
}

ZV_EXPORT int32_t zv_util_check_multiply_overflow_u64(uint64_t factor1, uint64_t factor2)
{
    return product_overflows(factor1, factor2);
}

}  // extern "C"
