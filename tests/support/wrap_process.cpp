// Process, signal and host calls.
#include <csignal>
#include <cstddef>
#include <sys/types.h>
#include <unistd.h>

#include "support/fault.h"

extern "C" {

pid_t __real_fork(void);
pid_t __real_waitpid(pid_t pid, int *status, int options);
int __real_sigaction(int sig, const struct sigaction *action, struct sigaction *old);
int __real_gethostname(char *name, size_t size);

pid_t __wrap_fork(void)
{
    return zvt::fault_hit("fork") ? -1 : __real_fork();
}

pid_t __wrap_waitpid(pid_t pid, int *status, int options)
{
    return zvt::fault_hit("waitpid") ? -1 : __real_waitpid(pid, status, options);
}

int __wrap_sigaction(int sig, const struct sigaction *action, struct sigaction *old)
{
    return zvt::fault_hit("sigaction") ? -1 : __real_sigaction(sig, action, old);
}

int __wrap_gethostname(char *name, size_t size)
{
    return zvt::fault_hit("gethostname") ? -1 : __real_gethostname(name, size);
}

}  // extern "C"
