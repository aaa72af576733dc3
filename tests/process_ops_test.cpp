// Signal dispositions, the /proc process lookup and the bounded child wait.
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <csignal>
#include <cstring>
#include <dirent.h>
#include <string>
#include <sys/wait.h>
#include <vector>

#include "process/process_internal.h"
#include "support/process_support.h"
#include "support/scratch.h"
#include <zvutil/process.h>

namespace {

using Handler = void (*)(int);

Handler disposition(int sig)
{
    struct sigaction current;
    sigaction(sig, nullptr, &current);
    return current.sa_handler;
}

void note_signal(int) {}

TEST(Signals, Dispositions)
{
    zvt::in_child(false, [] {
        signal(SIGTERM, note_signal);
        for (int sig : {SIGKILL, SIGTERM, SIGSTOP, 0, 32, 40, -1})
            EXPECT_EQ(zv_util_ignore_signal(sig), ZV_OK) << sig;
        EXPECT_EQ(disposition(SIGRTMIN + 8), SIG_DFL);
        EXPECT_EQ(zv_util_ignore_signal(SIGUSR1), ZV_OK);
        EXPECT_EQ(disposition(SIGUSR1), SIG_IGN);
        EXPECT_EQ(zv_util_reset_signal(SIGUSR1), ZV_OK);
        EXPECT_EQ(disposition(SIGUSR1), SIG_DFL);

        ASSERT_EQ(zv_util_ignore_common_signals(), ZV_OK);
        for (int sig = 1; sig <= 31; sig++) {
            Handler expected = sig == SIGTERM ? note_signal : SIG_IGN;
            EXPECT_TRUE(sig == SIGKILL || sig == SIGSTOP || disposition(sig) == expected) << sig;
        }
        EXPECT_EQ(disposition(SIGRTMIN + 2), SIG_DFL) << "real-time signals left alone";
        // sigaction refuses these: no frame.
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_reset_signal(SIGKILL));
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_reset_signal(SIGSTOP));
        EXPECT_NO_FRAMES();

        const char *invalid = "Invalid or unsupported signal value";
        zvt::expect_failures({
            {"zv_util_reset_signal", ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_reset_signal(0)), nullptr,
             1, zvt::kUntouched, invalid},
            {"zv_util_reset_signal", ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_reset_signal(32)), nullptr,
             1, zvt::kUntouched, invalid},
        });

        // A failing sigaction gives no frame and does not stop the walk.
        zvt::clear_trace();
        EXPECT_STATUS(ZV_ERR_SYSTEM, zvt::with_fault("sigaction", 1, EINVAL,
                                                     [] { return zv_util_ignore_signal(SIGHUP); }));
        EXPECT_STATUS(ZV_ERR_SYSTEM, zvt::with_fault("sigaction", 1, EINVAL,
                                                     [] { return zv_util_reset_signal(SIGHUP); }));
        signal(SIGQUIT, SIG_DFL);
        signal(SIGSYS, SIG_DFL);
        zvt::fault_arm("sigaction", 3, EINVAL);  // SIGQUIT
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_ignore_common_signals());
        EXPECT_EQ(zvt::fault_calls("sigaction"), 28u);
        zvt::fault_clear();
        EXPECT_EQ(disposition(SIGQUIT), SIG_DFL);
        EXPECT_EQ(disposition(SIGSYS), SIG_IGN) << "the walk went on";
        EXPECT_NO_FRAMES();
    });
}

std::vector<uint32_t> lookup(const std::string &name, int mode)
{
    uint32_t *pids = nullptr;
    uint32_t count = 12345;
    EXPECT_EQ(zv_util_pid_of(name.c_str(), mode, &pids, &count), ZV_OK);
    std::vector<uint32_t> result(pids, pids + count);
    std::free(pids);
    return result;
}

bool has(const std::vector<uint32_t> &pids, pid_t pid)
{
    return std::find(pids.begin(), pids.end(), static_cast<uint32_t>(pid)) != pids.end();
}

