// Test support: fault injection, the error trace and log lines, processor
// paths, scratch directories, forked children and the failure-row driver.
//
// Fault injection: the test executable links the library's archive with
// -Wl,--wrap=NAME for every function support/*.cpp wraps, so calls to it
// (the test's own included) pass through a wrapper that fails with the armed
// errno when its point fires. Points are named after the function ("alloc"
// for every allocation); a name no wrapper serves fails the test. Arming
// covers every caller, so arm right before the call under test and clear
// right after it (with_fault does both).
#pragma once

#include <gtest/gtest.h>
#include <zverrortrace.h>
#include <zvlog.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <fcntl.h>
#include <filesystem>
#include <fstream>
#include <functional>
#include <grp.h>
#include <optional>
#include <string>
#include <vector>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include "cpu.h"
#include <zvutil/zvutil.h>

namespace zvt {

// Runs |check| once per processor path of the vector kernels: everything
// detected, AVX2 and below, SSSE3 and below, SSE2 only, and the plain scalar
// code. Cpu.EveryVectorPathRuns reports the paths the processor lacks.
template <typename Check>
void for_each_feature_path(Check check)
{
    using namespace zv::cpu;
    for (uint32_t mask : {~0u, kSSE2 | kSSSE3 | kAVX2, kSSE2 | kSSSE3, +kSSE2, 0u}) {
        zv::cpu::restrict(mask);
        check(mask);
    }
    zv::cpu::restrict(~0u);
}

// The features of the vector paths as the compiler detects them.
inline uint32_t detected_features()
{
    return (__builtin_cpu_supports("sse2") ? +zv::cpu::kSSE2 : 0) |
           (__builtin_cpu_supports("ssse3") ? +zv::cpu::kSSSE3 : 0) |
           (__builtin_cpu_supports("avx2") ? +zv::cpu::kAVX2 : 0) |
           (sizeof(void *) == 8 && __builtin_cpu_supports("avx512f") &&
                    __builtin_cpu_supports("avx512bw") && __builtin_cpu_supports("avx512vbmi")
                ? +zv::cpu::kAVX512VBMI
                : 0);
}

// The point name that arms nothing.
inline constexpr const char *kNoFault = "none";

// The |nth| call (1-based, counted from now) at |point| fails with |err|;
// |count| further calls fail after it (0: only that one; ~0u: all later ones).
void fault_arm(const char *point, unsigned nth, int err, unsigned count = 0);
void fault_clear();

template <class F>
auto with_fault(const char *point, unsigned nth, int err, F &&call)
{
    fault_arm(point, nth, err);
    auto result = std::forward<F>(call)();
    fault_clear();
    return result;
}

// For wrappers: true when this call must fail; errno is then already set.
// Wrappers name their points through ZVT_HIT, which also places the name in
// a linker section, so fault_arm accepts exactly the names some wrapper serves.
bool fault_hit(const char *point);
#define ZVT_HIT(point)                                                                    \
    [] {                                                                                  \
        [[gnu::used, gnu::section("zvt_points")]] static const char *const name = point; \
        return ::zvt::fault_hit(name);                                                    \
    }()

// The open flags or fopen modes of the open and fopen calls since the test
// began that a child could inherit (no O_CLOEXEC, no "e"), each and a space.
std::string inheritable_opens();

// While set, CLOCK_REALTIME, gettimeofday and time all read |now|.
void pin_clock(std::optional<timespec> now);

// Whether the program runs under valgrind.
bool under_valgrind();

// Bytes of heap in use (glibc's count, or the sanitizer allocator's).
size_t heap_in_use();
// Open descriptors of this process.
unsigned open_fd_count();

// "ZV_ERR_NO_MEMORY" for 2; the number for anything outside the table.
inline std::string status_name(zv_status status)
{
#define ZVT_STATUS_NAME(name, value, meaning) \
    if (status == name)                       \
        return #name;
    ZV_STATUS_LIST(ZVT_STATUS_NAME)
#undef ZVT_STATUS_NAME
    return "status " + std::to_string(static_cast<int32_t>(status));
}

// The calling thread's frames as "function:STATUS", oldest first, space-separated.
inline std::string trace_text()
{
    std::string text;
    zv_trace_frame f;
    for (uint32_t i = 0; zv_trace_get(i, &f) == 0; i++)
        text += (i ? " " : "") + std::string(f.function) + ":" + status_name(f.status);
    return text;
}

// Routes log lines to a fixed in-memory store for its lifetime (no heap use
// while capturing, so allocation sweeps count only the call's allocations).
class LogCapture {
public:
    LogCapture() { zv_log_set_sink(sink, this); }
    ~LogCapture() { zv_log_set_sink(nullptr, nullptr); }

