// What a child started on the caller's shared memory may and may not change.
#include <gtest/gtest.h>

#include <csignal>

#include "support/scratch.h"
#include <zvutil/process.h>

static char *envp[] = {nullptr};

// Blocked stays blocked, ignored stays ignored, caught arrives at its default;
// the failed execve of an earlier child leaves the caller's errno alone.
TEST(SpawnClone, SignalStateAsAfterForkErrnoKept)
{
    zvt::ScratchDir dir;
    sigset_t blocked = {}, caller;
    sigaddset(&blocked, SIGUSR1);
    pthread_sigmask(SIG_SETMASK, &blocked, &caller);
    auto usr2 = signal(SIGUSR2, SIG_IGN), term = signal(SIGTERM, [](int) {});
    std::string out = dir / "status", script = "kill -s TERM $$; exit 3";
    char cp[] = "/bin/cp", status[] = "/proc/self/status", sh[] = "/bin/sh", c[] = "-c";
    char *copy[] = {cp, status, out.data(), nullptr}, *sigterm[] = {sh, c, script.data(), nullptr};
    char missing[] = "/nonexistent/program", *fail[] = {missing, nullptr};
    int32_t code = 0;
    errno = EDOM;
    EXPECT_TRUE(zv_spawn_and_wait(fail, envp, &code) == ZV_OK && code == 1 && errno == EDOM);
    EXPECT_EQ(zv_spawn_and_wait(sigterm, envp, &code), ZV_OK);
    EXPECT_EQ(code, -1) << "SIGTERM at its default ends the shell";
    EXPECT_EQ(zv_spawn_and_wait(copy, envp, &code), ZV_OK);
    signal(SIGUSR2, usr2), signal(SIGTERM, term);
    pthread_sigmask(SIG_SETMASK, &caller, nullptr);
    std::string all = zvt::get_file(out);
    EXPECT_NE(all.find("\nSigBlk:\t0000000000000200\n"), std::string::npos) << all;
    EXPECT_EQ(std::stoull(all.substr(all.find("\nSigIgn:") + 8), nullptr, 16) & 0x800, 0x800u);
}
