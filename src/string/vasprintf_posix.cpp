// Measuring formatted text.
#include <zvutil/format.h>

#include <cstdio>

#include "internal.h"

extern "C" {

ZV_EXPORT zv_status zv_util_printf_vsize(const char *format, va_list args, uint32_t *size_out)
{
    if (format == nullptr || size_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    char scratch[1];
    int n = std::vsnprintf(scratch, 0, format, args);
    if (n < 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    *size_out = static_cast<uint32_t>(n) + 1u;
    return ZV_OK;
}

}  // extern "C"
