// Starting a child program and waiting for it.
#include <zvutil/process.h>

#include <csignal>
#include <cstring>
#include <sched.h>
#include <sys/mman.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include "internal.h"

namespace {

// The child is a clone that borrows the caller's memory until execve replaces
// it (CLONE_VM | CLONE_VFORK, the calling thread waiting meanwhile), so
// starting it costs the same whatever the caller's size, where fork would copy
// its page tables. Until execve the child must leave the caller's memory alone
// and run nothing of anybody else's: it runs on a mapping of its own with an
// unmapped page below it, and makes every system call, the clone included,
// with the instruction itself. No C library wrapper, no call through the PLT:
// an interceptor (a sanitizer's clone, fork or signal ones) or the dynamic
// linker's resolver (which saves the vector state, and runs an LD_AUDIT
// module's hooks, on the stack) would run there otherwise. The child writes
// nothing but its stack; errno is never set.

// A system call; -errno on failure.
[[gnu::always_inline]] inline long raw_syscall(long nr, long a = 0, long b = 0, long c = 0,
                                               long d = 0)
{
    long result;
#if defined(__x86_64__)
    register long r10 asm("r10") = d;
    asm volatile("syscall"
                 : "=a"(result)
                 : "0"(nr), "D"(a), "S"(b), "d"(c), "r"(r10)
                 : "rcx", "r11", "memory");
#elif defined(__i386__)
    asm volatile("int $0x80"
                 : "=a"(result)
                 : "0"(nr), "b"(a), "c"(b), "d"(c), "S"(d)
                 : "memory");
#else
#error "spawn supports i386 and x86_64 only"
#endif
    return result;
}

[[gnu::always_inline]] inline long arg(const void *pointer)
{
    return reinterpret_cast<long>(pointer);
}

// Clones with |flags|; the child calls run(context) on the stack that ends at
// |stack_end| (16-byte aligned) and must end there, by execve or exit. The
// parent gets the child's process ID or -errno.
long clone_and_call(unsigned long flags, char *stack_end, void (*run)(void *), void *context)
{
    // run and context wait on the new stack, where the child pops them.
#if defined(__x86_64__)
    void **slots = reinterpret_cast<void **>(stack_end) - 2;  // aligned again after both pops
    slots[0] = reinterpret_cast<void *>(run);
    slots[1] = context;
    long result;
    register long child_tid asm("r10") = 0;
    register long tls asm("r8") = 0;
    asm volatile(
        "syscall\n\t"
        "test %%rax, %%rax\n\t"
        "jnz 1f\n\t"
        "xor %%ebp, %%ebp\n\t"
        "pop %%rax\n\t"
        "pop %%rdi\n\t"
        "call *%%rax\n\t"
        "ud2\n"
        "1:"
        : "=a"(result)
        : "0"(static_cast<long>(SYS_clone)), "D"(flags), "S"(slots), "d"(0L), "r"(child_tid),
          "r"(tls)
        : "rcx", "r11", "memory");
#else
    // context is the argument on the stack, aligned once run is popped.
    void **slots = reinterpret_cast<void **>(stack_end - 16) - 1;
    slots[0] = reinterpret_cast<void *>(run);
    slots[1] = context;
    long result;
    asm volatile(
        "int $0x80\n\t"
        "test %%eax, %%eax\n\t"
        "jnz 1f\n\t"
        "xor %%ebp, %%ebp\n\t"
        "pop %%eax\n\t"
        "call *%%eax\n\t"
        "ud2\n"
        "1:"
        : "=a"(result)
        : "0"(static_cast<long>(SYS_clone)), "b"(flags), "c"(slots), "d"(0L), "S"(0L), "D"(0L)
        : "memory");
#endif
    return result;
}

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

// The child's stack. The child uses 64 bytes of it on x86_64 (measured by
// painting the mapping, the same with LD_BIND_NOT and under an LD_AUDIT
// module, since the child calls nothing) and 72 on i386 (counted from the
// code). A page is a wide margin; the page below it is never mapped, so an
// overflow faults in the child instead of writing into the caller's memory.
constexpr size_t kPageBytes = 4096;
constexpr size_t kChildStackBytes = kPageBytes;

class ChildStack {
public:
    ChildStack()
        : base_(::mmap(nullptr, kPageBytes + kChildStackBytes, PROT_NONE,
                       MAP_PRIVATE | MAP_ANONYMOUS | MAP_STACK, -1, 0))
    {
        if (base_ != MAP_FAILED &&
            ::mprotect(end() - kChildStackBytes, kChildStackBytes, PROT_READ | PROT_WRITE) != 0)
            release();
    }
    ChildStack(const ChildStack &) = delete;
    ChildStack &operator=(const ChildStack &) = delete;
    ~ChildStack() { release(); }
    explicit operator bool() const { return base_ != MAP_FAILED; }
    char *end() const { return static_cast<char *>(base_) + kPageBytes + kChildStackBytes; }

private:
    void release()
    {
        if (base_ != MAP_FAILED) {
            int saved = errno;
            ::munmap(base_, kPageBytes + kChildStackBytes);
            errno = saved;
        }
        base_ = MAP_FAILED;
    }
    void *base_;
};

struct ChildStart {
    char *const *argv;
    char *const *envp;
    const sigset_t *caller_mask;
};

// Code that runs in the child before execve: no sanitizer instrumentation
// (its checks and hooks are calls into a runtime) and no stack protector.
#if defined(__clang__)
#define ZV_CHILD_CODE [[gnu::noinline, clang::disable_sanitizer_instrumentation, \
                        clang::no_sanitize("address", "thread", "undefined", "coverage"), \
                        clang::no_stack_protector]]
