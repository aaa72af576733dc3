// 64-bit hash and power-of-two rounding.
#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "cpu.h"
#include "support/trace.h"
#include <zvutil/hash.h>

namespace {

uint64_t hash_of(const std::string &bytes, size_t offset = 0)
{
    alignas(8) unsigned char buffer[32];  // |offset| makes the blocks unaligned
    std::memcpy(buffer + offset, bytes.data(), bytes.size());
    uint64_t hash = 0;
    EXPECT_EQ(zv_util_hash64(buffer + offset, static_cast<uint32_t>(bytes.size()), &hash), ZV_OK);
    return hash;
}

TEST(Hash64, KnownValuesAtAnyAlignment)
{
    const uint64_t zeros = 0xC0C2F16F12470359, one = 0xB0C4BC86ABCD93EB;
    const std::pair<std::string, uint64_t> rows[] = {
        {"a", 0x86B8D0A29D36348B}, {"abc", 0x5F39FB8F324F2E25}, {"abcdefgh", 0xB3D82310AC69EFB1},
        {"abcdefghijk", 0x677ED1C8CC4F1324}, {"\x01", one}, {std::string("\0\x01", 2), one}};
    for (const auto &[bytes, hash] : rows)
        for (size_t offset = 0; offset < 8; ++offset)
            EXPECT_EQ(hash_of(bytes, offset), hash) << bytes.size() << "@" << offset;
    for (size_t length = 1; length <= 8; ++length)
        EXPECT_EQ(hash_of(std::string(length, '\0')), zeros);
    EXPECT_NE(hash_of(std::string(9, '\0')), zeros);
    EXPECT_NE(hash_of(std::string("\x01\0", 2)), one);
    EXPECT_NO_FRAMES();

    uint64_t hash = 42;  // NULL pointers are checked before the length
    EXPECT_EQ(zv_util_hash64(nullptr, 0, &hash), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(zv_util_hash64("a", 1, nullptr), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(zv_util_hash64("a", 0, &hash), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(hash, 42u);
    EXPECT_FRAMES({"zv_util_hash64", ZV_ERR_BAD_VALUE}, {"zv_util_hash64", ZV_ERR_BAD_VALUE},
                  {"zv_util_hash64", ZV_ERR_BAD_VALUE});
}

// The hash as plainly as it can be put: little-endian blocks through the
// chain, the big-endian tail, 16 closing mixes.
uint64_t plain_hash(const unsigned char *bytes, size_t length)
{
    auto mix = [](uint64_t x) {
        x ^= x << 10;
        x ^= x >> 15;
        x ^= x << 4;
        return x ^ (x >> 13);
    };
    uint64_t state = 1;
    size_t at = 0;
    for (; at + 8 <= length; at += 8) {
        uint64_t block = 0;
        for (size_t k = 8; k-- > 0;)
            block = block << 8 | bytes[at + k];
        state = mix(state + block);
    }
    if (at < length) {
        uint64_t tail = 0;
        for (; at < length; ++at)
            tail = tail << 8 | bytes[at];
        state = mix(state + tail);
    }
    for (int round = 0; round < 16; ++round)
        state = mix(state);
    return state;
}

// Every processor path (all features, SSE2 only, none) at lengths around the
// block, vector and prefetch thresholds and at every alignment, on random
// bytes and on all-ones bytes (whose last word carries out of the addition).
TEST(Hash64, EveryPathMatchesThePlainChain)
{
    std::vector<size_t> lengths;
    for (size_t length = 1; length <= 80; ++length)
        lengths.push_back(length);
    for (size_t length : {127, 128, 129, 2047, 2048, 2111, 2112, 2113, 2120, 4096, 70001})
        lengths.push_back(length);
    std::vector<unsigned char> random(70001 + 8), ones(88, 0xFF);
    std::mt19937 generator(5);
    for (unsigned char &byte : random)
        byte = static_cast<unsigned char>(generator());

    struct Restore {
        ~Restore() { zv::cpu::restrict(~0u); }
    } restore;
    for (uint32_t features : {~0u, uint32_t{zv::cpu::kSSE2}, 0u}) {
        zv::cpu::restrict(features);
        for (size_t length : lengths)
            for (size_t offset = 0; offset < 8; ++offset) {
                for (const auto *data : {&random, &ones}) {
                    if (offset + length > data->size())
                        continue;
                    const unsigned char *bytes = data->data() + offset;
                    uint64_t hash = 0;
                    ASSERT_EQ(zv_util_hash64(bytes, static_cast<uint32_t>(length), &hash), ZV_OK);
                    ASSERT_EQ(hash, plain_hash(bytes, length))
                        << "length " << length << " offset " << offset << " features " << features;
                }
            }
    }
}

TEST(RoundPower2, UpAndDown)
{
    const uint32_t rows[][3] = {  // value, up, down
        {0, 0, 0}, {1, 1, 1}, {2, 2, 2}, {3, 4, 2}, {5, 8, 4},
        {0x7FFFFFFF, 0x80000000, 0x40000000}, {0x40000001, 0x80000000, 0x40000000},
        {0x80000000, 0x80000000, 0x80000000},
        {0x80000001, 0, 0x80000000}, {0xFFFFFFFF, 0, 0x80000000}};  // no power of two above
    for (const auto &row : rows) {
        EXPECT_EQ(round_up_power_2(row[0]), row[1]) << std::hex << row[0];
        EXPECT_EQ(round_down_power_2(row[0]), row[2]) << std::hex << row[0];
    }
}

}  // namespace
