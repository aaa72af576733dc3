// Signal dispositions and the /proc process lookup.
#include <gtest/gtest.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <string>
#include <unistd.h>
#include <vector>

#include "process/process_internal.h"
#include "support/fault.h"
#include "support/process_support.h"
#include "support/trace.h"
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

TEST(Signals, IgnoreCommonSignals)
{
    EXPECT_IN_CHILD([] {
        signal(SIGTERM, note_signal);
        ASSERT_EQ(zv_util_ignore_common_signals(), ZV_OK);
        for (int sig = 1; sig <= 31; sig++) {
            if (sig == SIGKILL || sig == SIGSTOP)
                continue;
            Handler expected = sig == SIGTERM ? note_signal : SIG_IGN;
            EXPECT_EQ(disposition(sig), expected) << "signal " << sig;
        }
        EXPECT_EQ(disposition(SIGRTMIN + 2), SIG_DFL) << "real-time signals left alone";
        EXPECT_NO_FRAMES();
    });
}

TEST(Signals, IgnoreOneSignal)
{
    EXPECT_IN_CHILD([] {
        signal(SIGTERM, note_signal);
        for (int sig : {SIGKILL, SIGTERM, SIGSTOP, 0, 32, 40, -1})
            EXPECT_EQ(zv_util_ignore_signal(sig), ZV_OK) << sig;
        EXPECT_EQ(disposition(SIGTERM), note_signal);
        EXPECT_EQ(disposition(SIGRTMIN + 8), SIG_DFL);

        EXPECT_EQ(zv_util_ignore_signal(SIGUSR1), ZV_OK);
        EXPECT_EQ(disposition(SIGUSR1), SIG_IGN);
        EXPECT_EQ(raise(SIGUSR1), 0) << "an ignored signal does no harm";
        EXPECT_NO_FRAMES();
    });
}

TEST(Signals, ResetSignal)
{
    EXPECT_IN_CHILD([] {
        signal(SIGUSR2, SIG_IGN);
        EXPECT_EQ(zv_util_reset_signal(SIGUSR2), ZV_OK);
        EXPECT_EQ(disposition(SIGUSR2), SIG_DFL);
        EXPECT_NO_FRAMES();

        for (int sig : {0, 32, -3}) {
            zvt::clear_trace();
            zvt::LogCapture log;
            EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_reset_signal(sig));
            EXPECT_FRAMES({"zv_util_reset_signal", ZV_ERR_BAD_VALUE});
            EXPECT_TRUE(zvt::LogIs(log, {{3, "Invalid or unsupported signal value"}}));
            EXPECT_EQ(log.lines().at(0).frames_before, 0u);
        }

        zvt::clear_trace();
        zvt::LogCapture log;
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_reset_signal(SIGKILL));
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_reset_signal(SIGSTOP));
        EXPECT_NO_FRAMES();
        EXPECT_TRUE(zvt::LogIs(log, {}));
    });
}

TEST(Signals, SigactionFailuresRecordNoFrame)
{
    EXPECT_IN_CHILD([] {
        zvt::LogCapture log;
        EXPECT_STATUS(ZV_ERR_SYSTEM, zvt::with_fault("sigaction", 1, EINVAL,
                                                     [] { return zv_util_ignore_signal(SIGHUP); }));
        EXPECT_STATUS(ZV_ERR_SYSTEM, zvt::with_fault("sigaction", 1, EINVAL,
                                                     [] { return zv_util_reset_signal(SIGHUP); }));
        // One failure does not stop the walk over the other signals.
        zvt::fault_arm("sigaction", 3, EINVAL);
        zv_status status = zv_util_ignore_common_signals();
        unsigned calls = zvt::fault_calls("sigaction");
        zvt::fault_clear();
        EXPECT_STATUS(ZV_ERR_SYSTEM, status);
        EXPECT_EQ(calls, 28u);
        EXPECT_EQ(disposition(SIGSYS), SIG_IGN);
        EXPECT_EQ(disposition(3), SIG_DFL) << "the failed one";
        EXPECT_NO_FRAMES();
        EXPECT_TRUE(zvt::LogIs(log, {}));
    });
}

