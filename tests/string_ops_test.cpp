// Splitting, joining and appending strings.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/memory.h>
#include <zvutil/string_ops.h>

namespace {

using Strings = std::vector<std::string>;

Strings split(const char *text, const char *separator)
{
    char **fields = reinterpret_cast<char **>(1);
    uint32_t count = 99;
    EXPECT_EQ(zv_util_split(text, separator, &fields, &count), ZV_OK);
    EXPECT_EQ(count == 0, fields == nullptr);
    Strings result(fields, fields + count);
    for (uint32_t i = 0; i < count; i++)
        std::free(fields[i]);
    std::free(fields);
    return result;
}

TEST(Split, Fields)
{
    EXPECT_EQ(split("one--two", "--"), Strings({"one", "two"}));
    EXPECT_EQ(split("one--two", "-"), Strings({"one", "two"})) << "runs collapse";
    EXPECT_EQ(split(",a,,b,", ","), Strings({"a", "b"}));
    EXPECT_EQ(split("a-b", "--"), Strings({"a-b"})) << "only the whole separator matches";
    EXPECT_EQ(split("xaaa", "aa"), Strings({"x", "a"})) << "a last piece shorter than it";
    EXPECT_EQ(split(",,,", ","), Strings());
    EXPECT_EQ(split("", ","), Strings());
}

TEST(Split, RefusedArgumentsWriteNothing)
{
    char **fields = reinterpret_cast<char **>(1);
    uint32_t count = 99;
    const char *text = "a,b";
    const void *args[][4] = {{nullptr, ",", &fields, &count}, {text, nullptr, &fields, &count},
                             {text, ",", nullptr, &count}, {text, ",", &fields, nullptr}};
    for (const auto &a : args) {
        zvt::clear_trace();
        zvt::LogCapture log;
        EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_split((const char *)a[0], (const char *)a[1],
                                                     (char ***)a[2], (uint32_t *)a[3]));
        char expected[128];
        std::snprintf(expected, sizeof expected, "NULL argument detected: %p %p %p %p", a[0], a[1],
                      a[2], a[3]);
        EXPECT_TRUE(zvt::LogIs(log, {{3, expected}}));
        EXPECT_EQ(log.lines().at(0).frames_before, 0u);
        EXPECT_FRAMES({"zv_util_split", ZV_ERR_NULL_ARG});
    }
    zvt::clear_trace();
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_split(text, "", &fields, &count));
    EXPECT_FRAMES({"zv_util_split", ZV_ERR_BAD_VALUE});
    EXPECT_EQ(fields, reinterpret_cast<char **>(1));
    EXPECT_EQ(count, 99u);
}

TEST(Split, AllocationFailureReleasesEverything)
{
    zvt::LogCapture log;
    char **fields = nullptr;
    uint32_t count = 0;
    zv_status status;
    zvt::sweep_allocations(
        [&] {
            log.clear();
            status = zv_util_split("one,two,three", ",", &fields, &count);
            for (uint32_t i = 0; status == ZV_OK && i < count; i++)
                std::free(fields[i]);
            zv_util_free(status == ZV_OK ? &fields : nullptr);
            return status == ZV_OK;
        },
        [&](unsigned nth) {
            // The array comes first, then one block per field.
            EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
            EXPECT_TRUE(zvt::LogIs(
                log, {{3, nth == 1 ? "Memory allocation failed" : "Failed to allocate memory"}}));
            EXPECT_FRAMES({"zv_util_split", ZV_ERR_NO_MEMORY});
            EXPECT_EQ(fields, nullptr);
        });
}

std::string join(const std::vector<const char *> &strings, const char *separator, int count = -1)
{
    char *out = nullptr;
    uint32_t size = 0;
    uint32_t n = count < 0 ? strings.size() : count;
    EXPECT_EQ(zv_util_join(strings.data(), n, separator, &out, &size), ZV_OK);
    std::string joined(out);
    EXPECT_EQ(size, joined.size() + 1);
    std::free(out);
    return joined;
}

TEST(Join, Strings)
{
    EXPECT_EQ(join({"a"}, "--"), "a");
    EXPECT_EQ(join({"a", "b", "c"}, ", "), "a, b, c");
    EXPECT_EQ(join({"a", "", "b"}, ""), "ab");
    EXPECT_EQ(join({nullptr}, ",", 0), "") << "count 0 reads no string";
    EXPECT_NO_FRAMES();
}

TEST(Join, RefusedArguments)
{
    const char *strings[] = {"a"};
    char *out = reinterpret_cast<char *>(1);
    uint32_t size;
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_join(nullptr, 1, ",", &out, &size));
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_join(strings, 1, nullptr, &out, &size));
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_join(strings, 1, ",", nullptr, &size));
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_join(strings, 1, ",", &out, nullptr));
    // 4097 separators of 1 MiB pass 32 bits.
    std::string separator(1u << 20, '-');
    std::vector<const char *> empties(4097, "");
    EXPECT_STATUS(ZV_ERR_OVERFLOW,
                  zv_util_join(empties.data(), empties.size(), separator.c_str(), &out, &size));
    EXPECT_EQ(out, reinterpret_cast<char *>(1));
    EXPECT_FRAMES({"zv_util_join", ZV_ERR_NULL_ARG}, {"zv_util_join", ZV_ERR_NULL_ARG},
                  {"zv_util_join", ZV_ERR_NULL_ARG}, {"zv_util_join", ZV_ERR_NULL_ARG},
                  {"zv_util_join", ZV_ERR_OVERFLOW});
}

