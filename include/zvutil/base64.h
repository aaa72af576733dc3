/* libzvutil Base64 text: the standard alphabet (A-Z, a-z, 0-9, '+', '/') with
 * '=' padding. Neither function tests its pointer arguments, records a trace
 * frame or writes a log line; the only failure is ZV_ERR_NO_MEMORY. Outputs are
 * not NUL-terminated; they are allocated with malloc() and released by the
 * caller with free() or zv_util_free(). */
#ifndef ZVUTIL_BASE64_H
#define ZVUTIL_BASE64_H

#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_to_base64_size returns 4 * ceil(length / 3), the length of the
 * padded text for |length| bytes, with no room for a terminator. It is
 * computed in 32 bits and wraps for lengths of 3221225470 and more. */
ZV_EXPORT uint32_t zv_util_to_base64_size(uint32_t length);

/* zv_util_base64_encode stores in |*out| a new block holding the padded text
 * of the |length| bytes at |input|, and its length in |*out_length|.
 *   ZV_ERR_NO_MEMORY  the allocation failed (|*out| is NULL), or |length| is
 *                     3221225470 or more, whose text would not fit 32 bits
 *                     (nothing is written). */
ZV_EXPORT zv_status zv_util_base64_encode(const void *input, uint32_t length, char **out,
                                          uint32_t *out_length);

/* zv_util_base64_decode stores in |*out| a new block holding the bytes that
 * the |length| characters at |input| (no terminator needed) encode, and their
 * number in |*out_length|. Decoding is lenient and never fails on its input:
 * every character outside the alphabet (padding, line breaks, spaces, any
 * other byte) is skipped. A final group of two or three characters yields one
 * or two bytes; a lone final character yields none. The block holds at most
 * 3 * ceil(length / 4) bytes.
 *   ZV_ERR_NO_MEMORY  the allocation failed; |*out| is NULL. */
ZV_EXPORT zv_status zv_util_base64_decode(const char *input, uint32_t length, uint8_t **out,
                                          uint32_t *out_length);

#ifdef __cplusplus
}
#endif

#endif
