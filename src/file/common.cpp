// Stream-level operations of the file family: whole files by name, and
// hexadecimal byte printers.
#include <zvutil/file.h>
#include <zvutil/format.h>
#include <zvutil/hex.h>

#include <algorithm>
#include <cstdarg>
#include <cstdlib>

#include "file/file_internal.h"
#include "hex_pairs.h"

extern "C" {

ZV_EXPORT zv_status zv_util_fopen(FILE **stream_out, int32_t *errno_out, const char *mode,
                                  const char *format, ...)
{
    if (stream_out == nullptr || mode == nullptr || format == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    zv::unique_malloc<char> path;
    va_list args;
    va_start(args, format);
    zv_status status = zv_util_vasprintf(zv::out_block(path), format, args, errno_out);
    va_end(args);
    if (status != ZV_OK)
        return ZV_FAIL(status);
    FILE *stream = zv::zv_util_open_stream(path.get(), mode);
    if (stream == nullptr)
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    *stream_out = stream;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_read_named_file(const char *path, char **buf_out, uint32_t *size_out,
                                            int32_t *)
{
    if (path == nullptr || buf_out == nullptr || size_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    int64_t measured = 0;
    zv_status status = zv_util_get_file_size(path, &measured);
    if (status != ZV_OK)
        return ZV_FAIL(status);
    if ((static_cast<uint64_t>(measured) >> 32) != 0)
        return ZV_FAIL(ZV_ERR_OVERFLOW);
    auto size = static_cast<uint32_t>(measured);
    *size_out = size;

    zv::unique_file stream(zv::zv_util_open_stream(path, "rbe"));
    if (!stream)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    zv::unique_malloc<char> buffer(static_cast<char *>(std::malloc(size_t{size} + 1)));
    if (!buffer) {
        *buf_out = nullptr;
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    }

    // Exactly the measured size is read. A file that ends early (it shrank
    // after it was measured) fails rather than hand out bytes never read.
    std::clearerr(stream.get());
    uint32_t done = 0;
    while (done < size) {
        size_t n = std::fread(buffer.get() + done, 1, size - done, stream.get());
        done += static_cast<uint32_t>(n);
        bool ended = done < size && (n == 0 || std::feof(stream.get()));
        if (std::ferror(stream.get()) || ended) {
            *buf_out = nullptr;
            return ZV_FAIL(ZV_ERR_SYSTEM);
        }
    }
    buffer.get()[size] = '\0';
    *buf_out = buffer.release();
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_write_named_file(const char *path, int32_t truncate, const void *data,
                                             uint32_t len, int32_t *)
{
    if (path == nullptr || data == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    zv::unique_malloc<char> directory;
    zv_status status = zv_util_get_directory_component(path, zv::out_block(directory));
    if (status != ZV_OK)
        return ZV_FAIL(status);

    zv::unique_file stream(zv::zv_util_open_stream(path, truncate != 0 ? "wbe" : "abe"));
    if (!stream)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    std::clearerr(stream.get());
    const auto *bytes = static_cast<const char *>(data);
    uint32_t done = 0;
    while (done < len) {
        size_t n = std::fwrite(bytes + done, 1, len - done, stream.get());
        // A short write without the error indicator is a failure too: looping
        // on it could never end.
        if (std::ferror(stream.get()) || n == 0)
            return ZV_FAIL(ZV_ERR_SYSTEM);
        done += static_cast<uint32_t>(n);
    }

    status = zv_util_sync(stream.get(), zv::sync_directory(directory.get()));
    directory.reset();
    stream.reset();  // flushed and synced above: the close's result adds nothing
    if (status != ZV_OK)
        return ZV_FAIL(status);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_copy_file(const char *src_path, const char *dst_path)
{
    if (src_path == nullptr || dst_path == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    // The whole source is in memory before the destination is emptied, so a
    // file copied onto itself keeps its content.
    zv::unique_malloc<char> content;
    uint32_t size = 0;
    zv_status status = zv_util_read_named_file(src_path, zv::out_block(content), &size, nullptr);
    if (status != ZV_OK)
        return status;
    return zv_util_write_named_file(dst_path, 1, content.get(), size, nullptr);
}

}  // extern "C"

// ---- Hexadecimal byte printers ----

extern "C" {

ZV_EXPORT zv_status zv_util_fprintf_bytes(FILE *stream, const void *bytes, uint32_t n)
{
    if (stream == nullptr || bytes == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    // The digits go out in chunks; errors of the stream are not examined.
    const auto *at = static_cast<const uint8_t *>(bytes);
    char chunk[512];
    while (n > 0) {
        uint32_t take = std::min<uint32_t>(n, sizeof chunk / 2);
        zv::put_hex_pairs(chunk, at, take);
        std::fwrite(chunk, 1, 2 * size_t{take}, stream);
        at += take;
        n -= take;
    }
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_printf_bytes(const void *bytes, uint32_t n)
{
    if (bytes == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    return zv_util_fprintf_bytes(stdout, bytes, n);
}

}  // extern "C"