TEST(PidOf, MatchModesAndOrder)
{
    std::string name = "zvt-pidof-" + std::to_string(getpid());
    std::vector<pid_t> sleepers;
    std::vector<std::string> texts;
    for (int i = 0; i < 3; i++) {
        sleepers.push_back(zvt::start_sleeper(name));
        texts.push_back(std::to_string(sleepers.back()));
    }
    std::sort(texts.begin(), texts.end());  // /proc names in text order
    std::vector<uint32_t> expected;
    for (const std::string &text : texts)
        expected.push_back(static_cast<uint32_t>(std::stoul(text)));

    EXPECT_EQ(lookup(name, 1), expected);
    EXPECT_EQ(lookup(name.substr(4), 0), expected) << "a fragment";
    EXPECT_TRUE(lookup(name.substr(4), 1).empty()) << "a fragment is no exact match";
    uint32_t count = 0;
    EXPECT_EQ(zv_util_pid_of(name.c_str(), 1, nullptr, &count), ZV_OK);
    EXPECT_EQ(count, 3u);

    // A zombie's command line is empty: an empty name matches it exactly,
    // and as a fragment every process.
    pid_t zombie = fork();
    if (zombie == 0)
        _exit(0);
    siginfo_t info = {};
    waitid(P_PID, zombie, &info, WEXITED | WNOWAIT);
    EXPECT_TRUE(has(lookup("", 1), zombie));
    EXPECT_FALSE(has(lookup("", 1), sleepers[0]));
    std::vector<uint32_t> all = lookup("", 0);
    EXPECT_TRUE(has(all, zombie) && has(all, sleepers[0]) && has(all, getpid()));
    waitpid(zombie, nullptr, 0);
    for (pid_t pid : sleepers)
        zvt::stop_child(pid);
    EXPECT_NO_FRAMES();
}

TEST(PidOf, NothingQualifiesOrNothingReadable)
{
    zvt::LogCapture log;
    uint32_t *pids = reinterpret_cast<uint32_t *>(1);
    uint32_t count = 12345;
    // No cmdline file opens: every entry is dropped by the filter.
    zvt::fault_arm("open", 1, EACCES, ~0u);
    EXPECT_EQ(zv_util_pid_of("", 0, &pids, &count), ZV_OK);
    zvt::fault_clear();
    EXPECT_EQ(pids, nullptr);
    EXPECT_EQ(count, 0u);
    EXPECT_TRUE(zvt::LogIs(log, {{7, "Nothing suitable in /proc"}}));

    // Command lines that cannot be read are skipped without a word.
    log.clear();
    zvt::fault_arm("read", 1, EIO, ~0u);
    EXPECT_EQ(zv_util_pid_of("", 0, &pids, &count), ZV_OK);
    zvt::fault_clear();
    EXPECT_EQ(count, 0u);
    std::free(pids);
    EXPECT_TRUE(zvt::LogIs(log, {}));
    EXPECT_NO_FRAMES();
}

unsigned process_dirs()
{
    unsigned n = 0;
    DIR *dir = opendir("/proc");
    while (struct dirent *e = readdir(dir))
        n += e->d_type == DT_DIR && std::isdigit(static_cast<unsigned char>(e->d_name[0]));
    closedir(dir);
    return n;
}

// The filter allocates once per process directory, so the lookup's own
// allocations follow as many as there are processes. Processes come and go:
// repeat until the |after|th allocation past them failed as intended.
void expect_allocation_failure(unsigned after, bool want_pids, const char *line,
                               std::initializer_list<zvt::ExpectedFrame> frames)
{
    for (int attempt = 0; attempt < 50; attempt++) {
        zvt::clear_trace();
        zvt::LogCapture log;
        uint32_t *pids = reinterpret_cast<uint32_t *>(1);
        uint32_t count = 12345;
        size_t heap = zvt::heap_in_use();
        zvt::fault_arm("alloc", process_dirs() + after, ENOMEM);
        zv_status status = zv_util_pid_of("zvt-none", 0, want_pids ? &pids : nullptr, &count);
        zvt::fault_clear();
        if (status == ZV_OK || log.lines().size() != 1 || log.lines()[0].message != line) {
            if (status == ZV_OK && want_pids)
                std::free(pids);
            continue;
        }
        EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
        EXPECT_TRUE(zvt::FramesAre(frames));
        // A failed path is passed on: frames first, then the line.
        EXPECT_EQ(log.lines()[0].frames_before, frames.size() == 1 ? 0u : 2u);
        EXPECT_EQ(count, 12345u);
        EXPECT_TRUE(!want_pids || pids == nullptr) << "a failure hands out no array";
        EXPECT_EQ(zvt::heap_in_use(), heap);
        return;
    }
    ADD_FAILURE() << "the intended allocation never failed";
}

TEST(PidOf, Failures)
{
    expect_allocation_failure(1, true, "Failed to allocate memory",
                              {{"zv_util_pid_of", ZV_ERR_NO_MEMORY}});
    for (bool want_pids : {false, true})
        expect_allocation_failure(want_pids ? 2 : 1, want_pids, "Failed to allocate path",
                                  {{"zv_util_vasprintf", ZV_ERR_NO_MEMORY},
                                   {"zv_util_pid_of", ZV_ERR_NO_MEMORY}});
    uint32_t count = 12345;
    zvt::expect_failures({{"zv_util_pid_of", ZV_ERR_SYSTEM,
                           ZVT_CALL(zv_util_pid_of("", 0, nullptr, &count)), "scandir", 1,
                           zvt::kUntouched, "Failed to open /proc"}});
    EXPECT_EQ(count, 12345u);
}

