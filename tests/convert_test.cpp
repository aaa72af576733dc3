// Multibyte to wide conversion.
#include <gtest/gtest.h>

#include <cerrno>
#include <clocale>
#include <cstdlib>
#include <string>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/convert.h>
#include <zvutil/memory.h>

namespace {

// UTF-8 for the test's duration; the caller's locale comes back afterwards.
class CharToWchar : public testing::Test {
protected:
    void SetUp() override { ASSERT_NE(std::setlocale(LC_CTYPE, "C.UTF-8"), nullptr); }
    void TearDown() override { std::setlocale(LC_CTYPE, saved_.c_str()); }

private:
    std::string saved_ = std::setlocale(LC_CTYPE, nullptr);
};

TEST_F(CharToWchar, Converts)
{
    const std::pair<const char *, std::wstring> rows[] = {
        {"", L""}, {"\xc3\xa9", L"\u00e9"}, {"a\xe2\x82\xac\xf0\x9f\x98\x80", L"a\u20ac\U0001F600"}};
    for (const auto &[text, wide] : rows) {
        wchar_t *out = nullptr;
        uint32_t count = 99;
        ASSERT_EQ(zv_util_char_to_wchar(text, 12345, &out, &count), ZV_OK);
        EXPECT_EQ(count, wide.size());
        EXPECT_EQ(std::wstring(out, count + 1), wide + L'\0');
        std::free(out);
    }
    EXPECT_NO_FRAMES();
}

TEST_F(CharToWchar, RefusedBeforeAllocating)
{
    wchar_t *out = reinterpret_cast<wchar_t *>(1);
    uint32_t count;
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_char_to_wchar(nullptr, 0, &out, &count));
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_char_to_wchar("a", 0, nullptr, &count));
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_char_to_wchar("a", 0, &out, nullptr));
    zvt::fault_arm("alloc", 1, ENOMEM);
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_char_to_wchar("a\x80", 0, &out, &count));
    EXPECT_EQ(zvt::fault_calls("alloc"), 0u);
    zvt::fault_clear();
    EXPECT_EQ(out, reinterpret_cast<wchar_t *>(1));
    EXPECT_FRAMES({"zv_util_char_to_wchar", ZV_ERR_NULL_ARG}, {"zv_util_char_to_wchar", ZV_ERR_NULL_ARG},
                  {"zv_util_char_to_wchar", ZV_ERR_NULL_ARG}, {"zv_util_char_to_wchar", ZV_ERR_BAD_VALUE});
}

TEST_F(CharToWchar, FailuresAfterAllocatingReleaseTheString)
{
    wchar_t *out = nullptr;
    uint32_t count;
    zv_status status;
    zvt::sweep_allocations(
        [&] {
            status = zv_util_char_to_wchar("abc", 0, &out, &count);
            zv_util_free(status == ZV_OK ? &out : nullptr);
            return status == ZV_OK;
        },
        [&](unsigned) {
            EXPECT_EQ(out, nullptr);
            EXPECT_FRAMES({"zv_util_char_to_wchar", ZV_ERR_NO_MEMORY});
        });
    // The converting pass fails, or stops short of the end of the text.
    const std::tuple<const char *, unsigned, zv_status> rows[] = {
        {"mbsrtowcs", 2, ZV_ERR_BAD_VALUE}, {"mbsrtowcs_short", 1, ZV_ERR_TOO_SMALL}};
    for (const auto &[point, nth, expected] : rows) {
        zvt::clear_trace();
        size_t heap = zvt::heap_in_use();
        out = reinterpret_cast<wchar_t *>(1);
        status = zvt::with_fault(point, nth, EILSEQ,
                                 [&] { return zv_util_char_to_wchar("abc", 0, &out, &count); });
        EXPECT_STATUS(expected, status);
        EXPECT_EQ(out, nullptr);
        EXPECT_EQ(zvt::heap_in_use(), heap);
        EXPECT_FRAMES({"zv_util_char_to_wchar", expected});
    }
}

}  // namespace
