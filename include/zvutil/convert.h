/* libzvutil multibyte to wide conversion, in the multibyte encoding of the
 * caller's current LC_CTYPE locale. */
#ifndef ZVUTIL_CONVERT_H
#define ZVUTIL_CONVERT_H

#include <stddef.h>
#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_char_to_wchar stores in |*out| a new NUL-terminated wide string
 * (allocated with calloc(); the caller frees it) converted from the
 * NUL-terminated multibyte |text|, and in |*count_out| the number of wide
 * characters before the terminator. |ignored| has no effect.
 *   ZV_ERR_NULL_ARG   text, out or count_out is NULL; nothing is written.
 *   ZV_ERR_BAD_VALUE  |text| holds an invalid multibyte sequence.
 *   ZV_ERR_NO_MEMORY  the allocation failed.
 *   ZV_ERR_TOO_SMALL  the conversion stopped before the end of |text|.
 * After a failure |*count_out| is not meaningful, and |*out| is NULL, or
 * untouched when the text was found invalid before any allocation. */
ZV_EXPORT zv_status zv_util_char_to_wchar(const char *text, uint32_t ignored, wchar_t **out,
                                          uint32_t *count_out);

#ifdef __cplusplus
}
#endif

#endif
