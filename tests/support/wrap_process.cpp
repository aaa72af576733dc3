// Process, signal, lock and host calls, and closing a stream.
#include <csignal>
#include <cstdio>
#include <sys/file.h>
#include <cerrno>
#include <cstddef>
#include <sys/types.h>
#include <unistd.h>

#include "support/fault.h"

extern "C" {

pid_t __real_fork(void);
pid_t __real_waitpid(pid_t pid, int *status, int options);
int __real_sigaction(int sig, const struct sigaction *action, struct sigaction *old);
int __real_gethostname(char *name, size_t size);
int __real_flock(int fd, int operation);
int __real_fclose(FILE *stream);

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

int __wrap_flock(int fd, int operation)
{
    return zvt::fault_hit("flock") ? -1 : __real_flock(fd, operation);
}

// A failing fclose still releases the stream, as glibc's does.
int __wrap_fclose(FILE *stream)
{
    if (!zvt::fault_hit("fclose"))
        return __real_fclose(stream);
    int saved = errno;
    __real_fclose(stream);
    errno = saved;
    return EOF;
}

}  // extern "C"
