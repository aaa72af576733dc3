// Helper processes with a known command line for the process tests.
#pragma once

#include <csignal>
#include <fstream>
#include <string>
#include <sys/wait.h>
#include <unistd.h>

namespace zvt {

// The first word of the command line /proc shows for |pid|.
inline std::string cmdline_of(pid_t pid)
{
    std::string head;
    std::getline(std::ifstream("/proc/" + std::to_string(pid) + "/cmdline"), head, '\0');
    return head;
}

// Starts /bin/sleep 30 with |argv0| as its first argument and returns its ID
// once /proc shows that command line.
inline pid_t start_sleeper(const std::string &argv0)
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

// Sends SIGKILL to |pid| and reaps it.
inline void stop_child(pid_t pid)
{
    kill(pid, SIGKILL);
    waitpid(pid, nullptr, 0);
}

}  // namespace zvt
