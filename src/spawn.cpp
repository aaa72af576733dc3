// Spawn-and-wait in one call, and dropping a handle without waiting.
#include <zvutil/process.h>

#include "internal.h"

extern "C" {

ZV_EXPORT zv_status zv_spawn_and_wait(char *const argv[], char *const envp[],
                                      int32_t *exit_code)
{
    zv_proc_handle *handle = nullptr;
    zv_status status = zv_spawn(argv, envp, &handle);
    if (status != ZV_OK)
        return ZV_FAIL(status);
    status = zv_wait(&handle, exit_code);
    // zv_wait keeps the handle on failure; nobody else can release this one.
    zv_free_proc_handle(&handle);
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
