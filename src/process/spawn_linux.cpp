// Starting a child program and waiting for it.
#include <zvutil/process.h>

#include <csignal>
#include <cstring>
#include <sched.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include "internal.h"

namespace {

// The child is a clone that borrows the caller's memory and thread-local
// storage until execve replaces it (CLONE_VM | CLONE_VFORK, the caller's thread
// waiting meanwhile), so starting it costs the same whatever the caller's size,
// where fork would copy its page tables. Until execve the child runs on a small
// stack of its own, allocates nothing, makes only system calls (the signal
// ones straight to the kernel, past any wrapper or sanitizer interceptor) and
// writes only its stack and errno, whose slot is the caller's and which
// zv_spawn puts back.

// The kernel's signal set (64 signals) and its rt_sigaction record, the same
// layout on i386 and x86_64.
constexpr long kSigsetBytes = 8;
constexpr int kSignals = 64;
struct KernelSigaction {
    void (*handler)(int);
    unsigned long flags;
    void (*restorer)();
    unsigned long mask[kSigsetBytes / sizeof(unsigned long)];
};

// Holds start_child's frame and the system call wrappers; no signal handler
// ever runs on it.
constexpr size_t kChildStackBytes = 4096;

struct ChildStart {
    char *const *argv;
    char *const *envp;
    const sigset_t *caller_mask;
};

// No handler of the caller may run in the child on the shared memory: every
// caught signal goes back to its default, ignored ones stay ignored. All
// signals are blocked until the caller's mask comes back just before execve.
[[gnu::no_sanitize_address]] int start_child(void *start_block)
{
    const auto *start = static_cast<const ChildStart *>(start_block);
    KernelSigaction action;
    for (long sig = 1; sig <= kSignals; sig++) {
        if (syscall(SYS_rt_sigaction, sig, nullptr, &action, kSigsetBytes) != 0 ||
            action.handler == SIG_DFL || action.handler == SIG_IGN)
            continue;
        action.handler = SIG_DFL;
        syscall(SYS_rt_sigaction, sig, &action, nullptr, kSigsetBytes);
    }
    syscall(SYS_rt_sigprocmask, static_cast<long>(SIG_SETMASK), start->caller_mask, nullptr,
            kSigsetBytes);
    // Straight system calls here too: a first call through a lazily bound
    // entry would run the dynamic linker's resolver, whose frame (the saved
    // vector state) can outgrow this stack. syscall itself was bound by the
    // caller's mask change above. Exit code 1 as _exit(1) gives it.
    syscall(SYS_execve, start->argv[0], start->argv, start->envp);
    syscall(SYS_exit_group, 1L);
    return 1;
}

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_spawn(char *const argv[], char *const envp[],
                             zv_proc_handle **handle_out)
{
    *handle_out = static_cast<zv_proc_handle *>(std::malloc(sizeof(zv_proc_handle)));
    if (*handle_out == nullptr)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);

    // Every signal blocked, the C library's own included (sigfillset would
    // leave those out).
    sigset_t all, caller_mask;
    std::memset(&all, 0xff, sizeof all);
    syscall(SYS_rt_sigprocmask, static_cast<long>(SIG_SETMASK), &all, &caller_mask,
            kSigsetBytes);
    ChildStart start{argv, envp, &caller_mask};
    alignas(16) char child_stack[kChildStackBytes];
    int caller_errno = errno;
    pid_t pid = clone(start_child, child_stack + sizeof child_stack,
                      CLONE_VM | CLONE_VFORK | SIGCHLD, &start);
    int clone_errno = errno;
    syscall(SYS_rt_sigprocmask, static_cast<long>(SIG_SETMASK), &caller_mask, nullptr,
            kSigsetBytes);
    if (pid == -1) {
        std::free(*handle_out);
        *handle_out = nullptr;
        errno = clone_errno;
        return ZV_FAIL(ZV_ERR_SYSTEM);
    }
    errno = caller_errno;
    (*handle_out)->pid = pid;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_wait(zv_proc_handle **handle, int32_t *exit_code)
{
    if (handle == nullptr || *handle == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);

    // One blocking call; an interrupting signal is reported, not retried.
    int wait_status = 0;
    if (waitpid((*handle)->pid, &wait_status, 0) != (*handle)->pid)
        return ZV_FAIL(ZV_ERR_SYSTEM);

    std::free(*handle);
    *handle = nullptr;
    *exit_code = WIFEXITED(wait_status) ? WEXITSTATUS(wait_status) : -1;
    return ZV_OK;
}

ZV_EXPORT unsigned int zv_util_sleep(unsigned int seconds)
{
    return sleep(seconds);
}

}  // extern "C"
