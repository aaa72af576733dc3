// Descriptor-level file operations.
#include <zvutil/file.h>
#include <zvutil/format.h>

#include <algorithm>
#include <cstdarg>
#include <cstring>
#include <emmintrin.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <unistd.h>

#include "cpu.h"
#include "file/file_internal.h"

namespace {

constexpr int kIdleBudget = 5;
constexpr int32_t kLargestSize = INT32_MAX;

// Status queries go through the 64-bit interface: on i386 the ordinary one
// also fails (EOVERFLOW) for a small file whose inode number needs more than
// 32 bits. Where offsets are 32 bits the size bound of the ordinary interface
// is applied here instead, so a file of 2 GiB or more still fails with
// EOVERFLOW.
bool past_size_bound(const struct stat64 &st)
{
    if (st.st_size <= kLargestSize)
        return false;
    errno = EOVERFLOW;
    return true;
}

int apply_size_bound(int result, const struct stat64 &st)
{
    return result == 0 && sizeof(off_t) < sizeof(st.st_size) && past_size_bound(st) ? -1 : result;
}

int fd_status(int fd, struct stat64 *st)
{
    return apply_size_bound(::fstat64(fd, st), *st);
}

int path_status(const char *path, struct stat64 *st)
{
    return apply_size_bound(::stat64(path, st), *st);
}

// Newlines among |n| bytes, 16 at a time: each compare adds 1 to the byte
// counters of its hits (by subtracting -1). Past kMaxNewlineRun bytes (255
// compares) a counter could wrap.
constexpr size_t kMaxNewlineRun = 255 * 16;

ZV_TARGET("sse2") uint32_t count_newlines_sse2(const char *bytes, size_t n)
{
    const __m128i newline = _mm_set1_epi8('\n');
    __m128i counters = _mm_setzero_si128();
    size_t i = 0;
    for (; n - i >= 16; i += 16) {
        __m128i in = _mm_loadu_si128(reinterpret_cast<const __m128i *>(bytes + i));
        counters = _mm_sub_epi8(counters, _mm_cmpeq_epi8(in, newline));
    }
    __m128i sums = _mm_sad_epu8(counters, _mm_setzero_si128());
    auto count = static_cast<uint32_t>(_mm_cvtsi128_si32(sums) +
                                       _mm_cvtsi128_si32(_mm_srli_si128(sums, 8)));
    return count + static_cast<uint32_t>(std::count(bytes + i, bytes + n, '\n'));
}

uint32_t count_newlines(const char *bytes, size_t n)
{
    if (zv::cpu::has(zv::cpu::kSSE2))
        return count_newlines_sse2(bytes, n);
    return static_cast<uint32_t>(std::count(bytes, bytes + n, '\n'));
}

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_open(int32_t *fd_out, int32_t *errno_out, int32_t flags,
                                 uint32_t mode, const char *format, ...)
{
    if (fd_out == nullptr || format == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    zv::unique_malloc<char> path;
    va_list args;
    va_start(args, format);
    zv_status status = zv_util_vasprintf(zv::out_block(path), format, args, errno_out);
    va_end(args);
    if (status != ZV_OK)
        return status;  // the formatter has recorded the frame
    // Always the three-argument form; the flags go through untouched.
    *fd_out = ::open(path.get(), flags, static_cast<mode_t>(mode));
    if (*fd_out < 0)
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_whole_write(int32_t fd, const void *buf, int32_t len,
                                        int32_t *errno_out)
{
    if (buf == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (len < 0)
        return ZV_FAIL(ZV_ERR_OVERFLOW);
    const auto *bytes = static_cast<const char *>(buf);
    int32_t offset = 0;
    int idle = kIdleBudget;
    while (offset < len) {
        ssize_t n = ::write(fd, bytes + offset, static_cast<size_t>(len - offset));
        if (n < 0)
            return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
        if (n == 0) {
            if (--idle == 0)
                return static_cast<zv_status>(-EAGAIN);
            continue;
        }
        offset += static_cast<int32_t>(n);
        idle = kIdleBudget;
    }
    return ZV_OK;
}

ZV_EXPORT int32_t zv_util_whole_read(int32_t fd, void *buf, int32_t len)
{
    if (buf == nullptr || len < 0)
        return -EINVAL;
    auto *bytes = static_cast<char *>(buf);
    int32_t offset = 0;
    int idle = kIdleBudget;
    while (offset < len) {
        ssize_t n = ::read(fd, bytes + offset, static_cast<size_t>(len - offset));
        if (n < 0)
            return static_cast<int32_t>(n);
        if (n == 0) {
            if (--idle == 0)
                return -EAGAIN;
            continue;
        }
        offset += static_cast<int32_t>(n);
        idle = kIdleBudget;
    }
    return offset;
}

ZV_EXPORT zv_status zv_util_read_file(int32_t fd, char **buf_out, uint32_t *size_out,
                                      int32_t *errno_out)
{
    if (buf_out == nullptr || size_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    struct stat64 st;
    // With 64-bit offsets the query takes any size, but the read below counts
    // in 32 bits: refuse what would not fit as a 32-bit platform would.
    if (fd_status(fd, &st) != 0 || past_size_bound(st))
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    auto size = static_cast<int32_t>(st.st_size);
    *size_out = static_cast<uint32_t>(size);

    zv::unique_malloc<char> buffer(static_cast<char *>(std::malloc(static_cast<size_t>(size) + 1)));
    if (!buffer) {
        *buf_out = nullptr;
        return ZV_ERRNO_FAIL(ZV_ERR_NO_MEMORY, errno_out);
    }
    if (zv_util_whole_read(fd, buffer.get(), size) != size) {
        *buf_out = nullptr;
        return ZV_FAIL(ZV_ERR_SYSTEM);
    }
    buffer.get()[size] = '\0';
    *buf_out = buffer.release();
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_count_lines(int32_t fd, uint32_t *count_out, int32_t *errno_out)
{
    if (count_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (fd < 0)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    off_t start = ::lseek(fd, 0, SEEK_CUR);
    struct stat64 st;
    if (start == -1 || fd_status(fd, &st) != 0 || ::lseek(fd, 0, SEEK_SET) == -1)
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    // Every way out puts the position back where it was.
    struct Restore {
        int fd;
        off_t start;
        ~Restore()
        {
            int saved = errno;
            ::lseek(fd, start, SEEK_SET);
            errno = saved;
        }
    } restore{fd, start};

    *count_out = 0;
    char chunk[1024];
    static_assert(sizeof chunk <= kMaxNewlineRun);
    for (off64_t consumed = 0; consumed < st.st_size;) {
        auto want = static_cast<size_t>(std::min<off64_t>(sizeof chunk, st.st_size - consumed));
        ssize_t n = ::read(fd, chunk, want);
        if (n < 0)
            return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
        if (n == 0)
            break;  // the file shrank under us: count what was there
        consumed += n;
        *count_out += count_newlines(chunk, static_cast<size_t>(n));
    }
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_get_file_size(const char *path, int64_t *size_out)
{
    if (path == nullptr || size_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    zv::unique_fd fd(::open(path, O_RDONLY | O_CLOEXEC));
    if (!fd)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    struct stat64 st;
    int result = fd_status(fd.get(), &st);
    fd.reset();
    if (result != 0)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    *size_out = st.st_size;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_truncate_file(const char *path, int32_t length, int32_t *errno_out)
{
    if (path == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (::truncate(path, length) == -1)
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_delete_file(const char *path, int32_t *errno_out)
{
    if (path == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (::unlink(path) != 0)
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_query_file_exists(const char *path, uint32_t *exists_out)
{
    if (path == nullptr || exists_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    struct stat64 st;
    if (path_status(path, &st) == 0) {
        *exists_out = 1;
        return ZV_OK;
    }
    if (errno == ENOENT) {
        *exists_out = 0;
        return ZV_OK;
    }
    return ZV_FAIL(ZV_ERR_SYSTEM);
}

}  // extern "C"
