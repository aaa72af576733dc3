// The effective group.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <grp.h>
#include <string>
#include <unistd.h>

#include "support/fault.h"
#include "support/scratch.h"
#include "support/trace.h"
#include <zvutil/permissions.h>

namespace {

std::string current_group_name()
{
    struct group *found = getgrgid(getegid());
    return found != nullptr ? found->gr_name : "";
}

std::string with_reason(const char *line, int err) { return std::string(line) + ": " + std::strerror(err); }

TEST(EnsureEgid, CurrentGroupChangesNothing)
{
    std::string name = current_group_name();
    ASSERT_FALSE(name.empty());
    gid_t before = getegid();
    EXPECT_EQ(ensure_egid(name.c_str()), ZV_OK);
    EXPECT_EQ(getegid(), before);
    EXPECT_NO_FRAMES();
}

TEST(EnsureEgid, NameLengthBound)
{
    zvt::LogCapture log;
    EXPECT_EQ(ensure_egid(nullptr), ZV_ERR_NULL_ARG);
    // 33 bytes are refused before any lookup; 32 are looked up (and no such
    // group exists: a failure that leaves the group alone).
    gid_t before = getegid();
    zvt::fault_arm("getgrnam_r", ~0u, 0);
    EXPECT_EQ(ensure_egid(std::string(33, 'g').c_str()), ZV_ERR_BAD_VALUE);
    unsigned lookups_33 = zvt::fault_calls("getgrnam_r");
    EXPECT_STATUS(ZV_ERR_SYSTEM, ensure_egid(std::string(32, 'g').c_str()));
    unsigned lookups_32 = zvt::fault_calls("getgrnam_r") - lookups_33;
    zvt::fault_clear();
    EXPECT_EQ(lookups_33, 0u);
    EXPECT_EQ(lookups_32, 1u);
    EXPECT_EQ(getegid(), before);
    EXPECT_FRAMES({"ensure_egid", ZV_ERR_NULL_ARG}, {"ensure_egid", ZV_ERR_BAD_VALUE},
                  {"ensure_egid", ZV_ERR_SYSTEM});
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to query group data"}}));
}

TEST(EnsureEgid, FailureRowsLogThenRecord)
{
    std::string name = current_group_name();
    long size = sysconf(_SC_GETGR_R_SIZE_MAX);
    std::string allocation_line = "Failed to allocate " + std::to_string(size) + " byte buffer";
    struct Row {
        const char *point;
        int err;
        zv_status status;
        std::string line;
    } rows[] = {
        {"sysconf", EINVAL, ZV_ERR_SYSTEM, with_reason("Failed to query size", EINVAL)},
        {"alloc", ENOMEM, ZV_ERR_NO_MEMORY, allocation_line},
        {"getgrnam_r", ERANGE, ZV_ERR_SYSTEM, with_reason("Failed to query group data", ERANGE)},
        {"setegid", EPERM, ZV_ERR_SYSTEM, with_reason("Failed to update effective gid", EPERM)},
    };
    for (const Row &row : rows) {
        zvt::clear_trace();
        zvt::LogCapture log;
        size_t heap = zvt::heap_in_use();
        zv_status status =
            zvt::with_fault(row.point, 1, row.err, [&] { return ensure_egid(name.c_str()); });
        EXPECT_STATUS(row.status, status) << row.point;
        EXPECT_FRAMES({"ensure_egid", row.status});
        EXPECT_TRUE(zvt::LogIs(log, {{3, row.line.c_str()}}));
        EXPECT_EQ(log.lines().at(0).frames_before, 0u) << row.point;
        EXPECT_EQ(zvt::heap_in_use(), heap) << row.point;
    }
}

TEST(EnsureEgid, PrivilegedAndUnprivilegedSwitches)
{
    if (geteuid() != 0)
        GTEST_SKIP() << "needs root to switch users";
    std::string nogroup = getgrgid(zvt::kNogroup) != nullptr ? getgrgid(zvt::kNogroup)->gr_name : "";
    std::string root_group = getgrgid(0) != nullptr ? getgrgid(0)->gr_name : "";
    ASSERT_FALSE(nogroup.empty() || root_group.empty());

    // Root may take any group; only the effective one changes.
    zvt::in_child([&] {
        gid_t real = getgid();
        EXPECT_EQ(ensure_egid(nogroup.c_str()), ZV_OK);
        EXPECT_EQ(getegid(), zvt::kNogroup);
        EXPECT_EQ(getgid(), real);
    });
    // An unprivileged process may not take a group that is none of its own.
    zvt::in_child([&] {
        zvt::drop_privileges();
        zvt::LogCapture log;
        EXPECT_STATUS(ZV_ERR_SYSTEM, ensure_egid(root_group.c_str()));
        EXPECT_EQ(getegid(), zvt::kNogroup);
        EXPECT_FRAMES({"ensure_egid", ZV_ERR_SYSTEM});
        EXPECT_TRUE(zvt::LogIs(log, {{3, with_reason("Failed to update effective gid", EPERM).c_str()}}));
        EXPECT_EQ(ensure_egid(nogroup.c_str()), ZV_OK);
    });
}

}  // namespace
