// Base64 encoding and decoding against OpenSSL's block functions, libsodium
// and memcpy of the same SIZE bytes. SIZE is the number of binary bytes on both
// sides (the text is 4/3 of it); every coder allocates its output in the loop
// as the library does.
#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <openssl/evp.h>
#include <sodium.h>
#include <string>
#include <sys/mman.h>
#include <vector>

#include <zvutil/base64.h>

namespace {

std::vector<uint8_t> random_bytes(size_t n)
{
    std::vector<uint8_t> bytes(n);
    uint32_t x = 2463534242u;
    for (auto &b : bytes) {
        x ^= x << 13, x ^= x >> 17, x ^= x << 5;
        b = static_cast<uint8_t>(x >> 24);
    }
    return bytes;
}

std::string text_of(const std::vector<uint8_t> &bytes)
{
    std::string text(zv_util_to_base64_size(bytes.size()) + 1, '\0');
    int n = EVP_EncodeBlock(reinterpret_cast<unsigned char *>(text.data()), bytes.data(),
                            static_cast<int>(bytes.size()));
    text.resize(static_cast<size_t>(n));
    return text;
}

void finish(benchmark::State &state)
{
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}

void BM_EncodeOurs(benchmark::State &state)
{
    auto bytes = random_bytes(static_cast<size_t>(state.range(0)));
    for (auto _ : state) {
        char *text;
        uint32_t length;
        if (zv_util_base64_encode(bytes.data(), bytes.size(), &text, &length) != ZV_OK)
            state.SkipWithError("zv_util_base64_encode failed");
        benchmark::DoNotOptimize(text);
        std::free(text);
    }
    finish(state);
}

void BM_EncodeOpenSSL(benchmark::State &state)
{
    auto bytes = random_bytes(static_cast<size_t>(state.range(0)));
    for (auto _ : state) {  // the block function adds a NUL
        auto *text = static_cast<unsigned char *>(std::malloc(zv_util_to_base64_size(bytes.size()) + 1));
        EVP_EncodeBlock(text, bytes.data(), static_cast<int>(bytes.size()));
        benchmark::DoNotOptimize(text);
        std::free(text);
    }
    finish(state);
}

void BM_EncodeSodium(benchmark::State &state)
{
    auto bytes = random_bytes(static_cast<size_t>(state.range(0)));
    size_t room = sodium_base64_ENCODED_LEN(bytes.size(), sodium_base64_VARIANT_ORIGINAL);
    for (auto _ : state) {
        auto *text = static_cast<char *>(std::malloc(room));
        sodium_bin2base64(text, room, bytes.data(), bytes.size(), sodium_base64_VARIANT_ORIGINAL);
        benchmark::DoNotOptimize(text);
        std::free(text);
    }
    finish(state);
}

void BM_DecodeOurs(benchmark::State &state)
{
    std::string text = text_of(random_bytes(static_cast<size_t>(state.range(0))));
    for (auto _ : state) {
        uint8_t *bytes;
        uint32_t length;
        if (zv_util_base64_decode(text.data(), text.size(), &bytes, &length) != ZV_OK)
            state.SkipWithError("zv_util_base64_decode failed");
        benchmark::DoNotOptimize(bytes);
        std::free(bytes);
    }
    finish(state);
}

void BM_DecodeOpenSSL(benchmark::State &state)
{
    std::string text = text_of(random_bytes(static_cast<size_t>(state.range(0))));
    for (auto _ : state) {
        auto *bytes = static_cast<unsigned char *>(std::malloc((text.size() + 3) / 4 * 3));
        if (EVP_DecodeBlock(bytes, reinterpret_cast<const unsigned char *>(text.data()),
                            static_cast<int>(text.size())) < 0)
            state.SkipWithError("EVP_DecodeBlock failed");
        benchmark::DoNotOptimize(bytes);
        std::free(bytes);
    }
    finish(state);
}

void BM_DecodeSodium(benchmark::State &state)
{
    std::string text = text_of(random_bytes(static_cast<size_t>(state.range(0))));
    size_t room = (text.size() + 3) / 4 * 3;
    for (auto _ : state) {
        auto *bytes = static_cast<unsigned char *>(std::malloc(room));
        size_t length;
        if (sodium_base642bin(bytes, room, text.data(), text.size(), nullptr, &length, nullptr,
                              sodium_base64_VARIANT_ORIGINAL) != 0)
            state.SkipWithError("sodium_base642bin failed");
        benchmark::DoNotOptimize(bytes);
        std::free(bytes);
    }
    finish(state);
}

// The bound for either direction: a copy of the binary bytes into a new block,
// allocated as the library allocates its output (a large one 2 MiB aligned
// and rounded, in huge pages), and into a block allocated and touched once
// before the loop.
void BM_Memcpy(benchmark::State &state)
{
    auto bytes = random_bytes(static_cast<size_t>(state.range(0)));
    constexpr size_t huge = size_t{2} << 20;
    const size_t rounded = (bytes.size() + huge - 1) & ~(huge - 1);
    const bool large = bytes.size() >= (size_t{4} << 20) * sizeof(long);
    for (auto _ : state) {
        auto *copy = static_cast<uint8_t *>(large ? std::aligned_alloc(huge, rounded)
                                                  : std::malloc(bytes.size()));
        if (large)
            madvise(copy, rounded, MADV_HUGEPAGE);
        std::memcpy(copy, bytes.data(), bytes.size());
        benchmark::DoNotOptimize(copy);
        std::free(copy);
    }
    finish(state);
}

void BM_MemcpyWarm(benchmark::State &state)
{
    auto bytes = random_bytes(static_cast<size_t>(state.range(0)));
    std::vector<uint8_t> copy(bytes.size());
    for (auto _ : state) {
        std::memcpy(copy.data(), bytes.data(), bytes.size());
        benchmark::ClobberMemory();
    }
    finish(state);
}

void sizes(benchmark::internal::Benchmark *b)
{
    for (int64_t size : {8, 64, 1 << 10, 4 << 10, 1 << 20, 64 << 20})
        b->Arg(size);
}

[[maybe_unused]] const int sodium_ready = sodium_init();

BENCHMARK(BM_EncodeOurs)->Name("base64_encode/zvutil")->Apply(sizes);
BENCHMARK(BM_EncodeOpenSSL)->Name("base64_encode/openssl")->Apply(sizes);
BENCHMARK(BM_EncodeSodium)->Name("base64_encode/libsodium")->Apply(sizes);
BENCHMARK(BM_Memcpy)->Name("base64_encode/memcpy")->Apply(sizes);
BENCHMARK(BM_MemcpyWarm)->Name("base64_encode/memcpy_warm")->Apply(sizes);
BENCHMARK(BM_DecodeOurs)->Name("base64_decode/zvutil")->Apply(sizes);
BENCHMARK(BM_DecodeOpenSSL)->Name("base64_decode/openssl")->Apply(sizes);
BENCHMARK(BM_DecodeSodium)->Name("base64_decode/libsodium")->Apply(sizes);
BENCHMARK(BM_Memcpy)->Name("base64_decode/memcpy")->Apply(sizes);
BENCHMARK(BM_MemcpyWarm)->Name("base64_decode/memcpy_warm")->Apply(sizes);

}  // namespace
