// Throughput of the 64-bit hash.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <vector>

#include <zvutil/hash.h>

namespace {

void BM_Hash64(benchmark::State &state)
{
    const auto length = static_cast<uint32_t>(state.range(0));
    std::vector<unsigned char> data(length);
    for (uint32_t k = 0; k < length; ++k)
        data[k] = static_cast<unsigned char>(k * 131 + 7);
    uint64_t hash = 0;
    for (auto _ : state) {
        if (zv_util_hash64(data.data(), length, &hash) != ZV_OK)
            state.SkipWithError("zv_util_hash64 failed");
        benchmark::DoNotOptimize(hash);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * length);
}
BENCHMARK(BM_Hash64)->Name("hash64/zvutil")->Arg(64)->Arg(4 << 10)->Arg(1 << 20);

}  // namespace
