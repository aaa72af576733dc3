// PID files, spawning and waiting, signal dispositions, the /proc lookups,
// the bounded child wait and the stat line.
#include <array>
#include <csignal>
#include <sys/resource.h>

#include "process/process_internal.h"
#include "support/zvt.h"
#include "system/system_internal.h"

namespace {

using zv::vet_possible_directory, zv::zv_util_pid_of, zv::zv_util_await_child_timeout,
    zv::zv_util_proc_stat;  // internal

using zvt::kUntouched;
constexpr zv_status kSys = ZV_ERR_SYSTEM;
using Argv = char *const *;
const char *true_args[] = {"/bin/true", nullptr}, *env_args[] = {"A=1", nullptr};
Argv run_true = const_cast<Argv>(true_args), env = const_cast<Argv>(env_args);
const std::string kSelf = std::to_string(getpid());

// Starts /bin/sleep 30 as |argv0| and returns its ID once /proc shows that
// command line.
pid_t start_sleeper(const std::string &argv0)
{
    pid_t pid = fork();
    if (pid == 0) {
        char *argv[] = {const_cast<char *>(argv0.c_str()), const_cast<char *>("30"), nullptr};
        execve("/bin/sleep", argv, argv + 2);
        _exit(127);
    }
    std::string head;
    for (int i = 0; i < 5000 && head != argv0; i++, usleep(1000))
        std::getline(std::ifstream("/proc/" + std::to_string(pid) + "/cmdline"), head, '\0');
    return pid;
}

void stop_child(pid_t pid) { kill(pid, SIGKILL), waitpid(pid, nullptr, 0); }

// A child that has ended but is not reaped yet.
pid_t zombie()
{
    pid_t pid = fork();
    if (pid == 0) _exit(0);
    siginfo_t info = {};
    waitid(P_PID, pid, &info, WEXITED | WNOWAIT);
    return pid;
}

TEST(PidFile, Claims)
{
    zvt::ScratchDir dir;
    std::string path = dir / "app.pid", program = "zvt-holder-" + kSelf + "-of-a-long-cmdline";
    const char *file = path.c_str();
    uint32_t owner = 7;
    mode_t umask_was = umask(0);  // a new file is readable by all, writable by the group
    EXPECT_EQ(zv_util_claim_pid_file(file, "any", &owner), ZV_OK);
    umask(umask_was);
    EXPECT_EQ(std::filesystem::status(path).permissions(), std::filesystem::perms(0664));

    // The holder's long command line does not fit a block cut too short for it.
    pid_t holder = start_sleeper(program), ended = zombie();
    // A claim under |name| of the file holding |content|: a refused claim
    // changes nothing, a granted one leaves the caller's ID alone in it.
    auto over = [&](std::string content, std::string name = "") -> std::function<zv_status()> {
        return [=] {
            zvt::put_file(path, content);
            uint32_t found = 7;
            zv_status status = zv_util_claim_pid_file(file, name.c_str(), &found);
            EXPECT_EQ(zvt::get_file(path), status == ZV_OK ? kSelf : content);
            EXPECT_EQ(found, status == ZV_ERR_IN_USE ? static_cast<uint32_t>(holder) : 7u);
            return status;
        };
    };
    auto stale = ZVT_CALL((zvt::put_file(path, "x"), zv_util_claim_pid_file(file, "", &owner)));
    const char *claim = "zv_util_claim_pid_file";
    const char *looked_up = "map_pid_to_exe,zv_util_claim_pid_file";
    zvt::expect_failures({
        // A live holder whose command line begins with the name keeps the file.
        {claim, ZV_ERR_IN_USE, over(std::to_string(holder), "zvt-holder")},
        // Stale: another program, an empty command line, no such process, nothing.
        {"", ZV_OK, over(std::to_string(holder), program + "-more")},
        {"", ZV_OK, over(std::to_string(ended))},
        {"", ZV_OK, over("999999999", std::string(100, 'n'))},
        {"", ZV_OK, over("", std::string(150, 'n'))},
        // Failures.
        {claim, ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_claim_pid_file(file, nullptr, &owner))},
        {claim, kSys, ZVT_CALL(zv_util_claim_pid_file("/none/app.pid", "n", &owner)), nullptr, 1,
         kUntouched, "Cannot access pid file /none/app.pid (No such file or directory)"},
        {claim, ZV_ERR_ACCESS, [&] { zvt::fault_arm("open", 1, EACCES); return over(kSelf)(); }},
        {claim, kSys, over(kSelf), "open", 2, kUntouched,
         "Failed to open pid file " + path + " errno 5"},
        {claim, kSys, over(kSelf), "flock", 1, kUntouched, "Failed to lock PID file"},
        {claim, ZV_ERR_BAD_VALUE, over(kSelf, std::string(101, 'n'))},
        {"write_pid_file", kSys, over("999999999"), "fopen", 2},
        {"write_pid_file", kSys, stale, "fwrite"},
        // The caller's ID reaches the file at the close after a failed flush.
        {"write_pid_file", kSys, stale, "fflush"},
        {"write_pid_file", kSys, stale, "fclose", 2},
    });
    // Only 1 to 10 digits that fit 32 bits name a process to look up (the 4th open).
    const char *texts[] = {"0", "4294967295", "4294967296", "00000000001", "self", "../1", "1\n"};
    for (int i = 0; i < 7; i++)
        zvt::expect_failures(
            {{i < 2 ? looked_up : "", i < 2 ? kSys : zv_status{ZV_OK}, over(texts[i]), "open", 4}});
    // The content, the /proc path and the command line of the holder, this
    // process, which is no program of that name.
    zvt::sweep_allocations(
        over(kSelf, "zvt-no-such-program"),
        {{"zv_util_read_named_file,zv_util_claim_pid_file"},
         {"zv_util_vasprintf,map_pid_to_exe,map_pid_to_exe,zv_util_claim_pid_file"},
         {looked_up}});
    stop_child(holder), waitpid(ended, nullptr, 0);
    EXPECT_EQ(zvt::inheritable_opens(), "") << "the library's own opens are close-on-exec";
}

