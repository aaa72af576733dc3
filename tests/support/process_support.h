// Helpers for tests that need processes of their own: code that changes
// process-wide state runs in a forked child, and helper programs run with a
// chosen argv[0] so that /proc shows a known command line.
#pragma once

#include <sys/types.h>

#include <functional>

namespace zvt {

// Exit code of a child that asks to be counted as skipped.
inline constexpr int kChildSkipped = 77;

// Forks, runs |body| in the child with an empty trace, and returns the
// child's exit code: 0 when no assertion failed there, 1 otherwise,
// kChildSkipped when |body| called skip_child(); 128 + n when signal n ended it.
int run_in_child(const std::function<void()> &body);
[[noreturn]] void skip_child();

// Starts /bin/sleep 30 with |argv0| as its first argument; returns its PID.
pid_t start_sleeper(const char *argv0);
// Sends SIGKILL to |pid| and reaps it.
void stop_child(pid_t pid);

}  // namespace zvt

// Runs |body| in a child and expects it to pass (a skip there skips the test).
#define EXPECT_IN_CHILD(body)                                              \
    do {                                                                   \
        int zvt_child_code = ::zvt::run_in_child(body);                    \
        if (zvt_child_code == ::zvt::kChildSkipped)                        \
            GTEST_SKIP() << "skipped in the child";                        \
        EXPECT_EQ(zvt_child_code, 0) << "the child reported failures";     \
    } while (0)
