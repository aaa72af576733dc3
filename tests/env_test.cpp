// The environment and the host name.
#include <gtest/gtest.h>

#include <climits>
#include <cstdlib>
#include <sched.h>
#include <string>
#include <unistd.h>

#include "support/scratch.h"
#include <zvutil/system.h>

namespace {

std::string take(char *text)
{
    std::string copy = text ? text : "<NULL>";
    std::free(text);
    return copy;
}

TEST(Getenv, CopiesValuesUpTo299Characters)
{
    zvt::in_child(false, [] {
        std::string v299(299, 'v');
        setenv("ZVT_EMPTY", "", 1);
        setenv("ZVT_299", v299.c_str(), 1);
        setenv("ZVT_300", (v299 + "w").c_str(), 1);
        EXPECT_EQ(take(zv_util_getenv("ZVT_EMPTY")), "");
        EXPECT_EQ(take(zv_util_getenv("ZVT_300")), "<NULL>");
        EXPECT_EQ(take(zv_util_getenv("ZVT_UNSET")), "<NULL>");
        EXPECT_EQ(take(zv_util_getenv(nullptr)), "<NULL>");
        EXPECT_EQ(zvt::with_fault("alloc", 1, ENOMEM, [] { return zv_util_getenv("ZVT_299"); }),
                  nullptr);
        // The copy outlives later changes.
        char *copy = zv_util_getenv("ZVT_299");
        setenv("ZVT_299", "short", 1);
        EXPECT_EQ(take(copy), v299);
        EXPECT_NO_FRAMES();
    });
}

TEST(Setenv, SetReplaceUnset)
{
    zvt::in_child(false, [] {
        EXPECT_EQ(zv_util_setenv("ZVT_VAR", "first"), ZV_OK);
        EXPECT_EQ(zv_util_setenv("ZVT_VAR", "second"), ZV_OK);
        EXPECT_STREQ(getenv("ZVT_VAR"), "second");
        EXPECT_EQ(zv_util_unsetenv("ZVT_VAR"), ZV_OK);
        EXPECT_EQ(getenv("ZVT_VAR"), nullptr);
        EXPECT_EQ(zv_util_unsetenv("ZVT_VAR"), ZV_OK) << "not set is no failure";
        EXPECT_NO_FRAMES();

        zvt::expect_failures({
            {"zv_util_setenv", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_setenv(nullptr, "x"))},
            {"zv_util_unsetenv", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_unsetenv(nullptr))},
            {"zv_util_setenv", ZV_ERR_SYSTEM, ZVT_CALL(zv_util_setenv("", "x")), nullptr, 1,
             zvt::kUntouched, "Failed to set environment variable: Invalid argument"},
            {"zv_util_setenv", ZV_ERR_SYSTEM, ZVT_CALL(zv_util_setenv("A=B", "x")), nullptr, 1,
             zvt::kUntouched, "Failed to set environment variable: Invalid argument"},
            {"zv_util_unsetenv", ZV_ERR_SYSTEM, ZVT_CALL(zv_util_unsetenv("A=B")), nullptr, 1,
             zvt::kUntouched, "Failed to unset environment variable: Invalid argument"},
        });
    });
}

TEST(Hostname, MatchesTheSystem)
{
    char expected[HOST_NAME_MAX + 1] = {};
    ASSERT_EQ(gethostname(expected, sizeof expected), 0);
    EXPECT_EQ(take(zv_util_get_hostname()), expected);
    for (const char *point : {"alloc", "sysconf", "gethostname"})
        EXPECT_EQ(zvt::with_fault(point, 1, EINVAL, [] { return zv_util_get_hostname(); }), nullptr)
            << point;
    EXPECT_NO_FRAMES();
}

TEST(Hostname, LongestNameComesBackWhole)
{
    // A private host name needs a UTS namespace of its own.
    zvt::in_child(false, [] {
        if (unshare(CLONE_NEWUTS) != 0)
            return;
        std::string longest(static_cast<size_t>(sysconf(_SC_HOST_NAME_MAX)), 'h');
        ASSERT_EQ(sethostname(longest.data(), longest.size()), 0);
        EXPECT_EQ(take(zv_util_get_hostname()), longest);
    });
}

}  // namespace
