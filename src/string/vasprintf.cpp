// Formatted allocation: measure, allocate exactly, format.
#include <zvutil/format.h>

#include <cstdio>

#include "internal.h"

extern "C" {

ZV_EXPORT zv_status zv_util_vasprintf(char **out, const char *format, va_list args,
                                      int32_t *errno_out)
{
    if (out == nullptr || format == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    *out = nullptr;

    // The list is consumed twice; measure a copy so the second pass starts over.
    va_list measure_args;
    va_copy(measure_args, args);
    uint32_t size = 0;
    zv_status status = zv_util_printf_vsize(format, measure_args, &size);
    va_end(measure_args);
    if (status != ZV_OK)
        return ZV_FAIL(status);

    zv::unique_malloc<char> text(static_cast<char *>(std::malloc(size)));
    if (!text)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    if (std::vsnprintf(text.get(), size, format, args) == -1)
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    zv::set_errno_out(errno_out, 0);
    *out = text.release();
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_asprintf(char **out, int32_t *errno_out, const char *format, ...)
{
    va_list args;
    va_start(args, format);
    zv_status status = zv_util_vasprintf(out, format, args, errno_out);
    va_end(args);
    return status;
}

}  // extern "C"
