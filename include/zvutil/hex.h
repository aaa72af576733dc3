/* libzvutil hexadecimal byte text: two lower-case digits per byte, with no
 * separators, prefixes or line breaks. */
#ifndef ZVUTIL_HEX_H
#define ZVUTIL_HEX_H

#include <stdint.h>
#include <stdio.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_sprintf_bytes stores in |*out| a new NUL-terminated text of 2 * |n|
 * characters for the |n| bytes at |bytes|; the caller frees it. Pointers are
 * not tested.
 *   ZV_ERR_NO_MEMORY  the allocation failed, or |n| is 2^31 or more (logged
 *                     "Allocation failed"); |*out| is NULL. */
ZV_EXPORT zv_status zv_util_sprintf_bytes(const void *bytes, uint32_t n, char **out);

/* zv_util_sscanf_bytes stores in |*out| a new block of |length| / 2 bytes read
 * from the pairs of hexadecimal digits (either case) in the |length|
 * characters at |text|; an odd final character is ignored. The block is not
 * terminated and the caller frees it. Pointers are not tested.
 *   ZV_ERR_NO_MEMORY  the allocation failed (logged "Allocation failed").
 *   ZV_ERR_BAD_VALUE  a pair is not two hexadecimal digits.
 * On failure |*out| is NULL. */
ZV_EXPORT zv_status zv_util_sscanf_bytes(const char *text, uint32_t length, uint8_t **out);

/* zv_util_fprintf_bytes writes the 2 * |n| characters for the |n| bytes at
 * |bytes| to |stream|, without flushing it. Errors of the stream are not
 * reported.
 *   ZV_ERR_NULL_ARG   stream or bytes is NULL. */
ZV_EXPORT zv_status zv_util_fprintf_bytes(FILE *stream, const void *bytes, uint32_t n);

/* zv_util_printf_bytes is zv_util_fprintf_bytes on standard output.
 *   ZV_ERR_NULL_ARG   bytes is NULL (a frame of this function). */
ZV_EXPORT zv_status zv_util_printf_bytes(const void *bytes, uint32_t n);

#ifdef __cplusplus
}
#endif

#endif
