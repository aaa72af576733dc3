// Directories: creation, existence, and scans in case-insensitive name order.
#include <zvutil/directory.h>

#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <strings.h>
#include <sys/stat.h>

#include "internal.h"

// The 64-bit entry interface: on i386 the ordinary one fails (EOVERFLOW) for
// entries whose inode numbers need more than 32 bits.
struct zv_util_dirscan_state {
    struct dirent64 **entries;
    int32_t entry_count;  // "." and ".." included
    int32_t current;      // -1 before the first advance, entry_count at the end
};

namespace {

int compare_names(const struct dirent64 **first, const struct dirent64 **second)
{
    return strcasecmp((*first)->d_name, (*second)->d_name);
}

bool is_dot_or_dot_dot(const char *name)
{
    return std::strcmp(name, ".") == 0 || std::strcmp(name, "..") == 0;
}

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_mkdir(const char *path)
{
    if (path == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (::mkdir(path, 0700) != 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_mkdir_read_only(const char *path)
{
    if (path == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (::mkdir(path, 0500) != 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    return ZV_OK;
}

ZV_EXPORT zv_util_dirscan_state *zv_util_dirscan_begin(const char *path)
{
    if (path == nullptr)
        return nullptr;
    zv::unique_malloc<zv_util_dirscan_state> scan(
        static_cast<zv_util_dirscan_state *>(std::malloc(sizeof(zv_util_dirscan_state))));
    if (!scan)
        return nullptr;
    scan->entries = nullptr;
    scan->entry_count = ::scandir64(path, &scan->entries, nullptr, compare_names);
    if (scan->entry_count == -1) {
        int saved = errno;
        scan.reset();
        errno = saved;
        return nullptr;
    }
    scan->current = -1;
    return scan.release();
}

ZV_EXPORT zv_status zv_util_dirscan(zv_util_dirscan_state *scan)
{
    if (scan == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    while (++scan->current < scan->entry_count) {
        if (!is_dot_or_dot_dot(scan->entries[scan->current]->d_name))
            return ZV_OK;
    }
    scan->current = scan->entry_count;
    return ZV_FAIL(ZV_ERR_NO_MORE);
}

ZV_EXPORT char *zv_dirscan_file_name(zv_util_dirscan_state *scan)
{
    // No current entry before the first advance or after the end.
    if (scan == nullptr || scan->current < 0 || scan->current >= scan->entry_count)
        return nullptr;
    const char *name = scan->entries[scan->current]->d_name;
    return zv::copy_text(name, std::strlen(name));
}

ZV_EXPORT void zv_util_dirscan_end(zv_util_dirscan_state *scan)
{
    if (scan == nullptr)
        return;
    zv::free_array(scan->entries, static_cast<size_t>(scan->entry_count));
    std::free(scan);
}

ZV_EXPORT zv_status zv_util_query_dir_exists(const char *path, uint32_t *exists_out)
{
    if (path == nullptr)
        return ZV_ERR_NULL_ARG;  // the one NULL answered without a frame
    DIR *dir = ::opendir(path);
    *exists_out = dir != nullptr ? 1 : 0;
    if (dir != nullptr)
        ::closedir(dir);
    return ZV_OK;
}

}  // extern "C"
