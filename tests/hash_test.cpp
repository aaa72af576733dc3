// 64-bit hash and power-of-two rounding.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "support/trace.h"
#include <zvutil/hash.h>

namespace {

uint64_t hash_of(const std::string &bytes)
{
    uint64_t hash = 0;
    EXPECT_STATUS(ZV_OK, zv_util_hash64(bytes.data(), static_cast<uint32_t>(bytes.size()), &hash));
    return hash;
}

TEST(Hash64, KnownValues)
{
    const uint64_t zeros = 0xC0C2F16F12470359;  // one addition of 0 and one mix
    const uint64_t one = 0xB0C4BC86ABCD93EB;
    struct Row {
        std::string bytes;
        uint64_t hash;
    } rows[] = {
        {"a", 0x86B8D0A29D36348B},
        {"abc", 0x5F39FB8F324F2E25},          // tail only, read big-endian
        {"abcdefgh", 0xB3D82310AC69EFB1},     // one block, no tail
        {"abcdefghijk", 0x677ED1C8CC4F1324},  // block and tail
        {std::string(1, '\0'), zeros},
        {std::string(7, '\0'), zeros},
        {std::string(8, '\0'), zeros},
        {"\x01", one},
        {std::string("\0\x01", 2), one},  // leading zeros of a tail are invisible
    };
    for (const Row &row : rows)
        EXPECT_EQ(hash_of(row.bytes), row.hash) << row.bytes.size();
    EXPECT_NE(hash_of(std::string(9, '\0')), zeros);
    EXPECT_NE(hash_of(std::string("\x01\0", 2)), one);
    EXPECT_NO_FRAMES();
}

TEST(Hash64, AnyAlignment)
{
    const std::string text = "abcdefghijklmnopqrstuvwxyz0123456789";
    const uint64_t expected = hash_of(text);
    alignas(8) unsigned char buffer[64];
    for (size_t offset = 1; offset < 8; ++offset) {
        std::memcpy(buffer + offset, text.data(), text.size());
        uint64_t hash = 0;
        ASSERT_EQ(zv_util_hash64(buffer + offset, static_cast<uint32_t>(text.size()), &hash), ZV_OK);
        EXPECT_EQ(hash, expected) << offset;
    }
}

TEST(Hash64, RejectsNullAndEmptyInput)
{
    const char byte = 'a';
    uint64_t hash = 42;
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_hash64(nullptr, 1, &hash));
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_hash64(&byte, 1, nullptr));
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_hash64(&byte, 0, &hash));
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_hash64(nullptr, 0, &hash));
    EXPECT_EQ(hash, 42u);
    EXPECT_FRAMES({"zv_util_hash64", ZV_ERR_BAD_VALUE}, {"zv_util_hash64", ZV_ERR_BAD_VALUE},
                  {"zv_util_hash64", ZV_ERR_BAD_VALUE}, {"zv_util_hash64", ZV_ERR_BAD_VALUE});
}

TEST(RoundPower2, UpAndDown)
{
    struct Row {
        uint32_t value, up, down;
    } rows[] = {
        {0, 0, 0},
        {1, 1, 1},
        {2, 2, 2},
        {3, 4, 2},
        {5, 8, 4},
        {0x7FFFFFFF, 0x80000000, 0x40000000},
        {0x40000001, 0x80000000, 0x40000000},
        {0x80000000, 0x80000000, 0x80000000},
        // No 32-bit power of two lies above these.
        {0x80000001, 0, 0x80000000},
        {0xFFFFFFFF, 0, 0x80000000},
    };
    for (const Row &row : rows) {
        EXPECT_EQ(round_up_power_2(row.value), row.up) << std::hex << row.value;
        EXPECT_EQ(round_down_power_2(row.value), row.down) << std::hex << row.value;
    }
}

}  // namespace