    // "level/mask/frames message" per line, where frames counts the trace
    // frames already recorded when the line was written.
    std::string text() const { return text_; }

private:
    static void sink(void *context, int32_t level, uint32_t mask, const char *, const char *,
                     int32_t, const char *message)
    {
        auto *self = static_cast<LogCapture *>(context);
        size_t room = sizeof self->text_ - self->used_;
        self->used_ += std::min<size_t>(room - 1, std::snprintf(self->text_ + self->used_, room,
            "%d/%u/%u %s\n", level, mask, zv_trace_count(), message ? message : ""));
    }
    char text_[32 * 1100] = "";
    size_t used_ = 0;
};

#define EXPECT_STATUS(expected, actual) \
    EXPECT_EQ(::zvt::status_name(expected), ::zvt::status_name(actual))
// Calls made in order (a braced list is evaluated left to right) all return |status|.
#define EXPECT_ALL(status, ...) \
    for (std::vector<zv_status> got{__VA_ARGS__}; !got.empty(); got.clear()) \
    EXPECT_EQ(got, std::vector<zv_status>(got.size(), status))
#define EXPECT_OK(...) EXPECT_ALL(ZV_OK, __VA_ARGS__)

// The unprivileged user and group that permission cases run as.
inline constexpr uid_t kNobody = 65534;
inline constexpr gid_t kNogroup = 65534;

// A fresh directory under /tmp, removed with its content at the end.
struct ScratchDir {
    std::string path = mkdtemp(std::string("/tmp/zvutil-test-XXXXXX").data());
    std::error_code ignored;
    ~ScratchDir() { std::filesystem::remove_all(path, ignored); }
    std::string operator/(const std::string &name) const { return path + "/" + name; }
};

using Text = const std::string &;
inline void put_file(Text path, Text content) { std::ofstream(path, std::ios::binary) << content; }

inline std::string get_file(Text path)
{
    return {std::istreambuf_iterator<char>(std::ifstream(path, std::ios::binary).rdbuf()), {}};
}

// Runs |body| in a forked child, as the unprivileged user when |drop|; the
// child's gtest failures print there and fail the test here.
inline void in_child(bool drop, const std::function<void()> &body)
{
    if (drop && geteuid() != 0)
        GTEST_SKIP() << "needs root to switch users";
    std::fflush(nullptr);
    // Only the child's own failures count, not those of the test before the fork.
    const auto *result = ::testing::UnitTest::GetInstance()->current_test_info()->result();
    const int parts = result->total_part_count();
    pid_t pid = fork();
    if (pid == 0) {
        if (drop && (setgroups(0, nullptr) != 0 || setgid(kNogroup) != 0 || setuid(kNobody) != 0))
            _exit(2);
        body();
        std::fflush(nullptr);
        _exit(result->total_part_count() > parts ? 1 : 0);
    }
    int status = -1;
    waitpid(pid, &status, 0);
    EXPECT_EQ(status, 0) << "child failed";
}

// A failure row's call.
#define ZVT_CALL(...) [&] { return __VA_ARGS__; }
// A failure row of zv_util_<fn> called with |args|: its one frame with |st|,
// then any other fields of FailureRow by name.
#define ROW(st, fn, args, ...) zvt::FailureRow{.frames = "zv_util_" #fn, .status = st, \
    .call = ZVT_CALL(zv_util_##fn args) __VA_OPT__(, ) __VA_ARGS__}

// errno_out target of the failure rows, reset before each row.
inline constexpr int32_t kUntouched = 12345;
inline int32_t row_errno = kUntouched;

// One failure: |call|, with the |nth| call at |point| failing with EIO,
// returns |status|; the trace holds the comma-separated |frames| (oldest
// first, each with |status|); |row_errno| ends as |err|; the log holds |log|
// alone (level 3, written after |log_after| frames) or nothing; no descriptor
// or heap block is left behind. A null point arms nothing, as kNoFault.
struct FailureRow {
    const char *frames;
    zv_status status;
    std::function<zv_status()> call;
    const char *point = kNoFault;
    unsigned nth = 1;
    int32_t err = kUntouched;
    std::string log = "";
    unsigned log_after = 0;
};

inline void expect_failures(std::initializer_list<FailureRow> rows)
{
    for (const FailureRow &row : rows) {
        const char *point = row.point ? row.point : kNoFault;
        SCOPED_TRACE(std::string(row.frames) + " / " + point + " " + std::to_string(row.nth));
        zv_trace_clear();
        row_errno = kUntouched;
        size_t heap = heap_in_use();
        unsigned fds = open_fd_count();
        LogCapture log;
        int err = std::strcmp(point, "alloc") == 0 ? ENOMEM : EIO;
        zv_status status = with_fault(point, row.nth, err, row.call);
        EXPECT_EQ(heap_in_use(), heap);
        EXPECT_EQ(open_fd_count(), fds);
        EXPECT_STATUS(row.status, status);
        std::string want, rest = row.frames;
        for (size_t end = 0; !rest.empty(); rest.erase(0, end == rest.npos ? end : end + 1))
            want += (want.empty() ? "" : " ") + rest.substr(0, end = rest.find(',')) + ":" +
                    status_name(row.status);
        EXPECT_EQ(trace_text(), want);
        EXPECT_EQ(row_errno, row.err);
        EXPECT_EQ(log.text(), row.log.empty() ? "" : "3/128/" + std::to_string(row.log_after) +
                                                          " " + row.log + "\n");
    }
}

// What a call gives when one of its allocations fails: |frames| and the rest
// as in a failure row.
struct Step {
    const char *frames;
    std::string log = "";
    unsigned log_after = 0;
    int32_t err = kUntouched;
    zv_status status = ZV_ERR_NO_MEMORY;
};

// Fails allocation 1, then 2, ... of |call| (with ENOMEM), allocation k giving
// steps[k - 1], checked as a failure row is; with every allocation granted the
// call then succeeds, records nothing and leaves |row_errno| as |done_err|, so
// an allocation no step names fails the sweep. |call| releases what it receives.
inline void sweep_allocations(const std::function<zv_status()> &call, std::vector<Step> steps,
                              int32_t done_err = kUntouched)
{
    unsigned nth = 1;
    for (const Step &s : steps)
        expect_failures({{s.frames, s.status, call, "alloc", nth++, s.err, s.log, s.log_after}});
    expect_failures({{"", ZV_OK, call, "alloc", nth, done_err}});
}

// A row's call that stores a heap block through &o (of |Type|): a failure
// must leave o NULL; a block handed out is released.
#define ZVT_NULLS(Type, ...) [&] { Type o = (Type)8; zv_status s = __VA_ARGS__; \
    EXPECT_EQ(o == nullptr, s != ZV_OK); std::free(s == ZV_OK ? (void *)o : nullptr); return s; }
// A sweep's call of a function that returns a heap block, NULL on failure.
#define ZVT_BLOCK(...) \
    [&] { void *b = (void *)(__VA_ARGS__); std::free(b); return b ? ZV_OK : ZV_ERR_NO_MEMORY; }

}  // namespace zvt