TEST(PidFile, OfTwoRacingClaimersOneWins)
{
    zvt::ScratchDir dir;
    std::string path = dir / "race.pid";
    const char *file = path.c_str();
    for (int round = 0; round < 20; round++, unlink(file)) {
        int go[2], done[2];
        ASSERT_EQ(std::make_tuple(pipe(go), pipe(done)), std::make_tuple(0, 0));
        pid_t claimers[2];
        for (pid_t &pid : claimers)
            if ((pid = fork()) == 0) {  // claims when let go, then lives on as the holder
                uint32_t owner = 0;
                close(go[1]), read(go[0], &owner, 1);
                int32_t won = zv_util_claim_pid_file(file, "", &owner) == ZV_OK ? getpid() : 0;
                write(done[1], &won, sizeof won), pause();
            }
        int32_t won[2] = {};
        close(go[0]), close(go[1]), close(done[1]);
        EXPECT_EQ(zv_util_whole_read(done[0], won, sizeof won), int(sizeof won));
        stop_child(claimers[0]), stop_child(claimers[1]), close(done[0]);
        EXPECT_EQ(std::count(won, won + 2, 0), 1) << won[0] << " " << won[1];
        EXPECT_EQ(zvt::get_file(path), std::to_string(won[0] + won[1]));
    }
}

TEST(Spawn, ExitCodesArgumentsEnvironmentSignalStateAndNoProcessLeft)
{
    zv_proc_handle *handle = nullptr;
    zvt::in_child(false, [&] {  // with SIGUSR1 blocked, SIGUSR2 ignored and SIGTERM caught
        sigset_t usr1 = {};
        sigaddset(&usr1, SIGUSR1);
        sigprocmask(SIG_SETMASK, &usr1, nullptr);
        signal(SIGUSR2, SIG_IGN), signal(SIGTERM, [](int) {});
        std::pair<std::vector<const char *>, int32_t> rows[] = {
            {{"/nonexistent/program", nullptr}, 1},  // the exec fails
            {{"/bin/sh", "-c", "exit 255", nullptr}, 255},
            {{"/bin/sh", "-c", "kill -s TERM $$; exit 3", nullptr}, -1},  // at its default
            {{"/bin/sh", "-c", "test \"$A\" = 1 && test -z \"${HOME+set}\"", nullptr}, 0},
            // Blocked stays blocked, ignored stays ignored.
            {{"/bin/grep", "-q", "^SigBlk:\t0*200$", "/proc/self/status", nullptr}, 0},
            {{"/bin/grep", "-qE", "^SigIgn:\t.*[89a-f]..$", "/proc/self/status", nullptr}, 0},
        };
        for (auto &[args, expected] : rows) {
            int32_t code = 12345, joined = 12345, err = 0;
            errno = EDOM;  // a child's failed exec must not set the caller's
            Argv argv = const_cast<Argv>(args.data());
            EXPECT_OK(zv_spawn(argv, env, &handle), zv_wait(&handle, &code),
                      zv_spawn_and_wait(argv, env, &joined), (err = errno, ZV_OK));
            EXPECT_EQ(std::tie(code, joined, err, handle),
                      std::make_tuple(expected, expected, EDOM, nullptr)) << args.end()[-2];
        }
        int32_t code = 7;
        zvt::sweep_allocations(
            ZVT_CALL(zv_spawn(run_true, env, &handle) ?: zv_wait(&handle, &code)), {{"zv_spawn"}});
        zvt::sweep_allocations(ZVT_CALL(zv_spawn_and_wait(run_true, env, &code)),
                               {{"zv_spawn,zv_spawn_and_wait"}});
    });
    zvt::in_child(true, [&] {  // a process that may start no other
        struct rlimit zero = {0, 0};
        ASSERT_EQ(setrlimit(RLIMIT_NPROC, &zero), 0);
        zvt::expect_failures({{"zv_spawn", kSys, ZVT_CALL(zv_spawn(run_true, env, &handle))}});
    });
}

