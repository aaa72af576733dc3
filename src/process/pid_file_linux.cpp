// Claiming a PID file, so that only one instance of a program runs.
#include <zvutil/file.h>
#include <zvutil/format.h>
#include <zvutil/memory.h>
#include <zvutil/process.h>

#include <cstring>
#include <fcntl.h>
#include <sys/file.h>

#include "process/process_internal.h"

namespace {

constexpr uint32_t kMaxNameLength = 100;
constexpr uint32_t kMaxPidDigits = 10;
constexpr mode_t kPidFileMode = 0664;

// The claim's descriptor; its exclusive lock is given back before it closes.
class LockedFile {
public:
    explicit LockedFile(int fd) : fd_(fd) {}
    ~LockedFile()
    {
        if (locked_)
            flock(fd_.get(), LOCK_UN);
    }
    bool valid() const { return static_cast<bool>(fd_); }
    void reset(int fd) { fd_.reset(fd); }
    bool lock()
    {
        locked_ = flock(fd_.get(), LOCK_EX | LOCK_NB) == 0;
        return locked_;
    }

private:
    zv::unique_fd fd_;
    bool locked_ = false;
};

// A PID file's content names a process only as 1 to 10 decimal digits that
// fit 32 bits; anything else ("self", "../1", digits and a newline) is stale
// and must never become a path under /proc.
bool parse_pid(const char *content, uint32_t size, uint32_t *pid)
{
    if (size == 0 || size > kMaxPidDigits)
        return false;
    uint64_t value = 0;
    for (uint32_t i = 0; i < size; i++) {
        if (content[i] < '0' || content[i] > '9')
            return false;
        value = value * 10 + static_cast<uint32_t>(content[i] - '0');
    }
    if (value > UINT32_MAX)
        return false;
    *pid = static_cast<uint32_t>(value);
    return true;
}

// Decides, with the lock held, whether the file may be taken over (ZV_OK) or
// a live process whose command line begins with |name| holds it
// (ZV_ERR_IN_USE, |*owner_pid| set). Any other status is a failure for the
// caller to record.
zv_status examine_holder(const char *path, const char *name, uint32_t *owner_pid)
{
    zv::unique_malloc<char> content;
    uint32_t size = 0;
    zv_status status = zv_util_read_named_file(path, zv::out_block(content), &size, nullptr);
    if (status != ZV_OK)
        return status;
    if (size == 0)
        return ZV_OK;
    uint32_t name_length = zv_util_strnlen(name, kMaxNameLength + 1);
    if (name_length > kMaxNameLength)
        return ZV_ERR_BAD_VALUE;
    uint32_t pid = 0;
    if (!parse_pid(content.get(), size, &pid))
        return ZV_OK;
    zv::unique_malloc<char> cmdline;
    status = zv::map_pid_to_exe(content.get(), zv::out_block(cmdline), name_length + 1);
    if (status != ZV_OK)
        return status;
    // Gone, empty (a zombie), or another program.
    if (!cmdline || std::strncmp(cmdline.get(), name, name_length) != 0)
        return ZV_OK;
    *owner_pid = pid;
    return ZV_ERR_IN_USE;
}

}  // namespace

namespace zv {

zv_status map_pid_to_exe(const char *pid_text, char **cmdline_out, uint32_t length)
{
    *cmdline_out = nullptr;
    unique_fd fd;
    if (zv_status status = open_cmdline(pid_text, fd); status != ZV_OK)
        return ZV_FAIL_TWICE(status);
    if (!fd && errno == ENOENT)
        return ZV_OK;  // no such process
    if (!fd)
        return ZV_FAIL(ZV_ERR_SYSTEM);

    unique_malloc<char> cmdline(static_cast<char *>(std::calloc(length + 1u, 1)));
    if (!cmdline)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    // A failed or empty read is no failure: the file counts as stale.
    ssize_t n = read(fd.get(), cmdline.get(), length);
    fd.reset();
    if (n > 0)
        *cmdline_out = cmdline.release();
    return ZV_OK;
}

zv_status write_pid_file(const char *path)
{
    unique_file stream(std::fopen(path, "we"));
    if (!stream)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    char digits[16];
    int length = std::snprintf(digits, sizeof digits, "%u", static_cast<unsigned>(getpid()));
    bool written = std::fwrite(digits, 1, static_cast<size_t>(length), stream.get()) ==
                       static_cast<size_t>(length) &&
                   std::fflush(stream.get()) == 0;
    // A file left empty or partial is a failed claim, not a success.
    bool closed = std::fclose(stream.release()) == 0;
    if (!written || !closed)
        return ZV_FAIL(ZV_ERR_SYSTEM);
    return ZV_OK;
}

}  // namespace zv

extern "C" {

ZV_EXPORT zv_status zv_util_claim_pid_file(const char *path, const char *name,
                                           uint32_t *owner_pid)
{
    if (path == nullptr || name == nullptr || owner_pid == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);

    LockedFile file(open(path, O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, kPidFileMode));
    if (!file.valid()) {
        int open_errno = errno;
        if (open_errno == EACCES)
            return ZV_FAIL(ZV_ERR_ACCESS);
        if (open_errno != EEXIST)
            return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Cannot access pid file %s (%m)", path);
        file.reset(open(path, O_RDWR | O_CLOEXEC));
        if (!file.valid()) {
            open_errno = errno;
            return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to open pid file %s errno %d", path,
                               open_errno);
        }
    }
    // A new file is locked too, and its content checked once the lock is
    // held: a rival that opened it in between may already have claimed it.
    if (!file.lock())
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to lock PID file");
    zv_status status = examine_holder(path, name, owner_pid);
    if (status != ZV_OK)
        return ZV_FAIL(status);
    return zv::write_pid_file(path);
}

}  // extern "C"
