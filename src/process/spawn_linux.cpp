// Starting a child program and waiting for it.
#include <zvutil/process.h>

#include <sys/wait.h>

#include "internal.h"

extern "C" {

ZV_EXPORT zv_status zv_spawn(char *const argv[], char *const envp[],
                             zv_proc_handle **handle_out)
{
    *handle_out = static_cast<zv_proc_handle *>(std::malloc(sizeof(zv_proc_handle)));
    if (*handle_out == nullptr)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);

    pid_t pid = fork();
    if (pid == -1) {
        std::free(*handle_out);
        *handle_out = nullptr;
        return ZV_FAIL(ZV_ERR_SYSTEM);
    }
    if (pid == 0) {
        // Only async-signal-safe calls in the child. _exit rather than exit:
        // the parent's exit handlers must not run here, nor its unflushed
        // stdio buffers be written a second time.
        execve(argv[0], argv, envp);
        _exit(1);
    }
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
