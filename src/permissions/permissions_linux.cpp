// Switching the process's effective group by group name.
#include <zvutil/permissions.h>

#include <cstring>
#include <grp.h>
#include <unistd.h>

#include "internal.h"

namespace {

// Names of 33 bytes or more are refused.
constexpr size_t kNameLimit = 33;

}  // namespace

extern "C" {

ZV_EXPORT zv_status ensure_egid(const char *group_name)
{
    if (group_name == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (strnlen(group_name, kNameLimit) >= kNameLimit)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);

    long size = ::sysconf(_SC_GETGR_R_SIZE_MAX);
    if (size == -1)
        return ZV_PERROR_FAIL(errno, ZV_ERR_SYSTEM, "Failed to query size\n");
    zv::unique_malloc<char> buffer(static_cast<char *>(std::malloc(static_cast<size_t>(size))));
    if (!buffer)
        return ZV_LOG_FAIL(ZV_ERR_NO_MEMORY, "Failed to allocate %ld byte buffer\n", size);

    // One lookup; a group whose strings do not fit the buffer fails (ERANGE).
    struct group record;
    struct group *found = nullptr;
    if (::getgrnam_r(group_name, &record, buffer.get(), static_cast<size_t>(size), &found) != 0)
        return ZV_PERROR_FAIL(errno, ZV_ERR_SYSTEM, "Failed to query group data\n");
    // No such group: the record was not filled, and no errno describes it.
    if (found == nullptr)
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to query group data\n");

    if (::setegid(record.gr_gid) != 0)
        return ZV_PERROR_FAIL(errno, ZV_ERR_SYSTEM, "Failed to update effective gid\n");
    return ZV_OK;
}

}  // extern "C"
