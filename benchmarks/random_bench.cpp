// Throughput of the generator filling a buffer.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <vector>

#include <zvutil/random.h>

namespace {

void BM_PrngFill(benchmark::State &state)
{
    const auto length = static_cast<uint32_t>(state.range(0));
    std::vector<unsigned char> buffer(length);
    zv_util_prng_state generator;
    zv_util_seed_prng(&generator, 12345, 0);
    for (auto _ : state) {
        if (zv_util_prng_fill(&generator, buffer.data(), length) != ZV_OK)
            state.SkipWithError("zv_util_prng_fill failed");
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * length);
}
BENCHMARK(BM_PrngFill)->Name("prng_fill/zvutil")->Arg(4 << 10)->Arg(1 << 20);

}  // namespace