#else
#define ZV_CHILD_CODE [[gnu::noinline, gnu::no_sanitize("address", "thread", "undefined"), \
                        gnu::no_stack_protector]]
#endif

// No handler of the caller may run in the child on the shared memory: every
// caught signal goes back to its default, ignored ones stay ignored. All
// signals are blocked until the caller's mask comes back just before execve.
// A failed execve ends the child with exit code 1, as _exit(1) would.
ZV_CHILD_CODE void start_child(void *start_block)
{
    const auto *start = static_cast<const ChildStart *>(start_block);
    KernelSigaction action;
    for (long sig = 1; sig <= kSignals; sig++) {
        if (raw_syscall(SYS_rt_sigaction, sig, 0, arg(&action), kSigsetBytes) != 0 ||
            action.handler == SIG_DFL || action.handler == SIG_IGN)
            continue;
        action.handler = SIG_DFL;
        raw_syscall(SYS_rt_sigaction, sig, arg(&action), 0, kSigsetBytes);
    }
    raw_syscall(SYS_rt_sigprocmask, SIG_SETMASK, arg(start->caller_mask), 0, kSigsetBytes);
    raw_syscall(SYS_execve, arg(start->argv[0]), arg(start->argv), arg(start->envp));
    raw_syscall(SYS_exit_group, 1);
}

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_spawn(char *const argv[], char *const envp[],
                             zv_proc_handle **handle_out)
{
    *handle_out = nullptr;
    zv::unique_malloc<zv_proc_handle> handle(
        static_cast<zv_proc_handle *>(std::malloc(sizeof(zv_proc_handle))));
    if (!handle)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    ChildStack stack;
    if (!stack)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);

    // Every signal blocked, the C library's own included (sigfillset would
    // leave those out). Nothing here sets errno on success.
    sigset_t all, caller_mask;
    std::memset(&all, 0xff, sizeof all);
    raw_syscall(SYS_rt_sigprocmask, SIG_SETMASK, arg(&all), arg(&caller_mask), kSigsetBytes);
    ChildStart start{argv, envp, &caller_mask};
    long pid = clone_and_call(CLONE_VM | CLONE_VFORK | SIGCHLD, stack.end(), start_child, &start);
    raw_syscall(SYS_rt_sigprocmask, SIG_SETMASK, arg(&caller_mask), 0, kSigsetBytes);
    if (pid < 0) {
        errno = static_cast<int>(-pid);
        return ZV_FAIL(ZV_ERR_SYSTEM);
    }
    handle->pid = static_cast<pid_t>(pid);
    *handle_out = handle.release();
    return ZV_OK;
}

// Not instrumented by AddressSanitizer: see zv_spawn_and_wait.
[[gnu::no_sanitize_address]] ZV_EXPORT zv_status zv_wait(zv_proc_handle **handle,
                                                         int32_t *exit_code)
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
