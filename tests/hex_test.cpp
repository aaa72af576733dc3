// Hexadecimal byte text and its stream printers.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>

#include "support/fault.h"
#include "support/feature_paths.h"
#include "support/trace.h"
#include <zvutil/hex.h>
#include <zvutil/memory.h>

namespace {

// The slow form: one formatted print per byte.
std::string hex_of(const std::string &bytes)
{
    std::string text;
    char pair[3];
    for (unsigned char byte : bytes) {
        std::snprintf(pair, sizeof pair, "%02x", byte);
        text += pair;
    }
    return text;
}

std::string every_byte()
{
    std::string bytes;
    for (int i = 0; i < 256; i++)
        bytes += static_cast<char>(i);
    return bytes;
}

TEST(HexText, EveryByteBothWays)
{
    std::string bytes = every_byte(), text = hex_of(bytes);
    char *out = nullptr;
    ASSERT_EQ(zv_util_sprintf_bytes(bytes.data(), 256, &out), ZV_OK);
    EXPECT_EQ(out, text);
    zv_util_free(&out);

    // Either case; an odd final character is ignored.
    for (const auto &[in, expected] : {std::pair{text + "z", bytes}, {"ABCDEF0", "\xab\xcd\xef"}}) {
        uint8_t *back = nullptr;
        ASSERT_EQ(zv_util_sscanf_bytes(in.data(), in.size(), &back), ZV_OK);
        EXPECT_EQ(std::string(reinterpret_cast<char *>(back), in.size() / 2), expected);
        std::free(back);
    }
    EXPECT_NO_FRAMES();
}

TEST(HexText, EveryPathWritesThePlainDigits)
{
    std::string bytes;
    for (int i = 0; i < 4200; i++)
        bytes += static_cast<char>(i * 167 + i / 256);
    zvt::for_each_feature_path([&](uint32_t path) {
        for (size_t n = 0; n < bytes.size(); n += n < 100 ? 1 : 331) {
            for (size_t offset : {0, 1, 7}) {
                // The bytes end where their allocation ends.
                std::unique_ptr<char[]> block(new char[offset + n]);
                std::memcpy(block.get() + offset, bytes.data() + n % 5, n);
                char *out = nullptr;
                ASSERT_EQ(zv_util_sprintf_bytes(block.get() + offset, n, &out), ZV_OK);
                EXPECT_EQ(out, hex_of(bytes.substr(n % 5, n))) << path << " " << n;
                std::free(out);
            }
        }
    });
}

TEST(HexText, PairsThatAreNotTwoDigitsAreRefused)
{
    const std::string rows[] = {"0g", "g0", " 1", "1 ", "+1", "-1", "0x", "00ab0G",
                                std::string("1\0", 2)};
    for (const std::string &text : rows) {
        zvt::clear_trace();
        uint8_t *out = reinterpret_cast<uint8_t *>(1);
        EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_sscanf_bytes(text.data(), text.size(), &out)) << text;
        EXPECT_EQ(out, nullptr);
        EXPECT_FRAMES({"zv_util_sscanf_bytes", ZV_ERR_BAD_VALUE});
    }
}

TEST(HexText, AllocationFailureIsLogged)
{
    zvt::LogCapture log;
    char *out = nullptr;
    zv_status status;
    for (bool printing : {true, false})
        zvt::sweep_allocations(
            [&] {
                log.clear();
                out = reinterpret_cast<char *>(1);
                status = printing ? zv_util_sprintf_bytes("\x01", 1, &out)
                                  : zv_util_sscanf_bytes("01", 2, reinterpret_cast<uint8_t **>(&out));
                zv_util_free(status == ZV_OK ? &out : nullptr);
                return status == ZV_OK;
            },
            [&](unsigned) {
                EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
                EXPECT_EQ(out, nullptr);
                EXPECT_TRUE(zvt::LogIs(log, {{3, "Allocation failed"}}));
                EXPECT_FRAMES({printing ? "zv_util_sprintf_bytes" : "zv_util_sscanf_bytes",
                               ZV_ERR_NO_MEMORY});
            });

    // From 2^31 bytes on the text would not fit 32 bits: nothing is allocated.
    log.clear();
    zvt::clear_trace();
    zvt::fault_arm("alloc", 1, ENOMEM);
    EXPECT_STATUS(ZV_ERR_NO_MEMORY, zv_util_sprintf_bytes("", 0x80000000u, &out));
    EXPECT_EQ(zvt::fault_calls("alloc"), 0u);
    zvt::fault_clear();
    EXPECT_EQ(out, nullptr);
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Allocation failed"}}));
    EXPECT_FRAMES({"zv_util_sprintf_bytes", ZV_ERR_NO_MEMORY});
}

TEST(HexPrint, WritesPairsAndIgnoresStreamErrors)
{
    std::string bytes = every_byte() + "\x5a" + every_byte() + every_byte();  // several chunks
    char *buffer = nullptr;
    size_t size = 0;
    FILE *stream = open_memstream(&buffer, &size);
    EXPECT_EQ(zv_util_fprintf_bytes(stream, bytes.data(), bytes.size()), ZV_OK);
    std::fclose(stream);
    EXPECT_EQ(std::string(buffer, size), hex_of(bytes));
    std::free(buffer);

    testing::internal::CaptureStdout();
    EXPECT_EQ(zv_util_printf_bytes("\x00\xab\xff", 3), ZV_OK);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "00abff");

    FILE *read_only = std::fopen("/dev/null", "r");
    EXPECT_EQ(zv_util_fprintf_bytes(read_only, "\x01", 1), ZV_OK);
    EXPECT_TRUE(std::ferror(read_only));
    std::fclose(read_only);
    EXPECT_NO_FRAMES();

    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_fprintf_bytes(nullptr, "", 0));
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_fprintf_bytes(stdout, nullptr, 0));
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_printf_bytes(nullptr, 1));
    EXPECT_FRAMES({"zv_util_fprintf_bytes", ZV_ERR_NULL_ARG},
                  {"zv_util_fprintf_bytes", ZV_ERR_NULL_ARG}, {"zv_util_printf_bytes", ZV_ERR_NULL_ARG});
}

}  // namespace
