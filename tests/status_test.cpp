// The failure convention and the two libraries it reports through.
#include "internal.h"
#include "support/zvt.h"

namespace {

extern "C" zv_status probe_fail(void) { return ZV_FAIL(ZV_ERR_BAD_VALUE); }
constexpr int32_t kProbeLine = __LINE__ - 1;
zv_status probe_log_fail() { return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to %s\n", "probe"); }
zv_status probe_pass_on() { return ZV_FAIL_THEN_LOG(ZV_ERR_TIMEOUT, "Passed on\n"); }
zv_status probe_perror_fail() { return ZV_PERROR_FAIL(ENOENT, ZV_ERR_SYSTEM, "Failed to open\n"); }

TEST(Status, FramesAndLinesInOrderWithErrnoKept)
{
    zvt::LogCapture log;
    const std::string pad(600, 'x');
    errno = EDOM;
    EXPECT_EQ((std::vector{probe_fail(), probe_log_fail(), probe_pass_on(), probe_perror_fail()}),
              (std::vector<zv_status>{ZV_ERR_BAD_VALUE, ZV_ERR_SYSTEM, ZV_ERR_TIMEOUT,
                                      ZV_ERR_SYSTEM}));
    EXPECT_EQ(zvt::trace_text(), "probe_fail:ZV_ERR_BAD_VALUE probe_log_fail:ZV_ERR_SYSTEM "
                                 "probe_pass_on:ZV_ERR_TIMEOUT probe_perror_fail:ZV_ERR_SYSTEM");
    zv_trace_frame frame;
    ASSERT_EQ(zv_trace_get(0, &frame), 0);
    EXPECT_EQ(frame.file + (":" + std::to_string(frame.line)),
              "tests/status_test.cpp:" + std::to_string(kProbeLine));
    // %m is the caller's errno, which the probes kept, in short and long lines.
    zv_util_log_internal(3, 128, "f", "x.cpp", 1, "%s (%m)\n", "short");
    zv_util_log_internal(3, 128, "f", "x.cpp", 1, "%s (%m)\n", pad.c_str());
    EXPECT_EQ(errno, EDOM);
    // A failure found here is logged before its frame, a passed-on one after.
    EXPECT_EQ(log.text(), "3/128/1 Failed to probe\n3/128/3 Passed on\n"
                          "3/128/3 Failed to open: No such file or directory\n"
                          "3/128/4 short (Numerical argument out of domain)\n3/128/4 " + pad +
                              " (Numerical argument out of domain)\n");

    // A full trace keeps the newest frames.
    for (int32_t line = 0; line < 1000; line++)
        zv_trace_save("f", "x.cpp", line, ZV_ERR_BAD_VALUE);
    const uint32_t kept = zv_trace_count();
    ASSERT_LT(kept, 1000u);
    for (uint32_t i = 0; i < kept; i++) {
        ASSERT_EQ(zv_trace_get(i, &frame), 0);
        EXPECT_EQ(frame.line, int32_t(1000 - kept + i)) << i;
    }
    EXPECT_EQ(zv_trace_get(kept, &frame), -1);
    EXPECT_EQ(zv_trace_get(0, nullptr), -1);
}

}  // namespace
