// Process lookup through /proc, a bounded wait for a child, and signal
// dispositions.
#include <zvutil/format.h>
#include <zvutil/process.h>

#include <cctype>
#include <csignal>
#include <cstring>
#include <fcntl.h>
#include <sys/wait.h>

#include "process/process_internal.h"
#include "time/time_internal.h"

namespace {

constexpr int kLastClassicSignal = 31;
// The head of a command line the lookup compares; the buffer keeps a NUL.
constexpr size_t kCmdlineBuffer = 300;

bool never_ignored(int sig)
{
    return sig == SIGKILL || sig == SIGTERM || sig == SIGSTOP;
}

// sigaction with |handler|, an empty mask and no flags; true on success.
bool set_disposition(int sig, void (*handler)(int))
{
    struct sigaction action;
    std::memset(&action, 0, sizeof action);
    action.sa_handler = handler;
    sigemptyset(&action.sa_mask);
    return sigaction(sig, &action, nullptr) == 0;
}

struct ScanList {
    struct dirent64 **entries = nullptr;
    int count = 0;
    ~ScanList() { zv::free_array(entries, static_cast<size_t>(count)); }
};

}  // namespace

namespace zv {

zv_status open_cmdline(const char *pid_text, unique_fd &fd)
{
    unique_malloc<char> path;
    zv_status status =
        zv_util_asprintf(out_block(path), nullptr, "/proc/%s/cmdline", pid_text);
    if (status == ZV_OK)
        fd.reset(open(path.get(), O_RDONLY | O_CLOEXEC));
    return status;
}

int vet_possible_directory(const struct dirent64 *entry)
{
    if (entry == nullptr || entry->d_type != DT_DIR)
        return 0;
    for (const char *c = entry->d_name; *c != '\0'; c++) {
        if (!std::isdigit(static_cast<unsigned char>(*c)))
            return 0;
    }
    unique_fd fd;
    if (zv_status status = open_cmdline(entry->d_name, fd); status != ZV_OK) {
        ZV_FAIL_THEN_LOG(status, "Failed to allocate path\n");
        return 0;
    }
    return fd ? 1 : 0;
}

zv_status zv_util_pid_of(const char *name, int match_mode, uint32_t **pids_out,
                         uint32_t *count_out)
{
    ScanList scan;
    scan.count = scandir64("/proc", &scan.entries, vet_possible_directory, alphasort64);
    if (scan.count < 0) {
        scan.count = 0;
        return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to open /proc");
    }
    // The array is handed out only on success: a failure leaves no block
    // behind for the caller to release.
    if (pids_out != nullptr)
        *pids_out = nullptr;
    if (scan.count == 0) {
        ZV_LOG(zv::kLogNote, "Nothing suitable in /proc\n");
        *count_out = 0;
        return ZV_OK;
    }

    unique_malloc<uint32_t> pids;
    if (pids_out != nullptr) {
        pids.reset(static_cast<uint32_t *>(std::calloc(scan.count, sizeof(uint32_t))));
        if (!pids)
            return ZV_LOG_FAIL(ZV_ERR_NO_MEMORY, "Failed to allocate memory\n");
    }
    uint32_t matches = 0;
    for (int i = 0; i < scan.count; i++) {
        const char *entry_name = scan.entries[i]->d_name;
        unique_fd fd;
        if (zv_status status = open_cmdline(entry_name, fd); status != ZV_OK)
            return ZV_FAIL_THEN_LOG(status, "Failed to allocate path\n");
        // A process that ended since the scan is skipped.
        char cmdline[kCmdlineBuffer] = {};
        if (!fd || read(fd.get(), cmdline, sizeof cmdline - 1) < 0)
            continue;
        bool match = match_mode == 1 ? std::strcmp(cmdline, name) == 0
                                     : std::strstr(cmdline, name) != nullptr;
        if (!match)
            continue;
        if (pids)
            std::sscanf(entry_name, "%u", &pids.get()[matches]);
        matches++;
    }
    if (pids_out != nullptr)
        *pids_out = pids.release();
    *count_out = matches;
    return ZV_OK;
}

zv_status zv_util_await_child_timeout(pid_t pid, int32_t timeout_seconds)
{
    // A deadline that cannot be set stays at the epoch, and a clock that
    // cannot be read counts as past the deadline: the wait stays bounded.
    struct timespec deadline = {};
    (void)zv_util_future_timeout(&deadline, timeout_seconds, 1);
    for (;;) {
        pid_t ended = waitpid(pid, nullptr, WNOHANG);
        if (ended == -1)
            return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Failed to wait for child\n");
        if (ended != 0)
            return ZV_OK;
        uint32_t expired = 1;
        (void)zv_util_query_timeout_expired(&deadline, &expired);
        if (expired != 0) {
            kill(pid, SIGKILL);
            return ZV_FAIL(ZV_ERR_TIMEOUT);
        }
        sleep(1);
    }
}

}  // namespace zv

extern "C" {

ZV_EXPORT zv_status zv_util_ignore_signal(int sig)
{
    if (never_ignored(sig) || sig < 1 || sig > kLastClassicSignal)
        return ZV_OK;
    // The signal functions report a failed sigaction without a frame.
    return set_disposition(sig, SIG_IGN) ? ZV_OK : ZV_ERR_SYSTEM;
}

ZV_EXPORT zv_status zv_util_ignore_common_signals(void)
{
    zv_status status = ZV_OK;
    for (int sig = 1; sig <= kLastClassicSignal; sig++) {
        if (!never_ignored(sig) && !set_disposition(sig, SIG_IGN))
            status = ZV_ERR_SYSTEM;
    }
    return status;
}

ZV_EXPORT zv_status zv_util_reset_signal(int sig)
{
    if (sig < 1 || sig > kLastClassicSignal)
        return ZV_LOG_FAIL(ZV_ERR_BAD_VALUE, "Invalid or unsupported signal value");
    return set_disposition(sig, SIG_DFL) ? ZV_OK : ZV_ERR_SYSTEM;  // no frame, as above
}

}  // extern "C"
