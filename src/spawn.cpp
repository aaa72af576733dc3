// Spawn-and-wait in one call, and dropping a handle without waiting.
#include <zvutil/process.h>

#include <pthread.h>

#include "internal.h"

namespace {

void release_handle(void *handle)
{
    zv_free_proc_handle(static_cast<zv_proc_handle **>(handle));
}

}  // namespace

extern "C" {

// A cancelled wait unwinds through here and zv_wait without running their
// epilogues, which would leave AddressSanitizer's poison of their stack
// frames behind: neither is instrumented for it.
[[gnu::no_sanitize_address]] ZV_EXPORT zv_status zv_spawn_and_wait(char *const argv[],
                                                                   char *const envp[],
                                                                   int32_t *exit_code)
{
    zv_proc_handle *handle = nullptr;
    zv_status status = zv_spawn(argv, envp, &handle);
    if (status != ZV_OK)
        return ZV_FAIL(status);
    // The wait is a cancellation point: a cancelled caller still releases the
    // handle (the child is left to run and is not reaped). zv_wait keeps the
    // handle on failure; nobody else can release this one.
    pthread_cleanup_push(release_handle, &handle);
    status = zv_wait(&handle, exit_code);
    pthread_cleanup_pop(1);
    return status;
}

ZV_EXPORT void zv_free_proc_handle(zv_proc_handle **handle)
{
    if (handle == nullptr || *handle == nullptr)
        return;
    std::free(*handle);
    *handle = nullptr;
}

}  // extern "C"
