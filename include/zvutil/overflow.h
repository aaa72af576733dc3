/* libzvutil overflow-checked multiplication: whether the exact product of two
 * integers would leave their type, asked before multiplying. Every input (the
 * most negative values included) is well-defined. Each returns 1 when the
 * product overflows, 0 when it fits; not a status, and no frame is recorded. */
#ifndef ZVUTIL_OVERFLOW_H
#define ZVUTIL_OVERFLOW_H

#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_check_multiply_overflow_i32: does factor1 * factor2 leave
 * INT32_MIN .. INT32_MAX? */
ZV_EXPORT int32_t zv_util_check_multiply_overflow_i32(int32_t factor1, int32_t factor2);

/* zv_util_check_multiply_overflow_i64: does factor1 * factor2 leave
 * INT64_MIN .. INT64_MAX? */
ZV_EXPORT int32_t zv_util_check_multiply_overflow_i64(int64_t factor1, int64_t factor2);

/* zv_util_check_multiply_overflow_u64: does factor1 * factor2 exceed
 * UINT64_MAX? */
ZV_EXPORT int32_t zv_util_check_multiply_overflow_u64(uint64_t factor1, uint64_t factor2);

#ifdef __cplusplus
}
#endif

#endif
