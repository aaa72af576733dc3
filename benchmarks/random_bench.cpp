// Throughput of the generator's fill and batch beside std::mt19937_64, a
// xoshiro256** loop and memset (plain, and with non-temporal stores for the
// sizes past the caches), and for those sizes the generator's own recurrence
// in four AVX2 lanes storing straight from the registers past the caches.
#include <benchmark/benchmark.h>

#include <immintrin.h>

#include <cstdint>
#include <cstring>
#include <random>
#include <vector>

#include <zvutil/random.h>

namespace {

// Every kernel runs the same peers; fill and batch differ only in our call.
void sizes(benchmark::internal::Benchmark *bench)
{
    for (int64_t size : {8, 64, 4 << 10, 1 << 20, 64 << 20})
        bench->Arg(size);
}

// Runs |fill(buffer, length)| on a buffer of state.range(0) bytes.
template <class Fill>
void run(benchmark::State &state, Fill fill)
{
    const auto length = static_cast<uint32_t>(state.range(0));
    std::vector<unsigned char> buffer(length, 1);
    for (auto _ : state) {
        fill(buffer.data(), length);
        benchmark::ClobberMemory();
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * length);
}

void BM_Fill(benchmark::State &state)
{
    zv_util_prng_state generator;
    zv_util_seed_prng(&generator, 12345, 0);
    bool failed = false;
    run(state, [&](unsigned char *buffer, uint32_t length) {
        failed |= zv_util_prng_fill(&generator, buffer, length) != ZV_OK;
    });
    if (failed)
        state.SkipWithError("zv_util_prng_fill failed");
}

void BM_Batch(benchmark::State &state)
{
    zv_util_prng_state generator;
    zv_util_seed_prng(&generator, 12345, 0);
    bool failed = false;
    run(state, [&](unsigned char *buffer, uint32_t length) {
        failed |= zv_util_prng_batch(&generator, buffer, length / 8) != ZV_OK;
    });
    if (failed)
        state.SkipWithError("zv_util_prng_batch failed");
}

void BM_Mt19937(benchmark::State &state)
{
    std::mt19937_64 generator(12345);
    run(state, [&](unsigned char *buffer, uint32_t length) {
        for (uint32_t at = 0; at < length; at += 8) {
            uint64_t word = generator();
            std::memcpy(buffer + at, &word, 8);
        }
    });
}

class Xoshiro256StarStar {
public:
    explicit Xoshiro256StarStar(uint64_t seed)
    {
        for (uint64_t &word : s_) {  // splitmix64
            uint64_t z = (seed += 0x9E3779B97F4A7C15);
            z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9;
            z = (z ^ (z >> 27)) * 0x94D049BB133111EB;
            word = z ^ (z >> 31);
        }
    }
    uint64_t operator()()
    {
        const uint64_t result = rotl(s_[1] * 5, 7) * 9, t = s_[1] << 17;
        s_[2] ^= s_[0];
        s_[3] ^= s_[1];
        s_[1] ^= s_[2];
        s_[0] ^= s_[3];
        s_[2] ^= t;
        s_[3] = rotl(s_[3], 45);
        return result;
    }

private:
    static uint64_t rotl(uint64_t x, int k) { return (x << k) | (x >> (64 - k)); }
    uint64_t s_[4];
};

void BM_Xoshiro(benchmark::State &state)
{
    Xoshiro256StarStar generator(12345);
    run(state, [&](unsigned char *buffer, uint32_t length) {
        for (uint32_t at = 0; at < length; at += 8) {
            uint64_t word = generator();
            std::memcpy(buffer + at, &word, 8);
        }
    });
}

void BM_Memset(benchmark::State &state)
{
    int value = 0;
    run(state, [&](unsigned char *buffer, uint32_t length) {
        std::memset(buffer, ++value, length);
    });
}

// memset through 16-byte non-temporal stores (length a multiple of 16).
__attribute__((target("sse2"))) void memset_stream(unsigned char *buffer, int value,
                                                   uint32_t length)
{
    const __m128i fill = _mm_set1_epi8(static_cast<char>(value));
    unsigned char *at = buffer;
    for (; (reinterpret_cast<uintptr_t>(at) & 15) != 0 && length != 0; --length)
        *at++ = static_cast<unsigned char>(value);
    for (; length >= 16; length -= 16, at += 16)
        _mm_stream_si128(reinterpret_cast<__m128i *>(at), fill);
    std::memset(at, value, length);
    _mm_sfence();
}

void BM_MemsetStream(benchmark::State &state)
{
    int value = 0;
    run(state, [&](unsigned char *buffer, uint32_t length) {
        memset_stream(buffer, ++value, length);
    });
}

// The generator's recurrence, four consecutive steps per AVX2 vector, each
// vector of words stored with a non-temporal store as soon as it is made.
// Fills whole rounds of 64 words from the first 32-byte boundary on.
__attribute__((target("avx2"))) void fill_avx2_nt(zv_util_prng_state &state,
                                                  unsigned char *buffer, uint32_t length)
{
    constexpr uint64_t increment = 0x61C8864680B583EB;
    uint64_t *pool = state.pool;  // the run starts at word 0 after seeding
    unsigned char *at = buffer + (-reinterpret_cast<uintptr_t>(buffer) & 31);
    const size_t rounds = (length - (at - buffer)) / 512;
    __m256i weyl = _mm256_add_epi64(_mm256_set1_epi64x(static_cast<int64_t>(state.weyl)),
                                    _mm256_setr_epi64x(increment, 2 * increment, 3 * increment,
                                                       4 * increment));
    const __m256i advance = _mm256_set1_epi64x(4 * increment);
    for (size_t round = 0; round < rounds; ++round) {
#pragma GCC unroll 16
        for (int i = 0; i < 64; i += 4, at += 32) {
            __m256i t = _mm256_loadu_si256(reinterpret_cast<const __m256i *>(pool + i));
            const auto *lag = reinterpret_cast<const __m256i *>(pool + i + 11);
            __m256i v = i == 52 ? _mm256_setr_epi64x(pool[63], pool[0], pool[1], pool[2])
                                : _mm256_loadu_si256(lag);
            t = _mm256_xor_si256(t, _mm256_slli_epi64(t, 33));
            t = _mm256_xor_si256(t, _mm256_srli_epi64(t, 26));
            v = _mm256_xor_si256(v, _mm256_slli_epi64(v, 27));
            v = _mm256_xor_si256(v, _mm256_srli_epi64(v, 29));
            const __m256i word = _mm256_xor_si256(t, v);
            _mm256_storeu_si256(reinterpret_cast<__m256i *>(pool + i), word);
            const __m256i mixed = _mm256_xor_si256(weyl, _mm256_srli_epi64(weyl, 27));
            _mm256_stream_si256(reinterpret_cast<__m256i *>(at), _mm256_add_epi64(word, mixed));
            weyl = _mm256_add_epi64(weyl, advance);
        }
    }
    _mm_sfence();
    state.weyl += increment * 64 * rounds;
}

void BM_FillAvx2Stream(benchmark::State &state)
{
    zv_util_prng_state generator;
    zv_util_seed_prng(&generator, 12345, 0);
    run(state, [&](unsigned char *buffer, uint32_t length) {
        fill_avx2_nt(generator, buffer, length);
    });
}

#define PEERS(kernel)                                                                 \
    BENCHMARK(BM_Mt19937)->Name(kernel "/mt19937_64")->Apply(sizes);                 \
    BENCHMARK(BM_Xoshiro)->Name(kernel "/xoshiro256**")->Apply(sizes);               \
    BENCHMARK(BM_Memset)->Name(kernel "/memset")->Apply(sizes);                      \
    BENCHMARK(BM_MemsetStream)->Name(kernel "/memset_nt")->Arg(64 << 20);             \
    BENCHMARK(BM_FillAvx2Stream)->Name(kernel "/avx2_nt")->Arg(64 << 20)

BENCHMARK(BM_Fill)->Name("prng_fill/zvutil")->Apply(sizes);
PEERS("prng_fill");
BENCHMARK(BM_Batch)->Name("prng_batch/zvutil")->Apply(sizes);
PEERS("prng_batch");

}  // namespace
