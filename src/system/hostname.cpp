// The host name.
#include <zvutil/system.h>

#include "internal.h"

extern "C" {

ZV_EXPORT char *zv_util_get_hostname(void)
{
    long maximum = sysconf(_SC_HOST_NAME_MAX);
    if (maximum == -1)
        return nullptr;
    size_t size = static_cast<size_t>(maximum) + 1;
    zv::unique_malloc<char> name(static_cast<char *>(std::malloc(size)));
    if (!name || gethostname(name.get(), size) != 0)
        return nullptr;
    return name.release();
}

}  // extern "C"
