// The failure convention: frames, log lines and their order.
#include <gtest/gtest.h>

#include <cerrno>

#include "internal.h"
#include "support/trace.h"
#include <zvutil/format.h>

namespace {

extern "C" zv_status probe_fail(void)
{
    return ZV_FAIL(ZV_ERR_BAD_VALUE);  // the line the frame must carry
}
constexpr int32_t kProbeLine = __LINE__ - 2;

zv_status probe_log_fail() { return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to %s\n", "probe"); }
zv_status probe_perror_fail() { return ZV_PERROR_FAIL(ENOENT, ZV_ERR_SYSTEM, "Failed to open\n"); }
zv_status probe_pass_on() { return ZV_FAIL_THEN_LOG(ZV_ERR_TIMEOUT, "Passed on\n"); }

TEST(Status, CodesHaveTheirFixedValues)
{
    static_assert(sizeof(zv_status) == 4 && zv_status(-1) > 0, "unsigned 32-bit");
    const std::pair<zv_status, const char *> table[] = {
        {0, "ZV_OK"},           {2, "ZV_ERR_NO_MEMORY"},   {3, "ZV_ERR_NULL_ARG"},
        {6, "ZV_ERR_SYSTEM"},   {7, "ZV_ERR_BAD_VALUE"},   {9, "ZV_ERR_IO"},
        {16, "ZV_ERR_TOO_SMALL"}, {32, "ZV_ERR_OPEN_FAILED"}, {33, "ZV_ERR_OVERFLOW"},
        {36, "ZV_ERR_TIMEOUT"}, {37, "ZV_ERR_NO_MORE"},    {39, "ZV_ERR_ACCESS"},
        {52, "ZV_ERR_IN_USE"},
    };
    for (const auto &[value, name] : table)
        EXPECT_EQ(zvt::status_name(value), name);
}

TEST(Status, FrameCarriesFunctionRelativeFileAndLine)
{
    errno = EDOM;
    EXPECT_EQ(probe_fail(), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(errno, EDOM) << "recording a frame must keep errno";
    auto frames = zvt::frames();
    ASSERT_EQ(frames.size(), 1u);
    EXPECT_EQ(frames[0].function, "probe_fail");
    EXPECT_EQ(frames[0].file, "tests/status_test.cpp");
    EXPECT_EQ(frames[0].line, kProbeLine);
    EXPECT_EQ(frames[0].status, ZV_ERR_BAD_VALUE);
}

TEST(Status, LibraryFramesNameTheirSourceFile)
{
    char *out = nullptr;
    ASSERT_EQ(zv_util_asprintf(&out, nullptr, nullptr), ZV_ERR_NULL_ARG);
    auto frames = zvt::frames();
    ASSERT_EQ(frames.size(), 1u);
    EXPECT_EQ(frames[0].file, "src/string/vasprintf.cpp");
}

TEST(Status, LogOrderFollowsWhoDetectedTheFailure)
{
    zvt::LogCapture log;
    EXPECT_EQ(probe_log_fail(), ZV_ERR_SYSTEM);
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to probe"}}));
    EXPECT_EQ(log.lines()[0].frames_before, 0u) << "own failure: log line before the frame";
    EXPECT_EQ(log.lines()[0].function, "probe_log_fail");

    zvt::clear_trace();
    log.clear();
    EXPECT_EQ(probe_pass_on(), ZV_ERR_TIMEOUT);
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Passed on"}}));
    EXPECT_EQ(log.lines()[0].frames_before, 1u) << "passed-on failure: frame before the log line";
    EXPECT_FRAMES({"probe_pass_on", ZV_ERR_TIMEOUT});
}

TEST(Status, PerrorAppendsTheSavedErrno)
{
    zvt::LogCapture log;
    errno = EINTR;
    EXPECT_EQ(probe_perror_fail(), ZV_ERR_SYSTEM);
    EXPECT_EQ(errno, EINTR);
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to open: No such file or directory"}}));
    EXPECT_FRAMES({"probe_perror_fail", ZV_ERR_SYSTEM});
}

TEST(Status, LoggerExpandsPercentMWithCallersErrno)
{
    zvt::LogCapture log;
    errno = EACCES;
    zv_util_log_internal(3, 128, "f", "x.cpp", 1, "Cannot access pid file %s (%m)\n", "/p");
    EXPECT_EQ(errno, EACCES);
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Cannot access pid file /p (Permission denied)"}}));
}

TEST(Status, TraceKeepsTheMostRecentFrames)
{
    for (int i = 0; i < 300; i++)
        zv_trace_save("f", "x.cpp", i, 7);
    ASSERT_GE(zv_trace_count(), 64u);
    zv_trace_frame last;
    ASSERT_EQ(zv_trace_get(zv_trace_count() - 1, &last), 0);
    EXPECT_EQ(last.line, 299);
    EXPECT_EQ(zv_trace_get(zv_trace_count(), &last), -1);
}

}  // namespace
