// What a child started on the caller's shared memory may and may not change.
#include <gtest/gtest.h>

#include <atomic>
#include <csignal>
#include <cstring>
#include <thread>

#include "support/scratch.h"
#include <zvlog.h>
#include <zvutil/process.h>

static char *envp[] = {nullptr};

// A failed execve neither flushes the caller's stdio (early through the shared
// buffer, or a copy of it) nor leaves its errno behind.
TEST(SpawnClone, FailedExecLeavesStdioAndErrno)
{
    FILE *stream = std::tmpfile();
    std::fputs("once", stream);
    char missing[] = "/nonexistent/program", *argv[] = {missing, nullptr};
    int32_t code = 0;
    errno = EDOM;
    EXPECT_EQ(zv_spawn_and_wait(argv, envp, &code), ZV_OK);
    EXPECT_EQ(errno, EDOM);
    EXPECT_EQ(code, 1);
    EXPECT_EQ(lseek(fileno(stream), 0, SEEK_END), 0) << "the child wrote the buffer";
    std::fclose(stream);
}

// Blocked stays blocked, ignored stays ignored, caught arrives at its default.
TEST(SpawnClone, SignalStateAsAfterFork)
{
    zvt::ScratchDir dir;
    sigset_t blocked = {}, caller;
    sigaddset(&blocked, SIGUSR1);
    pthread_sigmask(SIG_SETMASK, &blocked, &caller);
    auto usr2 = signal(SIGUSR2, SIG_IGN), term = signal(SIGTERM, [](int) {});
    std::string out = dir / "status", script = "kill -s TERM $$; exit 3";
    char cp[] = "/bin/cp", status[] = "/proc/self/status", sh[] = "/bin/sh", c[] = "-c";
    char *copy[] = {cp, status, out.data(), nullptr}, *sigterm[] = {sh, c, script.data(), nullptr};
    int32_t code = 0;
    EXPECT_EQ(zv_spawn_and_wait(sigterm, envp, &code), ZV_OK);
    EXPECT_EQ(code, -1) << "SIGTERM at its default ends the shell";
    EXPECT_EQ(zv_spawn_and_wait(copy, envp, &code), ZV_OK);
    signal(SIGUSR2, usr2), signal(SIGTERM, term);
    pthread_sigmask(SIG_SETMASK, &caller, nullptr);
    std::string all = zvt::get_file(out);
    EXPECT_NE(all.find("\nSigBlk:\t0000000000000200\n"), std::string::npos) << all;
    EXPECT_EQ(std::stoull(all.substr(all.find("\nSigIgn:") + 8), nullptr, 16) & 0x800, 0x800u);
}

// Run under ASan: the child touches neither the heap nor the allocator's state
// that another thread keeps using meanwhile.
TEST(SpawnClone, BesideAThreadThatAllocatesAndLogs)
{
    zv_log_set_sink([](void *, int32_t, uint32_t, const char *, const char *, int32_t,
                       const char *text) { delete[] new char[std::strlen(text) + 1]; }, nullptr);
    std::atomic<bool> stop{false};
    std::thread busy([&] {
        for (int i = 0; !stop; i++)
            zv_util_log_internal(3, 128, "busy", "f", i, "%s", std::string(i % 999, 'x').c_str());
    });
    char path[] = "/bin/true", *argv[] = {path, nullptr};
    int32_t code = 0, failed = 0;
    for (int i = 0; i < 50; i++)
        failed += zv_spawn_and_wait(argv, envp, &code) != ZV_OK || code != 0;
    stop = true;
    busy.join();
    zv_log_set_sink(nullptr, nullptr);
    EXPECT_EQ(failed, 0);
}
