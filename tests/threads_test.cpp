// Threads failing library calls while the log sink is swapped, first callers
// racing the processor check, spawns from several threads, and a fork beside
// a thread inside the sink. Meant for ThreadSanitizer (preset tsan).
#include <atomic>
#include <sys/wait.h>
#include <thread>

#include "support/zvt.h"

// A sink that finds another sink's context, or one replaced before the set
// returned, marks it wrong.
struct Binding { int id; std::atomic<int> live, wrong, lines; };

template <int Id>
static void sink(void *data, int32_t, uint32_t, const char *, const char *, int32_t, const char *)
{
    auto *binding = static_cast<Binding *>(data);
    binding->wrong |= binding->id != Id || !binding->live;
    binding->lines++;
}

// Runs body(0) .. body(3) on four threads that start together.
static void run_threads(auto body)
{
    std::atomic<int> waiting{4};
    std::jthread threads[4];
    for (int t = 0; t < 4; ++t)
        threads[t] = std::jthread([&, t] { for (--waiting; waiting != 0;) {} body(t); });
}

TEST(Threads, SinkSwapsWhileOthersLogAndRecordFrames)
{
    Binding b[2] = {{0, 0, 0, 0}, {1, 0, 0, 0}};
    std::atomic<int> swaps{0};
    run_threads([&](int t) {
        // Thread 0 swaps until the others have logged 12000 lines, each
        // iteration of theirs after one more swap.
        for (int i = 0; t == 0 && i < 1 << 22 && b[0].lines + b[1].lines < 12000; swaps = ++i) {
            b[(i + 1) % 2].live = 1;
            zv_log_set_sink(i % 2 ? sink<0> : sink<1>, &b[(i + 1) % 2]);
            b[i % 2].live = 0;
        }
        for (int i = 0; t != 0 && i < 2000; ++i) {  // two lines and two frames each
            while (swaps <= i)
                std::this_thread::yield();
            zv_trace_clear();
            EXPECT_EQ(zv_util_split(nullptr, ",", nullptr, nullptr), ZV_ERR_NULL_ARG);
            EXPECT_EQ(zv_util_unsetenv("a=b"), ZV_ERR_SYSTEM);
            EXPECT_EQ(zv_trace_count(), 2u);
        }
    });
    zv_log_set_sink(nullptr, nullptr);
    EXPECT_EQ(std::make_tuple(b[0].wrong.load(), b[1].wrong.load(), b[0].lines + b[1].lines),
              std::make_tuple(0, 0, 12000));
}

// In the tsan preset these are the check's first callers.
TEST(Threads, CallersOfTheProcessorCheckAllSeeTheDetectedFeatures)
{
    std::vector<uint32_t> seen(4);
    run_threads([&](int t) { seen[t] = zv::cpu::features(); });
    EXPECT_EQ(seen, std::vector<uint32_t>(4, zvt::detected_features()));
}

TEST(Threads, SpawnFromSeveralThreadsAtOnce)
{
    std::atomic<int> failed{0};
    run_threads([&](int) {
        char path[] = "/bin/true", *argv[] = {path, nullptr};
        for (int i = 0; i < 20; i++) {
            int32_t code = -2;
            failed += zv_spawn_and_wait(argv, argv + 1, &code) != ZV_OK;
            failed += code != 0;
        }
    });
    EXPECT_EQ(failed, 0);
}

// A child forked while another thread sits inside the sink logs and sets a
// sink of its own at once.
TEST(Threads, ForkWhileAnotherThreadIsInsideTheSink)
{
    static std::atomic<int> inside, leave;
    inside = leave = 0;
    zv_log_set_sink([](auto...) {
        for (inside = 1; !leave;)
            std::this_thread::yield();
    }, nullptr);
    std::thread slow([] { zv_util_log_internal(3, 128, "slow", "f", 1, "held"); });
    while (!inside)
        std::this_thread::yield();
    pid_t pid = fork();
    if (pid == 0) {
        alarm(30);  // a child that hangs ends by SIGALRM
        static int lines = 0;
        zv_log_set_sink([](auto...) { lines++; }, nullptr);
        zv_util_log_internal(3, 128, "child", "f", 2, "line");
        _exit(lines == 1 ? 0 : 1);
    }
    int status = -1;
    waitpid(pid, &status, 0);
    leave = 1;
    slow.join();
    zv_log_set_sink(nullptr, nullptr);
    EXPECT_EQ(status, 0);
}