// ---- /proc lookup ----

struct Sleepers {
    std::vector<pid_t> pids;
    ~Sleepers()
    {
        for (pid_t pid : pids)
            zvt::stop_child(pid);
    }
};

std::string unique_name(const char *tag)
{
    return "zvt-" + std::string(tag) + "-" + std::to_string(getpid());
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

// A sleeper shows in /proc only once it has run execve.
void await_exec(pid_t pid, const std::string &name)
{
    std::string path = "/proc/" + std::to_string(pid) + "/cmdline";
    for (int i = 0; i < 2000; i++) {
        char head[64] = {};
        FILE *f = std::fopen(path.c_str(), "r");
        if (f != nullptr) {
            size_t n = std::fread(head, 1, sizeof head - 1, f);
            std::fclose(f);
            if (n > 0 && name == head)
                return;
        }
        usleep(1000);
    }
    FAIL() << "pid " << pid << " never ran " << name;
}

TEST(PidOf, MatchModes)
{
    std::string name = unique_name("pidof");
    Sleepers sleepers;
    for (int i = 0; i < 3; i++) {
        sleepers.pids.push_back(zvt::start_sleeper(name.c_str()));
        await_exec(sleepers.pids.back(), name);
    }
    std::vector<std::string> texts;
    for (pid_t pid : sleepers.pids)
        texts.push_back(std::to_string(pid));
    std::sort(texts.begin(), texts.end());
    std::vector<uint32_t> expected;
    for (const std::string &text : texts)
        expected.push_back(static_cast<uint32_t>(std::stoul(text)));

    EXPECT_EQ(lookup(name, 1), expected) << "exact match, in text order of the /proc names";
    EXPECT_EQ(lookup(name.substr(4), 0), expected) << "a fragment";
    EXPECT_EQ(lookup(name.substr(4), 1), std::vector<uint32_t>{}) << "a fragment is no exact match";
    EXPECT_EQ(lookup(name + "x", 0), std::vector<uint32_t>{});

    uint32_t count = 0;
    EXPECT_EQ(zv_util_pid_of(name.c_str(), 1, nullptr, &count), ZV_OK);
    EXPECT_EQ(count, 3u);
    EXPECT_NO_FRAMES();
}

TEST(PidOf, EmptyCommandLine)
{
    // A zombie's command line is empty: only an empty name matches it exactly.
    pid_t zombie = fork();
    if (zombie == 0)
        _exit(0);
    ASSERT_GT(zombie, 0);
    std::string path = "/proc/" + std::to_string(zombie) + "/cmdline";
    for (int i = 0; i < 2000; i++) {
        char c;
        FILE *f = std::fopen(path.c_str(), "r");
        size_t n = f ? std::fread(&c, 1, 1, f) : 1;
        if (f)
            std::fclose(f);
        if (n == 0)
            break;
        usleep(1000);
    }
    auto has = [&](const std::vector<uint32_t> &pids) {
        return std::find(pids.begin(), pids.end(), static_cast<uint32_t>(zombie)) != pids.end();
    };
    EXPECT_TRUE(has(lookup("", 1)));
    std::vector<uint32_t> all = lookup("", 0);
    EXPECT_TRUE(has(all));
    EXPECT_TRUE(std::find(all.begin(), all.end(), static_cast<uint32_t>(getppid())) != all.end() ||
                getppid() == 0);
    int status;
    waitpid(zombie, &status, 0);
}

unsigned numeric_proc_dirs()
{
    unsigned n = 0;
    DIR *dir = opendir("/proc");
    while (struct dirent *e = readdir(dir)) {
        bool digits = e->d_type == DT_DIR && e->d_name[0] != '\0';
        for (const char *c = e->d_name; digits && *c; c++)
            digits = std::isdigit(static_cast<unsigned char>(*c));
        n += digits;
    }
    closedir(dir);
    return n;
}

// The filter makes one allocation per process directory; the allocation
// |after| those is failed. Processes come and go on a busy machine, so the
// call is repeated until the scan saw the count taken just before it.
template <class Check>
void fail_allocation_after_scan(unsigned after, bool want_array, Check check)
{
    for (int attempt = 0; attempt < 50; attempt++) {
        zvt::clear_trace();
        zvt::LogCapture log;
        uint32_t *pids = reinterpret_cast<uint32_t *>(1);
        uint32_t count = 12345;
        zvt::fault_arm("alloc", numeric_proc_dirs() + after, ENOMEM);
        zv_status status = zv_util_pid_of("zvt-nothing", 0, want_array ? &pids : nullptr, &count);
        zvt::fault_clear();
        if (status == ZV_OK) {
            if (want_array)
                std::free(pids);
            continue;
        }
        if (check(status, log, zvt::frames().size()))
            continue;
        if (want_array) {
            EXPECT_EQ(pids, nullptr);
        }
        EXPECT_EQ(count, 12345u);
        return;
    }
    FAIL() << "the failure never met the intended allocation";
}

TEST(PidOf, ResultArrayAllocationFails)
{
    size_t heap = zvt::heap_in_use();
    fail_allocation_after_scan(1, true, [](zv_status status, const zvt::LogCapture &log, size_t) {
        if (log.lines().empty() || log.lines()[0].message != "Failed to allocate memory")
            return true;  // another allocation failed: try again
        EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
        EXPECT_FRAMES({"zv_util_pid_of", ZV_ERR_NO_MEMORY});
        EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to allocate memory"}}));
        EXPECT_EQ(log.lines()[0].frames_before, 0u);
        return false;
    });
    EXPECT_EQ(zvt::heap_in_use(), heap);
}

TEST(PidOf, PathAllocationFails)
{
    size_t heap = zvt::heap_in_use();
    for (bool want_array : {false, true}) {
        fail_allocation_after_scan(want_array ? 2 : 1, want_array,
                                   [](zv_status status, const zvt::LogCapture &log, size_t frames) {
            if (frames != 2 || log.lines().size() != 1)
                return true;
            EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
            EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_NO_MEMORY},
                          {"zv_util_pid_of", ZV_ERR_NO_MEMORY});
            EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to allocate path"}}));
            EXPECT_EQ(log.lines()[0].frames_before, 2u) << "frame first, then the line";
            return false;
        });
    }
    EXPECT_EQ(zvt::heap_in_use(), heap) << "no array is left with the caller";
}