// A thread cancelled in the wait releases the handle; the child runs on.
TEST(Spawn, CancelledWaitReleasesTheHandle)
{
    zvt::in_child(false, [] {
        int gate[2];  // the children read it until this end closes
        ASSERT_EQ(pipe2(gate, O_CLOEXEC), 0);
        dup2(gate[0], 0);
        auto cancel_a_wait = [] {
            pthread_t waiter;
            pthread_create(&waiter, nullptr, [](void *) -> void * {
                // Nothing on this frame that AddressSanitizer would poison:
                // cancellation leaves it without an epilogue.
                static const char *args[] = {"/bin/sh", "-c", "exec cat >/dev/null", nullptr};
                static int32_t code = 0;
                zv_spawn_and_wait(const_cast<Argv>(args), env, &code);
                return nullptr;
            }, nullptr);
            void *result = nullptr;
            pthread_cancel(waiter), pthread_join(waiter, &result);
            return result;
        };
        cancel_a_wait();  // the first cancellation loads the unwinder
        size_t heap = zvt::heap_in_use();
        EXPECT_EQ(cancel_a_wait(), PTHREAD_CANCELED);
        EXPECT_EQ(zvt::heap_in_use(), heap);
        close(gate[1]);
        for (int child = 0; child < 2; child++) {
            int status = -1;
            pid_t reaped = waitpid(-1, &status, 0);
            EXPECT_EQ(std::make_pair(reaped > 0, status), std::make_pair(true, 0)) << "ran on";
        }
    });
}

TEST(Signals, DispositionsThenWaitsWithSigchldIgnored)
{
    zvt::in_child(false, [] {
        auto disposition = [](int sig) {  // the handler, which the library sets without flags
            struct sigaction current;
            sigaction(sig, nullptr, &current);
            return (current.sa_flags & SA_NOCLDSTOP) != 0 ? SIG_ERR : current.sa_handler;
        };
        sighandler_t note_signal = [](int) {};
        signal(SIGTERM, note_signal);
        for (int sig : {SIGKILL, SIGTERM, SIGSTOP, 0, 32, 40, -1})  // left alone
            EXPECT_EQ(zv_util_ignore_signal(sig), ZV_OK) << sig;
        for (int sig : {1, 31}) {  // ignored, then reset
            sighandler_t ignored = SIG_ERR;
            EXPECT_OK(zv_util_ignore_signal(sig),
                      (ignored = disposition(sig), zv_util_reset_signal(sig)));
            EXPECT_EQ(std::make_tuple(ignored, disposition(sig)), std::make_tuple(SIG_IGN, SIG_DFL))
                << sig;
        }
        // SIGHUP's failure does not stop the walk.
        EXPECT_EQ(zvt::with_fault("sigaction", 1, EINVAL, zv_util_ignore_common_signals), kSys);
        for (int sig = 1; sig <= 31; sig++) {  // SIGKILL and SIGSTOP stay at their default
            auto dfl = sig == SIGHUP || sig == SIGKILL || sig == SIGSTOP ? SIG_DFL : SIG_IGN;
            EXPECT_EQ(disposition(sig), sig == SIGTERM ? note_signal : dfl) << sig;
        }
        // SIGCHLD is ignored now: the kernel reaps children itself and waits fail.
        zv_proc_handle *handle = nullptr, *none = nullptr;
        int32_t code = 7;
        ASSERT_EQ(zv_spawn(run_true, env, &handle), ZV_OK);
        auto spawn_wait = ZVT_CALL(zv_spawn_and_wait(run_true, env, &code));
        zvt::expect_failures({
            ROW(ZV_ERR_BAD_VALUE, reset_signal, (0), .log = "Invalid or unsupported signal value"),
            {"", kSys, ZVT_CALL(zv_util_reset_signal(SIGUSR1)), "sigaction"},  // with no frame
            // The child's stack, or its usable part.
            {"zv_spawn,zv_spawn_and_wait", ZV_ERR_NO_MEMORY, spawn_wait, "mmap"},
            {"zv_spawn,zv_spawn_and_wait", ZV_ERR_NO_MEMORY, spawn_wait, "mprotect"},
            {"zv_wait", ZV_ERR_NULL_ARG, ZVT_CALL(zv_wait(&none, &code))},
            {"zv_wait", ZV_ERR_SYSTEM, ZVT_CALL(zv_wait(&handle, &code))},
            {"zv_wait", ZV_ERR_SYSTEM, spawn_wait},
            ROW(kSys, await_child_timeout, (1, 5), .log = "Failed to wait for child"),
        });
        EXPECT_EQ(std::make_tuple(handle != nullptr, code, none), std::make_tuple(true, 7, nullptr))
            << "a failed wait keeps the handle";
        zv_free_proc_handle(&handle), zv_free_proc_handle(nullptr);
        EXPECT_EQ(handle, nullptr);
    });
}

