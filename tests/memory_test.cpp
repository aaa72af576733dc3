// Memory and bounded string primitives.
#include <gtest/gtest.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/memory.h>

namespace {

TEST(Snprintf, ReturnsLengthOnlyWhenTextAndNulFit)
{
    struct Row {
        int32_t size;
        const char *text;
        int32_t result;
        const char *buffer_after;
    } rows[] = {
        {8, "1234567", 7, "1234567"},    // exactly size - 1 characters
        {8, "12345678", -1, "1234567"},  // exactly size characters: truncated
        {8, "", 0, ""},
        {1, "a", -1, ""},
        {0, "a", -1, "untouched"},
        {-1, "a", -1, "untouched"},
    };
    for (const Row &row : rows) {
        char buffer[16] = "untouched";
        EXPECT_EQ(zv_util_snprintf(buffer, row.size, "%s", row.text), row.result) << row.size;
        EXPECT_STREQ(buffer, row.buffer_after) << row.size;
    }
    EXPECT_NO_FRAMES();
}

TEST(Free, ReleasesOnceAndClearsTheVariable)
{
    char *block = static_cast<char *>(std::malloc(16));
    zv_util_free(&block);
    EXPECT_EQ(block, nullptr);
    zv_util_free(&block);  // already NULL: nothing to release
    EXPECT_EQ(block, nullptr);
    zv_util_free(nullptr);
}

TEST(Memdup, CopiesWithAndWithoutTerminator)
{
    const char source[] = {'a', 'b', 'c'};
    auto *copy = static_cast<char *>(zv_util_memdup(source, 3));
    ASSERT_NE(copy, nullptr);
    EXPECT_EQ(std::memcmp(copy, source, 3), 0);
    std::free(copy);

    auto *text = static_cast<char *>(zv_util_memdup0(source, 3));
    ASSERT_NE(text, nullptr);
    EXPECT_STREQ(text, "abc");
    std::free(text);

    auto *empty = static_cast<char *>(zv_util_memdup0(source, 0));
    ASSERT_NE(empty, nullptr);
    EXPECT_EQ(empty[0], '\0');
    std::free(empty);

    EXPECT_EQ(zv_util_memdup(nullptr, 3), nullptr);
    EXPECT_EQ(zv_util_memdup0(nullptr, 3), nullptr);
}

TEST(Memdup, TerminatorThatWouldWrapAllocatesNothing)
{
    char byte = 'x';
    zvt::fault_arm("alloc", 1, ENOMEM);
    void *copy = zv_util_memdup0(&byte, UINT32_MAX);
    unsigned calls = zvt::fault_calls("alloc");
    zvt::fault_clear();
    EXPECT_EQ(copy, nullptr);
    EXPECT_EQ(calls, 0u);
}

TEST(Memdup, AllocationFailureReturnsNullWithoutFrame)
{
    const char source[] = "abc";
    for (auto dup : {zv_util_memdup, zv_util_memdup0}) {
        void *copy = zvt::with_fault("alloc", 1, ENOMEM, [&] { return dup(source, 3); });
        EXPECT_EQ(copy, nullptr);
    }
    char *text = zvt::with_fault("alloc", 1, ENOMEM, [&] { return zv_util_strndup(source, 2); });
    EXPECT_EQ(text, nullptr);
    EXPECT_NO_FRAMES();
}

TEST(StrReplace, StopsAtMaximumOrNul)
{
    struct Row {
        const char *before;
        uint32_t maximum;
        char find, replacement;
        const char *after;
    } rows[] = {
        {"banana", 3, 'a', 'b', "bbnana"},
        {"banana", 100, 'a', 'b', "bbnbnb"},
        {"banana", 0, 'a', 'b', "banana"},
        {"banana", 100, '\0', 'x', "banana"},  // NUL never matches
    };
    for (const Row &row : rows) {
        char text[16];
        std::strcpy(text, row.before);
        EXPECT_EQ(zv_util_str_replace(text, row.maximum, row.find, row.replacement), ZV_OK);
        EXPECT_STREQ(text, row.after) << row.before << " max " << row.maximum;
    }
    EXPECT_EQ(zv_util_str_replace(nullptr, 5, 'a', 'b'), ZV_OK);
}

TEST(StrReplace, NulReplacementKeepsWalkingTheOriginalText)
{
    char text[] = "a.b.c";
    zv_util_str_replace(text, 100, '.', '\0');
    EXPECT_EQ(std::memcmp(text, "a\0b\0c", 6), 0);
}

TEST(Wrappers, BehaveAsGlibc)
{
    char dest[5];
    std::memset(dest, 'x', sizeof dest);
    zv_util_strncpy(dest, "12345", 5);
    EXPECT_EQ(std::memcmp(dest, "12345", 5), 0) << "no terminator when the source fills the length";
    char padded[6];
    std::memset(padded, 'x', sizeof padded);
    zv_util_strncpy(padded, "ab", 6);
    EXPECT_EQ(std::memcmp(padded, "ab\0\0\0\0", 6), 0);

    EXPECT_EQ(zv_util_strnlen("abcdef", 3), 3u);
    EXPECT_EQ(zv_util_strnlen("ab", 30), 2u);
    char *copy = zv_util_strndup("abcdef", 3);
    EXPECT_STREQ(copy, "abc");
    std::free(copy);

    const char hay[] = "xxneedlexx";
    EXPECT_EQ(zv_util_memmem(hay, 10, "needle", 6), hay + 2);
    EXPECT_EQ(zv_util_memmem(hay, 7, "needle", 6), nullptr);
    EXPECT_EQ(zv_util_strcasecmp("ABC", "abc"), 0);
    EXPECT_LT(zv_util_strcasecmp("abc", "ABD"), 0);
}

TEST(Getline, ReadsLinesThenMinusOne)
{
    char text[] = "one\ntwo";
    FILE *stream = fmemopen(text, std::strlen(text), "r");
    ASSERT_NE(stream, nullptr);
    char *line = nullptr;
    uint32_t capacity = 0;
    EXPECT_EQ(zv_util_getline(stream, &line, &capacity), 4);
    EXPECT_STREQ(line, "one\n");
    EXPECT_GE(capacity, 5u);
    EXPECT_EQ(zv_util_getline(stream, &line, &capacity), 3);
    EXPECT_STREQ(line, "two");
    EXPECT_EQ(zv_util_getline(stream, &line, &capacity), -1);
    std::free(line);
    std::fclose(stream);
}

}  // namespace
