// Hexadecimal byte text against a formatted print per byte into a block of
// the same size.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include <zvutil/hex.h>

namespace {

std::vector<uint8_t> pattern(size_t n)
{
    std::vector<uint8_t> bytes(n);
    for (size_t i = 0; i < n; i++)
        bytes[i] = static_cast<uint8_t>(i * 167 + (i >> 8));
    return bytes;
}

void BM_HexOurs(benchmark::State &state)
{
    auto bytes = pattern(static_cast<size_t>(state.range(0)));
    for (auto _ : state) {
        char *text;
        if (zv_util_sprintf_bytes(bytes.data(), bytes.size(), &text) != ZV_OK)
            state.SkipWithError("zv_util_sprintf_bytes failed");
        benchmark::DoNotOptimize(text);
        std::free(text);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}

void BM_HexSnprintf(benchmark::State &state)
{
    auto bytes = pattern(static_cast<size_t>(state.range(0)));
    for (auto _ : state) {
        auto *text = static_cast<char *>(std::malloc(2 * bytes.size() + 1));
        text[0] = '\0';
        for (size_t i = 0; i < bytes.size(); i++)
            std::snprintf(text + 2 * i, 3, "%02x", bytes[i]);
        benchmark::DoNotOptimize(text);
        std::free(text);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}

BENCHMARK(BM_HexOurs)->Name("hex_text/zvutil")->Arg(8)->Arg(64)->Arg(1 << 10)->Arg(4 << 10)
    ->Arg(1 << 20)->Arg(64 << 20);
BENCHMARK(BM_HexSnprintf)->Name("hex_text/snprintf")->Arg(8)->Arg(64)->Arg(1 << 10)->Arg(4 << 10)
    ->Arg(1 << 20);

}  // namespace
