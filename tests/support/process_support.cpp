#include "support/process_support.h"

#include <gtest/gtest.h>
#include <zverrortrace.h>

#include <csignal>
#include <cstdio>
#include <sys/wait.h>
#include <unistd.h>

namespace zvt {

int run_in_child(const std::function<void()> &body)
{
    std::fflush(nullptr);
    pid_t pid = fork();
    if (pid == -1)
        return -1;
    if (pid == 0) {
        zv_trace_clear();
        body();
        std::fflush(nullptr);
        _exit(::testing::Test::HasFailure() ? 1 : 0);
    }
    int status = 0;
    if (waitpid(pid, &status, 0) != pid)
        return -1;
    return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

void skip_child()
{
    std::fflush(nullptr);
    _exit(kChildSkipped);
}

pid_t start_sleeper(const char *argv0)
{
    pid_t pid = fork();
    if (pid == 0) {
        char *argv[] = {const_cast<char *>(argv0), const_cast<char *>("30"), nullptr};
        char *envp[] = {nullptr};
        execve("/bin/sleep", argv, envp);
        _exit(127);
    }
    return pid;
}

void stop_child(pid_t pid)
{
    kill(pid, SIGKILL);
    int status;
    waitpid(pid, &status, 0);
}

}  // namespace zvt
