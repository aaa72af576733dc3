// The environment, the host name and the effective group.
#include "support/zvt.h"

namespace {

using zvt::kUntouched;

std::string take(char *text)  // a copy of |text|, which is freed; "<NULL>" for none
{
    return std::unique_ptr<char, decltype(&std::free)>(text, std::free) ? text : "<NULL>";
}

TEST(Environment, VariablesAndHostName)
{
    zvt::in_child(false, [] {
        std::string v299(299, 'v');  // the longest value that is copied
        EXPECT_OK(zv_util_setenv("ZV_299", v299.c_str()), zv_util_setenv("ZV_EMPTY", ""),
                  zv_util_setenv("ZV_300", (v299 + "w").c_str()));
        char *copy = zv_util_getenv("ZV_299");
        EXPECT_EQ(take(zv_util_getenv("ZV_EMPTY")), "");
        EXPECT_EQ(take(zv_util_getenv("ZV_300")), "<NULL>");
        EXPECT_OK(zv_util_setenv("ZV_299", "short"), zv_util_unsetenv("ZV_EMPTY"));
        EXPECT_EQ(take(copy), v299) << "the copy outlives the change";
        EXPECT_EQ(take(zv_util_getenv("ZV_299")), "short");
        EXPECT_EQ(take(zv_util_getenv("ZV_EMPTY")), "<NULL>");
        zvt::sweep_allocations(ZVT_BLOCK(zv_util_getenv("ZV_299")), {{""}});
        zvt::expect_failures({
            {"zv_util_setenv", ZV_ERR_SYSTEM, ZVT_CALL(zv_util_setenv("A=B", "")), nullptr, 1,
             kUntouched, "Failed to set environment variable: Invalid argument"},
            {"zv_util_setenv", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_setenv(nullptr, ""))},
            {"zv_util_unsetenv", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_unsetenv(nullptr))},
            {"zv_util_unsetenv", ZV_ERR_SYSTEM, ZVT_CALL(zv_util_unsetenv("A=B")), nullptr, 1,
             kUntouched, "Failed to unset environment variable: Invalid argument"}});
    });
    EXPECT_EQ(take(zv_util_get_hostname()) + "\n", zvt::get_file("/proc/sys/kernel/hostname"));
    auto name = ZVT_BLOCK(zv_util_get_hostname());
    zvt::expect_failures({{"", ZV_ERR_NO_MEMORY, name, "sysconf"},
                          {"", ZV_ERR_NO_MEMORY, name, "gethostname"}});
    zvt::sweep_allocations(name, {{""}});
}

TEST(EnsureEgid, SwitchesTheEffectiveGroupOnly)
{
    const gid_t real = getgid();
    const std::string name = getgrgid(getegid())->gr_name;
    getgrnam("no-such-group");  // the group database keeps what its first lookups allocate
    auto as = [](std::string group) { return [=] { return ensure_egid(group.c_str()); }; };
    const char *fn = "ensure_egid";
    const zv_status kSys = ZV_ERR_SYSTEM;
    zvt::expect_failures({
        {fn, ZV_ERR_NULL_ARG, ZVT_CALL(ensure_egid(nullptr))},
        {fn, ZV_ERR_BAD_VALUE, as(std::string(33, 'g')), "getgrnam_r"},  // before any lookup
        // Looked up: no such group.
        {fn, kSys, as(std::string(32, 'g')), nullptr, 1, kUntouched, "Failed to query group data"},
        {fn, kSys, as(name), "setegid", 1, kUntouched,
         "Failed to update effective gid: Input/output error"},
        {fn, kSys, as(name), "sysconf", 1, kUntouched, "Failed to query size: Input/output error"},
        {fn, kSys, as(name), "getgrnam_r", 1, kUntouched,
         "Failed to query group data: Input/output error"},
    });
    zvt::sweep_allocations(as(name), {{fn, "Failed to allocate " +
        std::to_string(sysconf(_SC_GETGR_R_SIZE_MAX)) + " byte buffer"}});
    if (geteuid() == 0)
        zvt::in_child(false, [&] {
            EXPECT_EQ(ensure_egid(getgrgid(zvt::kNogroup)->gr_name), ZV_OK);
            EXPECT_EQ(std::make_tuple(getegid(), getgid()), std::make_tuple(zvt::kNogroup, real))
                << "only the egid";
        });
}

}  // namespace
