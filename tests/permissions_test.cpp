// The effective group.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <grp.h>
#include <string>
#include <unistd.h>

#include "support/scratch.h"
#include <zvutil/permissions.h>

namespace {

std::string group_name(gid_t gid)
{
    struct group *found = getgrgid(gid);
    return found != nullptr ? found->gr_name : "";
}

std::string with_reason(const char *line, int err)
{
    return std::string(line) + ": " + std::strerror(err);
}

TEST(EnsureEgid, FailureTable)
{
    const std::string own = group_name(getegid());
    ASSERT_FALSE(own.empty());
    const gid_t before = getegid();
    auto ensure_own = [&] { return ensure_egid(own.c_str()); };
    const std::string size = std::to_string(sysconf(_SC_GETGR_R_SIZE_MAX));
    // The group database keeps what its first lookup allocates.
    struct group record, *found;
    char buffer[1024];
    getgrnam_r("no-such-group", &record, buffer, sizeof buffer, &found);
    zvt::expect_failures({
        {"ensure_egid", ZV_ERR_NULL_ARG, ZVT_CALL(ensure_egid(nullptr))},
        // 33 bytes are refused before any lookup (an armed lookup would log).
        {"ensure_egid", ZV_ERR_BAD_VALUE, ZVT_CALL(ensure_egid(std::string(33, 'g').c_str())),
         "getgrnam_r"},
        // 32 are looked up; no such group.
        {"ensure_egid", ZV_ERR_SYSTEM, ZVT_CALL(ensure_egid(std::string(32, 'g').c_str())),
         nullptr, 1, zvt::kUntouched, "Failed to query group data"},
        {"ensure_egid", ZV_ERR_SYSTEM, ensure_own, "sysconf", 1, zvt::kUntouched,
         with_reason("Failed to query size", EIO)},
        {"ensure_egid", ZV_ERR_NO_MEMORY, ensure_own, "alloc", 1, zvt::kUntouched,
         "Failed to allocate " + size + " byte buffer"},
        {"ensure_egid", ZV_ERR_SYSTEM, ensure_own, "getgrnam_r", 1, zvt::kUntouched,
         with_reason("Failed to query group data", EIO)},
        {"ensure_egid", ZV_ERR_SYSTEM, ensure_own, "setegid", 1, zvt::kUntouched,
         with_reason("Failed to update effective gid", EIO)},
    });
    EXPECT_EQ(getegid(), before);
    EXPECT_EQ(ensure_own(), ZV_OK);  // the current group: nothing changes
    EXPECT_EQ(getegid(), before);
}

TEST(EnsureEgid, PrivilegedAndUnprivilegedCallers)
{
    const std::string nogroup = group_name(zvt::kNogroup), root = group_name(0);
    ASSERT_FALSE(nogroup.empty() || root.empty());
    if (geteuid() == 0)
        zvt::in_child(false, [&] {
            gid_t real = getgid();
            EXPECT_EQ(ensure_egid(nogroup.c_str()), ZV_OK);
            EXPECT_EQ(getegid(), zvt::kNogroup);
            EXPECT_EQ(getgid(), real) << "only the effective group changes";
        });
    zvt::in_child(true, [&] {
        zvt::expect_failures({{"ensure_egid", ZV_ERR_SYSTEM, ZVT_CALL(ensure_egid(root.c_str())),
                               nullptr, 1, zvt::kUntouched,
                               with_reason("Failed to update effective gid", EPERM)}});
        EXPECT_EQ(getegid(), zvt::kNogroup);
        EXPECT_EQ(ensure_egid(nogroup.c_str()), ZV_OK);
    });
}

}  // namespace
