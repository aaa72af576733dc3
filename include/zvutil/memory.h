/* libzvutil memory and bounded string primitives. None of these records a
 * trace frame; failures show in the result alone. Blocks they return come from
 * glibc's allocator and are released with free() or zv_util_free(). */
#ifndef ZVUTIL_MEMORY_H
#define ZVUTIL_MEMORY_H

#include <stdint.h>
#include <stdio.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_free releases the block that |*pointer_address| holds (NULL is
 * allowed) and sets that pointer variable to NULL. |pointer_address| is the
 * address of a pointer variable of any type, or NULL (then nothing happens). */
ZV_EXPORT void zv_util_free(void *pointer_address);

/* zv_util_getline reads one line with getline(3); note the stream comes first.
 * Returns the number of bytes read, newline included, or -1 at end of file or
 * on error. |*line| may be reallocated; the caller frees it. */
ZV_EXPORT int32_t zv_util_getline(FILE *stream, char **line, uint32_t *capacity);

/* zv_util_snprintf formats into |buffer| of |size| bytes. Returns the length
 * written (without the NUL) when the whole text and its NUL fit; otherwise -1
 * (truncation, a formatting error, size 0). A negative size returns -1 and
 * leaves the buffer untouched. */
ZV_EXPORT int32_t zv_util_snprintf(char *buffer, int32_t size, const char *format, ...)
    ZV_PRINTF_LIKE(3, 4);

/* zv_util_strnlen is strnlen(3). */
ZV_EXPORT uint32_t zv_util_strnlen(const char *string, uint32_t maximum);

/* zv_util_strndup is strndup(3): a new copy of at most |maximum| characters, or
 * NULL when the allocation fails. */
ZV_EXPORT char *zv_util_strndup(const char *string, uint32_t maximum);

/* zv_util_strncpy is strncpy(3): the destination is not NUL-terminated when
 * the source has |length| or more characters. Returns |destination|. */
ZV_EXPORT char *zv_util_strncpy(char *destination, const char *source, uint32_t length);

/* zv_util_memmem is memmem(3). */
ZV_EXPORT void *zv_util_memmem(const void *haystack, uint32_t haystack_length,
                               const void *needle, uint32_t needle_length);

/* zv_util_memdup returns a new copy of |size| bytes of |source|; NULL when
 * |source| is NULL or the allocation fails. */
ZV_EXPORT void *zv_util_memdup(const void *source, uint32_t size);

/* zv_util_memdup0 is zv_util_memdup with one NUL byte after the copy. A size of
 * 4294967295, whose terminator would not fit, returns NULL without allocating. */
ZV_EXPORT void *zv_util_memdup0(const void *source, uint32_t size);

/* zv_util_strcasecmp is strcasecmp(3). */
ZV_EXPORT int32_t zv_util_strcasecmp(const char *first, const char *second);

/* zv_util_str_replace overwrites, in place, each byte equal to |find| with
 * |replacement|, examining at most |maximum| bytes and stopping at the first
 * NUL (so a NUL |find| never matches). A NULL string is allowed. Always
 * returns ZV_OK. */
ZV_EXPORT zv_status zv_util_str_replace(char *string, uint32_t maximum, char find,
                                        char replacement);

#ifdef __cplusplus
}
#endif

#endif