std::vector<uint32_t> lookup(const std::string &name, int mode)
{
    uint32_t *pids = nullptr, count = 12345;
    EXPECT_EQ(zv_util_pid_of(name.c_str(), mode, &pids, &count), ZV_OK);
    std::vector<uint32_t> result(pids, pids + count);
    std::free(pids);
    return result;
}

TEST(PidOf, MatchModesOrderFilterAndFailures)
{
    // The second command line runs past the head that the lookup compares.
    std::string name = "zvt-pidof-" + kSelf, longer = name + std::string(400, '-');
    pid_t first = start_sleeper(name), second = start_sleeper(longer), ended = zombie();
    std::vector<uint32_t> expected = {static_cast<uint32_t>(first), static_cast<uint32_t>(second)};
    if (std::to_string(second) < std::to_string(first))  // /proc names in text order
        std::swap(expected[0], expected[1]);
    size_t heap = zvt::heap_in_use();
    EXPECT_EQ(lookup(name, 1), std::vector<uint32_t>(1, first));
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_EQ(lookup(name.substr(4), 0), expected) << "a fragment";
    // A fragment is no exact match; nothing past the compared head matches.
    EXPECT_EQ((std::vector{lookup(name.substr(4), 1), lookup(longer, 0)}),
              std::vector(2, std::vector<uint32_t>()));
    uint32_t *pids = reinterpret_cast<uint32_t *>(1), count = 0;
    EXPECT_EQ(zv_util_pid_of(name.c_str(), 1, nullptr, &count), ZV_OK);
    EXPECT_EQ(count, 1u);
    // A zombie's command line is empty: an empty name matches it exactly,
    // and as a fragment every process, the first /proc entry included.
    EXPECT_EQ(std::make_tuple(std::ranges::count(lookup("", 1), uint32_t(ended)),
                              std::ranges::count(lookup("", 0), 1u)), std::make_tuple(1, 1));
    waitpid(ended, nullptr, 0), stop_child(first), stop_child(second);

    zvt::LogCapture log;
    zvt::fault_arm("open", 1, EACCES, ~0u);  // no command line opens: nothing qualifies
    EXPECT_EQ(zv_util_pid_of("", 0, &pids, &count), ZV_OK);
    zvt::fault_clear();
    EXPECT_EQ(std::tie(count, pids), std::make_tuple(0u, nullptr));
    EXPECT_EQ(log.text(), "7/128/0 Nothing suitable in /proc\n");

    // Only a directory named by digits is a process.
    dirent64 file{0, 0, 0, DT_REG, "1"}, entry{0, 0, 0, DT_DIR, "self"};  // inode, offset, size
    EXPECT_EQ(std::make_tuple(vet_possible_directory(&file), vet_possible_directory(&entry)),
              std::make_tuple(0, 0));
    zvt::expect_failures({{"zv_util_pid_of", kSys, ZVT_CALL(zv_util_pid_of("", 0, nullptr, &count)),
                           "scandir", 1, kUntouched, "Failed to open /proc"}});
    // The filter keeps a live process, and drops (0) one whose path cannot be formatted.
    std::strcpy(entry.d_name, kSelf.c_str());
    zvt::sweep_allocations(
        [&] { return vet_possible_directory(&entry) == 0 ? ZV_ERR_NO_MEMORY : ZV_OK; },
        {{"zv_util_vasprintf,vet_possible_directory", "Failed to allocate path", 2}});
}

