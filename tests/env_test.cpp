// The environment and the host name.
#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <sched.h>
#include <string>
#include <unistd.h>

#include "support/fault.h"
#include "support/process_support.h"
#include "support/trace.h"
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
    EXPECT_IN_CHILD([] {
        std::string v299(299, 'v');
        setenv("ZVT_EMPTY", "", 1);
        setenv("ZVT_299", v299.c_str(), 1);
        setenv("ZVT_300", (v299 + "w").c_str(), 1);
        unsetenv("ZVT_UNSET");
        EXPECT_EQ(take(zv_util_getenv("ZVT_EMPTY")), "");
        EXPECT_EQ(take(zv_util_getenv("ZVT_299")), v299);
        EXPECT_EQ(take(zv_util_getenv("ZVT_300")), "<NULL>");
        EXPECT_EQ(take(zv_util_getenv("ZVT_UNSET")), "<NULL>");
        EXPECT_EQ(take(zv_util_getenv(nullptr)), "<NULL>");

        // The copy outlives later changes.
        char *copy = zv_util_getenv("ZVT_299");
        setenv("ZVT_299", "short", 1);
        EXPECT_EQ(take(copy), v299);

        EXPECT_EQ(zvt::with_fault("alloc", 1, ENOMEM, [] { return zv_util_getenv("ZVT_299"); }),
                  nullptr);
        EXPECT_NO_FRAMES();
    });
}

TEST(Setenv, SetsAndReplaces)
{
    EXPECT_IN_CHILD([] {
        EXPECT_EQ(zv_util_setenv("ZVT_VAR", "first"), ZV_OK);
        EXPECT_STREQ(getenv("ZVT_VAR"), "first");
        EXPECT_EQ(zv_util_setenv("ZVT_VAR", "second"), ZV_OK);
        EXPECT_STREQ(getenv("ZVT_VAR"), "second");
        EXPECT_EQ(zv_util_unsetenv("ZVT_VAR"), ZV_OK);
        EXPECT_EQ(getenv("ZVT_VAR"), nullptr);
        EXPECT_EQ(zv_util_unsetenv("ZVT_VAR"), ZV_OK) << "not set is no failure";
        EXPECT_NO_FRAMES();
    });
}

TEST(Setenv, Failures)
{
    EXPECT_IN_CHILD([] {
        EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_setenv(nullptr, "x"));
        EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_unsetenv(nullptr));
        EXPECT_FRAMES({"zv_util_setenv", ZV_ERR_NULL_ARG}, {"zv_util_unsetenv", ZV_ERR_NULL_ARG});

        for (const char *name : {"", "A=B"}) {
            zvt::clear_trace();
            zvt::LogCapture log;
            EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_setenv(name, "x"));
            EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_unsetenv(name));
            EXPECT_FRAMES({"zv_util_setenv", ZV_ERR_SYSTEM}, {"zv_util_unsetenv", ZV_ERR_SYSTEM});
            EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to set environment variable: Invalid argument"},
                                         {3, "Failed to unset environment variable: Invalid argument"}}));
            EXPECT_EQ(log.lines().at(0).frames_before, 0u) << "line first, then the frame";
            EXPECT_EQ(log.lines().at(1).frames_before, 1u);
        }
        EXPECT_EQ(getenv("A"), nullptr);
    });
}

TEST(Hostname, MatchesTheSystem)
{
    char expected[HOST_NAME_MAX + 1] = {};
    ASSERT_EQ(gethostname(expected, sizeof expected), 0);
    EXPECT_EQ(take(zv_util_get_hostname()), expected);
    EXPECT_NO_FRAMES();
}

TEST(Hostname, LongestNameComesBackWhole)
{
    // A private host name: needs a UTS namespace, which needs privilege.
    EXPECT_IN_CHILD([] {
        if (unshare(CLONE_NEWUTS) != 0)
            zvt::skip_child();
        long maximum = sysconf(_SC_HOST_NAME_MAX);
        std::string longest(static_cast<size_t>(maximum), 'h');
        ASSERT_EQ(sethostname(longest.data(), longest.size()), 0);
        EXPECT_EQ(take(zv_util_get_hostname()), longest);
    });
}

TEST(Hostname, Failures)
{
    size_t heap = zvt::heap_in_use();
    EXPECT_EQ(zvt::with_fault("alloc", 1, ENOMEM, [] { return zv_util_get_hostname(); }), nullptr);
    EXPECT_EQ(zvt::with_fault("gethostname", 1, ENAMETOOLONG, [] { return zv_util_get_hostname(); }),
              nullptr);
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_NO_FRAMES();
}

}  // namespace
