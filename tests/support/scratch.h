// Scratch directories, forked children and the failure-row driver.
#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <grp.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/zvutil.h>

namespace zvt {

// The unprivileged user and group that permission cases run as.
inline constexpr uid_t kNobody = 65534;
inline constexpr gid_t kNogroup = 65534;

// A fresh directory under /tmp, removed with its content at the end.
struct ScratchDir {
    std::string path = mkdtemp(std::string("/tmp/zvutil-test-XXXXXX").data());
    ~ScratchDir()
    {
        std::error_code ignored;
        std::filesystem::remove_all(path, ignored);
    }
    std::string operator/(const std::string &name) const { return path + "/" + name; }
};

inline void put_file(const std::string &path, const std::string &content)
{
    std::ofstream(path, std::ios::binary) << content;
}

inline std::string get_file(const std::string &path)
{
    return {std::istreambuf_iterator<char>(std::ifstream(path, std::ios::binary).rdbuf()), {}};
}

// Runs |body| in a forked child, as the unprivileged user when |drop|; the
// child's gtest failures print there and fail the test here.
inline void in_child(bool drop, const std::function<void()> &body)
{
    if (drop && geteuid() != 0)
        GTEST_SKIP() << "needs root to switch users";
    std::fflush(nullptr);
    pid_t pid = fork();
    if (pid == 0) {
        if (drop && (setgroups(0, nullptr) != 0 || setgid(kNogroup) != 0 || setuid(kNobody) != 0))
            _exit(2);
        body();
        std::fflush(nullptr);
        _exit(::testing::Test::HasFailure() ? 1 : 0);
    }
    int status = -1;
    waitpid(pid, &status, 0);
    EXPECT_EQ(status, 0) << "child failed";
}

// A failure row's call.
#define ZVT_CALL(...) [&] { return __VA_ARGS__; }
// A failure row of zv_util_<fn> called with |args|: its one frame with |st|,
// then any other fields of FailureRow by name.
#define ROW(st, fn, args, ...) zvt::FailureRow{.frames = "zv_util_" #fn, .status = st, \
    .call = ZVT_CALL(zv_util_##fn args) __VA_OPT__(, ) __VA_ARGS__}

// errno_out target of the failure rows, reset before each row.
inline constexpr int32_t kUntouched = 12345;
inline int32_t row_errno = kUntouched;

// One failure: |call|, with the |nth| call at |point| failing with EIO,
// returns |status|; the trace holds the comma-separated |frames| (oldest
// first, each with |status|); |row_errno| ends as |err|; the log holds |log|
// alone (level 3, written after |log_after| frames) or nothing; no descriptor
// or heap block is left behind. A null point arms nothing, as kNoFault.
struct FailureRow {
    const char *frames;
    zv_status status;
    std::function<zv_status()> call;
    const char *point = kNoFault;
    unsigned nth = 1;
    int32_t err = kUntouched;
    std::string log = "";
    unsigned log_after = 0;
};

inline void expect_failures(std::initializer_list<FailureRow> rows)
{
    for (const FailureRow &row : rows) {
        const char *point = row.point ? row.point : kNoFault;
        SCOPED_TRACE(std::string(row.frames) + " / " + point + " " + std::to_string(row.nth));
        zv_trace_clear();
        row_errno = kUntouched;
        size_t heap = heap_in_use();
        unsigned fds = open_fd_count();
        LogCapture log;
        zv_status status = with_fault(point, row.nth, EIO, row.call);
        EXPECT_EQ(heap_in_use(), heap);
        EXPECT_EQ(open_fd_count(), fds);
        EXPECT_STATUS(row.status, status);
        std::string names;
        for (const Frame &frame : frames()) {
            names += (names.empty() ? "" : ",") + frame.function;
            EXPECT_STATUS(row.status, frame.status);
        }
        EXPECT_EQ(names, row.frames);
        EXPECT_EQ(row_errno, row.err);
        EXPECT_EQ(log.text(), row.log.empty() ? "" : "3/128/" + std::to_string(row.log_after) +
                                                          " " + row.log + "\n");
    }
}

}  // namespace zvt
