// The process environment.
#include <zvutil/memory.h>
#include <zvutil/system.h>

#include "internal.h"

namespace {

// Values longer than this are refused rather than cut short.
constexpr uint32_t kMaxValueLength = 299;

}  // namespace

extern "C" {

ZV_EXPORT char *zv_util_getenv(const char *name)
{
    if (name == nullptr)
        return nullptr;
    const char *value = getenv(name);
    if (value == nullptr)
        return nullptr;
    uint32_t length = zv_util_strnlen(value, kMaxValueLength + 1);
    if (length > kMaxValueLength)
        return nullptr;
    return zv::copy_text(value, length);
}

ZV_EXPORT zv_status zv_util_setenv(const char *name, const char *value)
{
    if (name == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (setenv(name, value, 1) != 0)
        return ZV_PERROR_FAIL(errno, ZV_ERR_SYSTEM, "Failed to set environment variable");
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_unsetenv(const char *name)
{
    if (name == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (unsetenv(name) != 0)
        return ZV_PERROR_FAIL(errno, ZV_ERR_SYSTEM, "Failed to unset environment variable");
    return ZV_OK;
}

}  // extern "C"
