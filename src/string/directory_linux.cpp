// Path components: the directory part of a path, and the canonical path.
#include <zvutil/file.h>

#include <climits>
#include <cstdlib>
#include <cstring>

#include "internal.h"

extern "C" {

ZV_EXPORT zv_status zv_util_get_directory_component(const char *path, char **dir_out)
{
    // Cut at the last slash; without one the whole path is the answer (not ".").
    const char *slash = std::strrchr(path, '/');
    size_t length = slash != nullptr ? static_cast<size_t>(slash - path) : std::strlen(path);
    *dir_out = zv::copy_text(path, length);
    if (*dir_out == nullptr)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_abs_path(const char *path, char **abs_out)
{
    *abs_out = ::realpath(path, nullptr);
    if (*abs_out == nullptr)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    return ZV_OK;
}

}  // extern "C"
