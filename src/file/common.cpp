// Stream-level operations of the file family.
#include <zvutil/hex.h>

#include <algorithm>

#include "hex_pairs.h"
#include "internal.h"

// ---- Hexadecimal byte printers ----

extern "C" {

ZV_EXPORT zv_status zv_util_fprintf_bytes(FILE *stream, const void *bytes, uint32_t n)
{
    if (stream == nullptr || bytes == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    // The digits go out in chunks; errors of the stream are not examined.
    const auto *at = static_cast<const uint8_t *>(bytes);
    char chunk[512];
    while (n > 0) {
        uint32_t take = std::min<uint32_t>(n, sizeof chunk / 2);
        zv::put_hex_pairs(chunk, at, take);
        std::fwrite(chunk, 1, 2 * size_t{take}, stream);
        at += take;
        n -= take;
    }
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_printf_bytes(const void *bytes, uint32_t n)
{
    if (bytes == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    return zv_util_fprintf_bytes(stdout, bytes, n);
}

}  // extern "C"