TEST(Join, TerminatorBeyond32BitsOverflows)
{
    // 65537 strings of 65535 characters and no separator: 2^32 - 1 characters
    // and no room for the terminator. Measuring reads 4 GiB, too slow under
    // emulation; the 64-bit builds run the same code.
    if (sizeof(void *) < 8)
        GTEST_SKIP() << "4 GiB of reading";
    std::string piece(65535, 'x');
    std::vector<const char *> pieces(65537, piece.c_str());
    char *out = reinterpret_cast<char *>(1);
    uint32_t size;
    EXPECT_STATUS(ZV_ERR_OVERFLOW, zv_util_join(pieces.data(), pieces.size(), "", &out, &size));
    EXPECT_EQ(out, reinterpret_cast<char *>(1));
    EXPECT_FRAMES({"zv_util_join", ZV_ERR_OVERFLOW});
}

TEST(Join, AllocationFailure)
{
    const char *strings[] = {"a", "b"};
    char *out = nullptr;
    uint32_t size;
    zvt::sweep_allocations(
        [&] {
            bool ok = zv_util_join(strings, 2, ",", &out, &size) == ZV_OK;
            zv_util_free(ok ? &out : nullptr);
            return ok;
        },
        [&](unsigned) {
            EXPECT_EQ(out, nullptr);
            EXPECT_FRAMES({"zv_util_join", ZV_ERR_NO_MEMORY});
        });
}

TEST(Append, GrowsByExactlyNBytes)
{
    char *string = nullptr;
    uint32_t length = 42;  // ignored while the string is NULL
    ASSERT_EQ(zv_util_append_string(&string, &length, "abc", 3), ZV_OK);
    ASSERT_EQ(zv_util_append_string(&string, &length, "dexyz", 2), ZV_OK);
    EXPECT_STREQ(string, "abcde");
    EXPECT_EQ(length, 5u);
    zv_util_free(&string);
    // A NUL within n is copied like any byte, when starting and when growing.
    ASSERT_EQ(zv_util_append_string(&string, &length, "a\0b", 3), ZV_OK);
    ASSERT_EQ(zv_util_append_string(&string, &length, "\0c", 2), ZV_OK);
    EXPECT_EQ(length, 5u);
    EXPECT_EQ(std::memcmp(string, "a\0b\0c", 6), 0);
    std::free(string);
    EXPECT_NO_FRAMES();
}

TEST(Append, RefusedCallsChangeNothing)
{
    char existing[] = "abc";
    struct Row {
        bool has_buffer, has_length, has_text, start;
        uint32_t length, n;
        zv_status status;
    } rows[] = {
        {false, true, true, false, 3, 1, ZV_ERR_NULL_ARG},
        {true, false, true, false, 3, 1, ZV_ERR_NULL_ARG},
        {true, true, false, false, 3, 1, ZV_ERR_NULL_ARG},
        {true, true, true, false, 3, 0, ZV_ERR_BAD_VALUE},
        {true, true, true, false, 0, 1, ZV_ERR_BAD_VALUE},
        {true, true, true, true, 0, UINT32_MAX, ZV_ERR_OVERFLOW},
        {true, true, true, false, UINT32_MAX - 2, 2, ZV_ERR_OVERFLOW},  // the NUL would not fit
        {true, true, true, false, UINT32_MAX, 1, ZV_ERR_OVERFLOW},
    };
    for (const Row &row : rows) {
        zvt::clear_trace();
        char *string = row.start ? nullptr : existing;
        uint32_t length = row.length;
        EXPECT_STATUS(row.status, zv_util_append_string(row.has_buffer ? &string : nullptr,
                                                        row.has_length ? &length : nullptr,
                                                        row.has_text ? "xy" : nullptr, row.n));
        EXPECT_FRAMES({"zv_util_append_string", row.status});
        EXPECT_EQ(string, row.start ? nullptr : existing);
        EXPECT_EQ(length, row.length);
    }
}

TEST(Append, AllocationFailureKeepsTheString)
{
    char *string = nullptr;
    uint32_t length = 0;
    for (const char *start : {"", "abc"}) {
        if (*start != '\0') {
            ASSERT_EQ(zv_util_append_string(&string, &length, start, 3), ZV_OK);
        }
        char *before = string;
        zvt::clear_trace();
        zv_status status = zvt::with_fault(
            "alloc", 1, ENOMEM, [&] { return zv_util_append_string(&string, &length, "d", 1); });
        EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
        EXPECT_EQ(string, before);
        EXPECT_EQ(length, std::strlen(start));
        EXPECT_FRAMES({"zv_util_append_string", ZV_ERR_NO_MEMORY});
    }
    EXPECT_STREQ(string, "abc");
    std::free(string);
}

}  // namespace
