// 64-bit hash and power-of-two rounding.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

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
