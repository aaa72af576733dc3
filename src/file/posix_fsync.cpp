// Durable sync of streams and named files, and the family's stream opener.
#include <zvutil/file.h>

#include <cstring>
#include <fcntl.h>
#include <unistd.h>

#include "file/file_internal.h"

namespace {

// Longest path zv_util_sync_file accepts is one byte shorter.
constexpr size_t kPathLimit = 1000;

}  // namespace

FILE *zv::zv_util_open_stream(const char *path, const char *mode)
{
    return std::fopen(path, mode);
}

extern "C" {

ZV_EXPORT zv_status zv_util_sync(FILE *stream, const char *dir_path)
{
    if (stream == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (std::fflush(stream) != 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    int fd = ::fileno(stream);
    if (fd == -1)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    if (::fsync(fd) != 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    if (dir_path == nullptr)
        return ZV_OK;

    zv::unique_fd dir(::open(dir_path, O_RDONLY | O_CLOEXEC));
    if (!dir)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    if (::fsync(dir.get()) != 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_sync_file(const char *path)
{
    if (path == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (strnlen(path, kPathLimit) >= kPathLimit)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    zv::unique_malloc<char> directory;
    zv_status status = zv_util_get_directory_component(path, zv::out_block(directory));
    if (status != ZV_OK)
        return ZV_FAIL_THEN_LOG(status, "Failed to get directory component\n");

    // Both descriptors are open before either sync; destruction closes the
    // directory's first.
    zv::unique_fd file(::open(path, O_RDWR | O_CLOEXEC));
    if (!file)
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to open file\n");
    zv::unique_fd dir(::open(zv::sync_directory(directory.get()), O_RDONLY | O_CLOEXEC));
    if (!dir)
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to open directory\n");
    if (::fsync(file.get()) != 0)
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to sync file\n");
    if (::fsync(dir.get()) != 0)
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to sync directory file\n");
    return ZV_OK;
}

}  // extern "C"
