// Starting /bin/true and waiting for it from a parent with 0, 64 MiB and 1 GiB
// of touched heap: zv_spawn_and_wait beside posix_spawn + waitpid, and beside
// fork + execve + waitpid, whose cost grows with the parent's page tables.
// Wall-clock time per child; the ratio is ours/peer time (lower is faster).
#include <benchmark/benchmark.h>

#include <cstdlib>
#include <cstring>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <zvutil/process.h>

namespace {

char true_path[] = "/bin/true";
char *true_argv[] = {true_path, nullptr};
char *no_env[] = {nullptr};

// |size| bytes of heap written page by page, held while the benchmark runs.
class TouchedHeap {
public:
    explicit TouchedHeap(int64_t size)
    {
        block_ = static_cast<char *>(std::malloc(static_cast<size_t>(size) + 1));
        if (block_ == nullptr)
            std::abort();
        std::memset(block_, 1, static_cast<size_t>(size) + 1);
        benchmark::DoNotOptimize(block_);
    }
    ~TouchedHeap() { std::free(block_); }

private:
    char *block_;
};

void BM_SpawnOurs(benchmark::State &state)
{
    TouchedHeap heap(state.range(0));
    for (auto _ : state) {
        int32_t code = -1;
        if (zv_spawn_and_wait(true_argv, no_env, &code) != ZV_OK || code != 0)
            state.SkipWithError("zv_spawn_and_wait failed");
    }
}

void BM_PosixSpawn(benchmark::State &state)
{
    TouchedHeap heap(state.range(0));
    for (auto _ : state) {
        pid_t pid;
        int status = -1;
        if (posix_spawn(&pid, true_path, nullptr, nullptr, true_argv, no_env) != 0 ||
            waitpid(pid, &status, 0) != pid || status != 0)
            state.SkipWithError("posix_spawn failed");
    }
}

void BM_ForkExec(benchmark::State &state)
{
    TouchedHeap heap(state.range(0));
    for (auto _ : state) {
        pid_t pid = fork();
        if (pid == 0) {
            execve(true_path, true_argv, no_env);
            _exit(1);
        }
        int status = -1;
        if (pid == -1 || waitpid(pid, &status, 0) != pid || status != 0)
            state.SkipWithError("fork failed");
    }
}

void Sizes(benchmark::internal::Benchmark *bench)
{
    bench->Arg(0)->Arg(int64_t{64} << 20)->Arg(int64_t{1} << 30);
    bench->UseRealTime()->Unit(benchmark::kMicrosecond);
}

BENCHMARK(BM_SpawnOurs)->Name("spawn_and_wait/zvutil")->Apply(Sizes);
BENCHMARK(BM_PosixSpawn)->Name("spawn_and_wait/posix_spawn")->Apply(Sizes);
BENCHMARK(BM_ForkExec)->Name("spawn_and_wait/fork_exec")->Apply(Sizes);

}  // namespace
