#include "support/process_support.h"

#include <csignal>
#include <cstdio>
#include <sys/wait.h>
#include <unistd.h>

namespace zvt {

std::string cmdline_of(pid_t pid)
{
    char head[4096] = {};
    FILE *f = std::fopen(("/proc/" + std::to_string(pid) + "/cmdline").c_str(), "r");
    if (f != nullptr) {
        std::fread(head, 1, sizeof head - 1, f);
        std::fclose(f);
    }
    return head;
}

pid_t start_sleeper(const std::string &argv0)
{
    pid_t pid = fork();
    if (pid == 0) {
        char *argv[] = {const_cast<char *>(argv0.c_str()), const_cast<char *>("30"), nullptr};
        char *envp[] = {nullptr};
        execve("/bin/sleep", argv, envp);
        _exit(127);
    }
    for (int i = 0; i < 5000 && cmdline_of(pid) != argv0; i++)
        usleep(1000);
    return pid;
}

void stop_child(pid_t pid)
{
    kill(pid, SIGKILL);
    int status;
    waitpid(pid, &status, 0);
}

}  // namespace zvt
