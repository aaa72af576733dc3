// Library-internal helpers shared by every family: the failure convention,
// owning handles and small utilities. Nothing here is exported.
//
// Every internal function lives in namespace zv, or in an unnamed namespace
// when one source uses it. A helper that records trace frames or log lines
// keeps the name callers see in them (__func__ is the unqualified name, as in
// zv::map_pid_to_exe): renaming it changes the library's observable output.
#pragma once

#include <zverrortrace.h>
#include <zvlog.h>
#include <zvutil/status.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string_view>
#include <unistd.h>

#define ZV_INTERNAL __attribute__((visibility("hidden")))

namespace zv {

inline constexpr int32_t kLogError = 3;
inline constexpr int32_t kLogNote = 7;
inline constexpr uint32_t kLogMask = 128;

// Records one trace frame and yields |status|, so that a failure path reads as
// `return ZV_FAIL(...)`.
[[gnu::cold]] inline zv_status record_frame(zv_status status, const char *function,
                                            const char *file, int32_t line)
{
    zv_trace_save(function, file, line, status);
    return status;
}

inline void set_errno_out(int32_t *errno_out, int value)
{
    if (errno_out != nullptr)
        *errno_out = value;
}

// A new NUL-terminated copy of the |length| bytes at |text|; NULL when the
// block cannot be allocated.
inline char *copy_text(const char *text, size_t length)
{
    auto *copy = static_cast<char *>(std::malloc(length + 1));
    if (copy != nullptr) {
        std::memcpy(copy, text, length);
        copy[length] = '\0';
    }
    return copy;
}

// A lookup of the bytes of |alphabet|: each one's position in it, counted
// modulo |period| so that repeated runs (the two cases of the hexadecimal
// digits) share their values; |absent| for every other byte.
constexpr std::array<uint8_t, 256> inverse_table(std::string_view alphabet, size_t period,
                                                 uint8_t absent)
{
    std::array<uint8_t, 256> values{};
    values.fill(absent);
    for (size_t i = 0; i < alphabet.size(); i++)
        values[static_cast<unsigned char>(alphabet[i])] = static_cast<uint8_t>(i % period);
    return values;
}

// Releases |count| heap blocks (last first) and the heap array that holds
// them.
template <class T>
void free_array(T **items, size_t count)
{
    while (count > 0)
        std::free(items[--count]);
    std::free(items);
}

struct FreeDeleter {
    void operator()(void *block) const noexcept { std::free(block); }
};
template <class T>
using unique_malloc = std::unique_ptr<T, FreeDeleter>;

// Hands a callee's `T **` result to an owner: `callee(out_block(owner))`
// leaves whatever block the callee stored, NULL included, owned by |owner| at
// the end of the statement.
template <class T>
class OutBlock {
public:
    explicit OutBlock(unique_malloc<T> &owner) : owner_(owner) {}
    OutBlock(const OutBlock &) = delete;
    OutBlock &operator=(const OutBlock &) = delete;
    ~OutBlock() { owner_.reset(block_); }
    operator T **() { return &block_; }

private:
    unique_malloc<T> &owner_;
    T *block_ = nullptr;
};
template <class T>
OutBlock<T> out_block(unique_malloc<T> &owner)
{
    return OutBlock<T>(owner);
}

// Closing on the way out keeps errno as the failure left it, as unique_fd does.
struct FileCloser {
    void operator()(FILE *stream) const noexcept
    {
        int saved = errno;
        std::fclose(stream);
        errno = saved;
    }
};
using unique_file = std::unique_ptr<FILE, FileCloser>;

// What the library opens for itself and closes before returning is opened
// close-on-exec (O_CLOEXEC, the "e" stream mode), so that a program started
// meanwhile by another thread does not inherit it. What the caller receives
// is opened exactly as asked.

// Owns a descriptor; closing on the way out keeps errno as the failure left it.
class unique_fd {
public:
    unique_fd() = default;
    explicit unique_fd(int fd) : fd_(fd) {}
    unique_fd(const unique_fd &) = delete;
    unique_fd &operator=(const unique_fd &) = delete;
    unique_fd(unique_fd &&other) noexcept : fd_(other.release()) {}
    unique_fd &operator=(unique_fd &&other) noexcept
    {
        reset(other.release());
        return *this;
    }
    ~unique_fd() { reset(); }

    int get() const { return fd_; }
    explicit operator bool() const { return fd_ >= 0; }
    int release()
    {
        int fd = fd_;
        fd_ = -1;
        return fd;
    }
    void reset(int fd = -1)
    {
        if (fd_ >= 0) {
            int saved = errno;
            ::close(fd_);
            errno = saved;
        }
        fd_ = fd;
    }

private:
    int fd_ = -1;
};

}  // namespace zv

// The source-file constant: __FILE__ is made relative to the repository by
// -fmacro-prefix-map, so no build machine's path reaches a frame.
#define ZV_SOURCE_FILE __FILE__

// Records a frame for the enclosing function and yields |status|.
#define ZV_FAIL(status) ::zv::record_frame((status), __func__, ZV_SOURCE_FILE, __LINE__)

// A failed system call: its errno through |errno_out| (when given), then the
// frame.
#define ZV_ERRNO_FAIL(status, errno_out)                                                  \
    (::zv::set_errno_out((errno_out), errno), ZV_FAIL(status))

// A callee's failure that this function answers with two frames of its own
// (the option parse, the /proc lookup of a PID file's owner).
#define ZV_FAIL_TWICE(status) ((void)ZV_FAIL(status), ZV_FAIL(status))

// Log formats are passed as the messages give them; some end in "\n", some
// do not. The logger drops one trailing newline, so both forms deliver the
// same line.

// A failure the function detects itself: log line (level 3) first, then frame.
#define ZV_LOG_FAIL(status, ...)                                                          \
    (zv_util_log_internal(::zv::kLogError, ::zv::kLogMask, __func__, ZV_SOURCE_FILE,      \
                          __LINE__, __VA_ARGS__),                                         \
     ZV_FAIL(status))

// As ZV_LOG_FAIL, with the text of the saved |errnum| appended by the logger.
#define ZV_PERROR_FAIL(errnum, status, format)                                            \
    (zv_util_log_internal_perror((errnum), ::zv::kLogError, ::zv::kLogMask, __func__,     \
                                 ZV_SOURCE_FILE, __LINE__, (format)),                     \
     ZV_FAIL(status))

// A callee's failure passed on: own frame first, then the log line.
#define ZV_FAIL_THEN_LOG(status, ...)                                                     \
    ((void)ZV_FAIL(status),                                                               \
     zv_util_log_internal(::zv::kLogError, ::zv::kLogMask, __func__, ZV_SOURCE_FILE,      \
                          __LINE__, __VA_ARGS__),                                         \
     (status))

// A plain log line, for paths that go on or that record no frame.
#define ZV_LOG(level, ...)                                                                \
    zv_util_log_internal((level), ::zv::kLogMask, __func__, ZV_SOURCE_FILE, __LINE__,     \
                         __VA_ARGS__)