TEST(VetPossibleDirectory, KeepsLiveProcessDirectoriesOnly)
{
    std::string self = std::to_string(getpid());
    struct Row {
        unsigned char type;
        std::string name;
        int keep;
    } rows[] = {
        {DT_DIR, self, 1},       {DT_DIR, "1x", 0},      {DT_DIR, "self", 0},
        {DT_DIR, "999999999", 0}, {DT_REG, self, 0},     {DT_UNKNOWN, self, 0},
    };
    struct dirent64 entry = {};
    for (const Row &row : rows) {
        entry.d_type = row.type;
        std::strcpy(entry.d_name, row.name.c_str());
        EXPECT_EQ(vet_possible_directory(&entry), row.keep) << row.name;
    }
    EXPECT_EQ(vet_possible_directory(nullptr), 0);
    EXPECT_NO_FRAMES();

    std::strcpy(entry.d_name, self.c_str());
    entry.d_type = DT_DIR;
    zvt::LogCapture log;
    EXPECT_EQ(zvt::with_fault("alloc", 1, ENOMEM, [&] { return vet_possible_directory(&entry); }),
              0);
    EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_NO_MEMORY},
                  {"vet_possible_directory", ZV_ERR_NO_MEMORY});
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to allocate path"}}));
    EXPECT_EQ(log.lines().at(0).frames_before, 2u);
}

pid_t ended_child()
{
    pid_t pid = fork();
    if (pid == 0)
        _exit(0);
    siginfo_t info = {};
    waitid(P_PID, pid, &info, WEXITED | WNOWAIT);
    return pid;
}

bool was_killed(pid_t pid)
{
    int status = 0;
    return waitpid(pid, &status, 0) == pid && WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL;
}

TEST(AwaitChild, EndsOrIsKilled)
{
    EXPECT_EQ(zv_util_await_child_timeout(ended_child(), 5), ZV_OK);
    pid_t pid = fork();
    if (pid == 0) {
        usleep(100000);
        _exit(3);
    }
    EXPECT_EQ(zv_util_await_child_timeout(pid, 30), ZV_OK) << "ended while waited for";
    EXPECT_EQ(waitpid(pid, nullptr, WNOHANG), -1) << "already reaped";
    EXPECT_NO_FRAMES();

    zvt::expect_failures({
        {"zv_util_await_child_timeout", ZV_ERR_TIMEOUT, [] {
             pid_t sleeper = zvt::start_sleeper("zvt-await");
             zv_status status = zv_util_await_child_timeout(sleeper, 0);
             EXPECT_TRUE(was_killed(sleeper));
             return status;
         }},
        {"zv_util_await_child_timeout", ZV_ERR_SYSTEM, ZVT_CALL(zv_util_await_child_timeout(getpid(), 5)),
         nullptr, 1, zvt::kUntouched, "Failed to wait for child"},
    });
}

// A deadline that cannot be set, or a clock that cannot be read, ends the
// wait at the first poll instead of letting it run without bound.
TEST(AwaitChild, NoUsableDeadline)
{
    zvt::LogCapture quiet;
    pid_t sleeper = zvt::start_sleeper("zvt-await");
    EXPECT_STATUS(ZV_ERR_TIMEOUT, zv_util_await_child_timeout(sleeper, -1));
    EXPECT_TRUE(was_killed(sleeper));
    EXPECT_FRAMES({"zv_util_abs_time_offset", ZV_ERR_BAD_VALUE},
                  {"zv_util_future_timeout", ZV_ERR_BAD_VALUE},
                  {"zv_util_await_child_timeout", ZV_ERR_TIMEOUT});

    zvt::clear_trace();
    sleeper = zvt::start_sleeper("zvt-await");
    zvt::fault_arm("clock_gettime", 2, EINVAL);  // the first query
    EXPECT_STATUS(ZV_ERR_TIMEOUT, zv_util_await_child_timeout(sleeper, 30));
    zvt::fault_clear();
    EXPECT_TRUE(was_killed(sleeper));
    EXPECT_FRAMES({"zv_util_query_timeout_expired", ZV_ERR_SYSTEM},
                  {"zv_util_await_child_timeout", ZV_ERR_TIMEOUT});
}

TEST(AwaitChild, ChildrenReapedByTheKernelWhenSigchldIsIgnored)
{
    zvt::in_child(false, [] {
        ASSERT_EQ(zv_util_ignore_common_signals(), ZV_OK);
        zvt::LogCapture quiet;
        pid_t pid = fork();
        if (pid == 0)
            _exit(0);
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_await_child_timeout(pid, 5));
        EXPECT_FRAMES({"zv_util_await_child_timeout", ZV_ERR_SYSTEM});
    });
}

}  // namespace
