// Throughput of the 64-bit hash beside xxHash's XXH64 and XXH3.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <vector>

#define XXH_INLINE_ALL
#include <xxhash.h>

#include <zvutil/hash.h>

namespace {

std::vector<unsigned char> input(size_t length)
{
    std::vector<unsigned char> data(length);
    for (size_t k = 0; k < length; ++k)
        data[k] = static_cast<unsigned char>(k * 131 + 7);
    return data;
}

// |hasher| maps (bytes, length) to a 64-bit value. The data pointer passes
// through DoNotOptimize each time, so an inlined peer cannot hoist its work
// out of the loop.
template <class Hasher>
void run(benchmark::State &state, Hasher hasher)
{
    const auto length = static_cast<uint32_t>(state.range(0));
    std::vector<unsigned char> data = input(length);
    const unsigned char *bytes = data.data();
    for (auto _ : state) {
        benchmark::DoNotOptimize(bytes);
        uint64_t hash = hasher(bytes, length);
        benchmark::DoNotOptimize(hash);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * length);
}

void BM_Ours(benchmark::State &state)
{
    bool failed = false;
    run(state, [&](const unsigned char *bytes, uint32_t length) {
        uint64_t hash = 0;
        failed |= zv_util_hash64(bytes, length, &hash) != ZV_OK;
        return hash;
    });
    if (failed)
        state.SkipWithError("zv_util_hash64 failed");
}

void BM_XXH64(benchmark::State &state)
{
    run(state, [](const unsigned char *bytes, uint32_t length) {
        return XXH64(bytes, length, 0);
    });
}

void BM_XXH3(benchmark::State &state)
{
    run(state, [](const unsigned char *bytes, uint32_t length) {
        return XXH3_64bits(bytes, length);
    });
}

void sizes(benchmark::internal::Benchmark *bench)
{
    for (int64_t size : {8, 64, 4 << 10, 1 << 20, 64 << 20})
        bench->Arg(size);
}

BENCHMARK(BM_Ours)->Name("hash64/zvutil")->Apply(sizes);
BENCHMARK(BM_XXH64)->Name("hash64/XXH64")->Apply(sizes);
BENCHMARK(BM_XXH3)->Name("hash64/XXH3")->Apply(sizes);

}  // namespace
