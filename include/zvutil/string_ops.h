/* libzvutil splitting, joining and appending strings. Every result is a new
 * heap block that the caller owns and releases with free() or zv_util_free().
 * Each failure records one trace frame in the function named. */
#ifndef ZVUTIL_STRING_OPS_H
#define ZVUTIL_STRING_OPS_H

#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_split cuts |text| at every occurrence of the whole string
 * |separator| and stores in |*fields_out| a new array of |*count_out| new
 * field strings; the caller frees each field, then the array. Runs of
 * separators collapse and separators at either end add nothing, so fields are
 * never empty. A text with no field gives count 0 and a NULL array.
 *   ZV_ERR_NULL_ARG   an argument is NULL (logged with the four values);
 *                     nothing is written.
 *   ZV_ERR_BAD_VALUE  |separator| is empty; nothing is written.
 *   ZV_ERR_NO_MEMORY  an allocation failed (logged); |*fields_out| is NULL and
 *                     nothing else is left allocated. */
ZV_EXPORT zv_status zv_util_split(const char *text, const char *separator, char ***fields_out,
                                  uint32_t *count_out);

/* zv_util_join stores in |*out| a new string holding the |count| |strings|
 * with |separator| (which may be empty) between each two, and its size,
 * terminator included, in |*size_out|. Count 0 gives an empty string of size
 * 1 and leaves |strings| unread.
 *   ZV_ERR_NULL_ARG   strings, separator, out or size_out is NULL.
 *   ZV_ERR_OVERFLOW   the size would not fit 32 bits (a separator is counted
 *                     after the last string too while checking).
 *   ZV_ERR_NO_MEMORY  the allocation failed; |*out| is NULL. */
ZV_EXPORT zv_status zv_util_join(const char *const *strings, uint32_t count,
                                 const char *separator, char **out, uint32_t *size_out);

/* zv_util_append_string appends the |n| bytes at |text| to the string at
 * |*buffer| (NULL starts a new one) of |*length| characters. The string is
 * replaced by a new block of exactly |*length| + |n| characters and a NUL, and
 * |*length| grows by |n|. On failure the string and length are unchanged.
 *   ZV_ERR_NULL_ARG   buffer, length or text is NULL.
 *   ZV_ERR_BAD_VALUE  |n| is 0, or |*buffer| is not NULL while |*length| is 0.
 *   ZV_ERR_OVERFLOW   the new length and its terminator would not fit 32 bits.
 *   ZV_ERR_NO_MEMORY  the allocation failed. */
ZV_EXPORT zv_status zv_util_append_string(char **buffer, uint32_t *length, const char *text,
                                          uint32_t n);

#ifdef __cplusplus
}
#endif

#endif