TEST(VetPossibleDirectory, KeepsLiveProcessDirectoriesOnly)
{
    struct Row {
        unsigned char type;
        std::string name;
        int keep;
    } rows[] = {
        {DT_DIR, std::to_string(getpid()), 1},
        {DT_DIR, "1x", 0},
        {DT_DIR, "self", 0},
        {DT_DIR, "999999999", 0},  // no such process
        {DT_REG, std::to_string(getpid()), 0},
        {DT_UNKNOWN, std::to_string(getpid()), 0},
    };
    for (const Row &row : rows) {
        struct dirent entry = {};
        entry.d_type = row.type;
        std::strcpy(entry.d_name, row.name.c_str());
        EXPECT_EQ(vet_possible_directory(&entry), row.keep) << row.name;
    }
    EXPECT_EQ(vet_possible_directory(nullptr), 0);
    EXPECT_NO_FRAMES();
}

TEST(VetPossibleDirectory, PathAllocationFailureDropsTheEntry)
{
    struct dirent entry = {};
    entry.d_type = DT_DIR;
    std::strcpy(entry.d_name, std::to_string(getpid()).c_str());
    zvt::LogCapture log;
    int keep = zvt::with_fault("alloc", 1, ENOMEM, [&] { return vet_possible_directory(&entry); });
    EXPECT_EQ(keep, 0);
    EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_NO_MEMORY},
                  {"vet_possible_directory", ZV_ERR_NO_MEMORY});
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to allocate path"}}));
    EXPECT_EQ(log.lines().at(0).frames_before, 2u);
}

}  // namespace
