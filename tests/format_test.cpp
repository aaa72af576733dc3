// Formatted allocation.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/format.h>
#include <zvutil/memory.h>

namespace {

zv_status vsize(uint32_t *size, const char *format, ...)
{
    va_list args;
    va_start(args, format);
    zv_status status = zv_util_printf_vsize(format, args, size);
    va_end(args);
    return status;
}

TEST(Asprintf, AllocatesExactlyTheMeasuredSize)
{
    struct Row {
        const char *expected;
        const char *format;
    } rows[] = {{"", ""}, {"x=42 y", "x=%d %s"}, {"%", "%%"}};
    for (const Row &row : rows) {
        char *out = reinterpret_cast<char *>(1);
        int32_t err = -1;
        ASSERT_EQ(zv_util_asprintf(&out, &err, row.format, 42, "y"), ZV_OK);
        EXPECT_STREQ(out, row.expected);
        EXPECT_EQ(err, 0);
        uint32_t size = 0;
        EXPECT_EQ(vsize(&size, row.format, 42, "y"), ZV_OK);
        EXPECT_EQ(size, std::strlen(out) + 1);
        std::free(out);
    }
    EXPECT_NO_FRAMES();
}

TEST(Asprintf, LongTextUsesTheArgumentsTwice)
{
    std::string big(5000, 'q');
    char *out = nullptr;
    ASSERT_EQ(zv_util_asprintf(&out, nullptr, "<%s|%d>", big.c_str(), 7), ZV_OK);
    EXPECT_EQ(std::string(out), "<" + big + "|7>");
    std::free(out);
}

TEST(Asprintf, NullArgumentsRecordOneFrameOfTheAllocator)
{
    char *out = reinterpret_cast<char *>(1);
    int32_t err = 99;
    const char *no_format = nullptr;
    EXPECT_EQ(zv_util_asprintf(&out, &err, no_format), ZV_ERR_NULL_ARG);
    EXPECT_EQ(out, reinterpret_cast<char *>(1)) << "out untouched";
    EXPECT_EQ(err, 99);
    EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_NULL_ARG});

    zvt::clear_trace();
    EXPECT_EQ(zv_util_asprintf(nullptr, &err, "x"), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_NULL_ARG});

    zvt::clear_trace();
    uint32_t size;
    EXPECT_EQ(vsize(nullptr, "x"), ZV_ERR_NULL_ARG);
    EXPECT_EQ(vsize(&size, no_format), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_printf_vsize", ZV_ERR_NULL_ARG}, {"zv_util_printf_vsize", ZV_ERR_NULL_ARG});
}

TEST(Asprintf, MeasuringFailureLeavesTwoFrames)
{
    char *out = reinterpret_cast<char *>(1);
    int32_t err = 99;
    zv_status status = zvt::with_fault("vsnprintf", 1, EOVERFLOW,
                                       [&] { return zv_util_asprintf(&out, &err, "x"); });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(out, nullptr);
    EXPECT_EQ(err, 99) << "errno_out untouched";
    EXPECT_FRAMES({"zv_util_printf_vsize", ZV_ERR_SYSTEM}, {"zv_util_vasprintf", ZV_ERR_SYSTEM});
}

TEST(Asprintf, SecondFormattingFailureReleasesTheBlock)
{
    char *out = reinterpret_cast<char *>(1);
    int32_t err = 99;
    size_t heap = zvt::heap_in_use();
    zv_status status = zvt::with_fault("vsnprintf", 2, EILSEQ,
                                       [&] { return zv_util_asprintf(&out, &err, "x"); });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(out, nullptr);
    EXPECT_EQ(err, EILSEQ);
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_SYSTEM});

    zvt::clear_trace();
    status = zvt::with_fault("vsnprintf", 2, EILSEQ,
                             [&] { return zv_util_asprintf(&out, nullptr, "x"); });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
}

TEST(Asprintf, AllocationFailureSweep)
{
    char *out = nullptr;
    int32_t err = 99;
    zvt::sweep_allocations(
        [&] {
            err = 99;
            zv_status status = zv_util_asprintf(&out, &err, "%s/%d", "path", 12);
            if (status == ZV_OK)
                zv_util_free(&out);
            return status == ZV_OK;
        },
        [&](unsigned) {
            EXPECT_EQ(out, nullptr);
            EXPECT_EQ(err, 99);
            EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_NO_MEMORY});
        });
}

}  // namespace