TEST(AwaitChild, EndsOrIsKilledAtTheDeadline)
{
    pid_t late = fork();
    if (late == 0) _exit(usleep(100000));
    EXPECT_EQ(zv_util_await_child_timeout(late, 30), ZV_OK) << "ended while waited for";
    // At the deadline the child is killed; a clock that cannot be read counts as past it.
    for (int32_t timeout : {0, 30}) {
        pid_t sleeper = start_sleeper("zvt-await");
        auto wait = ZVT_CALL(zv_util_await_child_timeout(sleeper, timeout));
        EXPECT_EQ(zvt::with_fault("clock_gettime", timeout ? 2 : 100, EIO, wait), ZV_ERR_TIMEOUT);
        int status = 0;
        EXPECT_EQ(waitpid(sleeper, &status, 0), sleeper);
        EXPECT_EQ(WTERMSIG(status), SIGKILL);
    }
    EXPECT_EQ(zvt::trace_text(), "zv_util_await_child_timeout:ZV_ERR_TIMEOUT "
                                 "zv_util_query_timeout_expired:ZV_ERR_SYSTEM "
                                 "zv_util_await_child_timeout:ZV_ERR_TIMEOUT");
}

TEST(ProcStat, StatLinesAndThreadIds)
{
    zvt::ScratchDir dir;
    std::string path = dir / "stat";
    zvt::put_file(path, "4242 (my (odd) ) name) S 1 4243 4244 34816 4245 4194560 1000 2000 3 4 "
                        "500 600 7 8 20 -5 1 0 5000000000 123456789 -1 18446744073709551615 "
                        "94558123456512 4294967296 3000 4000 5000 0 65536 4096 17 0 0 0 17 3 0 "
                        "2 9000000000\n");
    zv_proc_stat st;
    ASSERT_EQ(zv_util_proc_stat(&st, path.c_str()), ZV_OK);
    // "-5" keeps its two's-complement pattern; beyond 32 bits a field saturates.
    EXPECT_EQ(std::tie(st.pid, st.state, st.ppid, st.flags, st.exit_signal, st.policy),
              std::make_tuple(4242, 'S', 1, 4194560u, 17, 2u));
    EXPECT_EQ(std::tie(st.nice, st.vsize, st.rss, st.rsslim, st.endcode, st.starttime),
              std::make_tuple(uint32_t(-5), 123456789u, -1, 4294967295u, 4294967295u, 5000000000u));
    EXPECT_EQ(st.delayacct_blkio_ticks, 9000000000u);
    zvt::expect_failures({
        ROW(ZV_ERR_NULL_ARG, proc_stat, (nullptr, 0), .log = "ret_proc_stat is NULL"),
        ROW(ZV_ERR_OPEN_FAILED, proc_stat, (&st, -1)),
        ROW(ZV_ERR_IO, proc_stat, (&st, "/dev/null"), .log = "getline() failed: Success"),
    });
    EXPECT_EQ(std::memcmp(&st, std::array<char, sizeof st>{}.data(), sizeof st), 0);
    // The record is cleared first; the fields before the missing one are filled. The line
    // fills getline's first 120-byte buffer: nothing past its end may be looked at.
    zvt::put_file(path, "1 (" + std::string(110, 'x') + ") R 9\n");
    zvt::expect_failures({ROW(kSys, proc_stat, (&st, path.c_str()),
                              .log = "Parsing logic failed, j=120, len=120")});
    EXPECT_EQ(std::make_tuple(st.pid, st.state, st.ppid, st.pgrp), std::make_tuple(1, 'R', 9, 0));

    EXPECT_EQ(zv_util_proc_stat(&st, 0), ZV_OK);  // the caller
    EXPECT_EQ(st.pid, getpid());
    EXPECT_EQ(zv_util_proc_stat(&st, getppid()), ZV_OK);
    EXPECT_EQ(st.pid, getppid());
    EXPECT_EQ(zv_util_tid(), getpid());
    EXPECT_EQ(zvt::inheritable_opens(), "") << "the library's own opens are close-on-exec";
}

}  // namespace
