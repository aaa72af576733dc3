/* libzvutil running sums: a sliding window of N slots. Values are added to
 * the current slot; advancing moves to the next slot and drops what it held.
 * The record keeps the window sum and a grand total of everything added.
 * Results are the same doubles on every target: each addition is rounded to
 * double on its own. */
#ifndef ZVUTIL_SUM_H
#define ZVUTIL_SUM_H

#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* The caller owns the record; its slots belong to it and are released with
 * zv_util_sum_free. */
typedef struct zv_util_sum {
    uint32_t slot_count;
    uint32_t current;  /* index of the current slot */
    double *slots;
    double window_sum; /* sum of the slot values */
    double total;      /* everything added, adjusted by replacements */
} zv_util_sum;

/* zv_util_sum_init gives |sum| |n| zero slots, the first one current.
 *   ZV_ERR_NULL_ARG   sum NULL.
 *   ZV_ERR_BAD_VALUE  n is 0; logs "N is zero"; the record is untouched.
 *   ZV_ERR_NO_MEMORY  the slots could not be allocated; logs "calloc()
 *                     failed, N=<n>"; sum->slots is NULL, the rest untouched.
 * One frame on each failure. The other operations check nothing: they need a
 * record initialised and not yet freed. */
ZV_EXPORT zv_status zv_util_sum_init(zv_util_sum *sum, uint32_t n);

/* zv_util_sum_free releases the slots and sets sum->slots to NULL. A NULL
 * record or one already freed is accepted. The record may be initialised
 * again afterwards. */
ZV_EXPORT void zv_util_sum_free(zv_util_sum *sum);

/* zv_util_sum_set replaces the current slot's value with |value|. */
ZV_EXPORT void zv_util_sum_set(zv_util_sum *sum, double value);

/* zv_util_sum_inc adds |value| to the current slot. */
ZV_EXPORT void zv_util_sum_inc(zv_util_sum *sum, double value);

/* zv_util_sum_partial returns the current slot's value. */
ZV_EXPORT double zv_util_sum_partial(const zv_util_sum *sum);

/* zv_util_sum_get returns the window sum. */
ZV_EXPORT double zv_util_sum_get(const zv_util_sum *sum);

/* zv_util_sum_next advances to the next slot (after the last comes the
 * first), clears it and takes its old value out of the window sum. Returns
 * the window sum as it was before advancing. The total is not reduced. */
ZV_EXPORT double zv_util_sum_next(zv_util_sum *sum);

/* zv_util_sum_get_total returns the sum of everything added since
 * initialisation, adjusted by replacements. */
ZV_EXPORT double zv_util_sum_get_total(const zv_util_sum *sum);

#ifdef __cplusplus
}
#endif

#endif
