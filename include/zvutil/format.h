/* libzvutil formatted allocation: printf-style text in a new block of exactly
 * the needed size. */
#ifndef ZVUTIL_FORMAT_H
#define ZVUTIL_FORMAT_H

#include <stdarg.h>
#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_asprintf formats into a new block stored in |*out| (free it with
 * free() or zv_util_free()). Same statuses and frames as zv_util_vasprintf,
 * whose status it returns without a frame of its own. Note that |errno_out|
 * comes second here and last in zv_util_vasprintf. */
ZV_EXPORT zv_status zv_util_asprintf(char **out, int32_t *errno_out, const char *format, ...)
    ZV_PRINTF_LIKE(3, 4);

/* zv_util_vasprintf formats |args| into a new block of exactly the needed size.
 *   ZV_ERR_NULL_ARG   out or format NULL; nothing written.
 *   ZV_ERR_SYSTEM     measuring failed (frames: zv_util_printf_vsize, then this
 *                     one), or the second formatting failed (|*errno_out| gets
 *                     errno; the block is released).
 *   ZV_ERR_NO_MEMORY  the allocation failed.
 * On every failure after the argument checks |*out| is NULL. On success
 * |*errno_out| (when given) is set to 0. */
ZV_EXPORT zv_status zv_util_vasprintf(char **out, const char *format, va_list args,
                                      int32_t *errno_out) ZV_PRINTF_LIKE(2, 0);

/* zv_util_printf_vsize stores in |*size_out| the bytes the formatted text needs,
 * its NUL included. ZV_ERR_NULL_ARG for a NULL format or size_out;
 * ZV_ERR_SYSTEM when formatting fails. */
ZV_EXPORT zv_status zv_util_printf_vsize(const char *format, va_list args, uint32_t *size_out)
    ZV_PRINTF_LIKE(1, 0);

#ifdef __cplusplus
}
#endif

#endif
