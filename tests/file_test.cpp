// Descriptor operations, durable sync, path components and named files.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

#include "support/fault.h"
#include "support/scratch.h"
#include "support/trace.h"
#include <zvutil/file.h>
#include <zvutil/memory.h>

namespace {

using zvt::ScratchDir;

constexpr int32_t kUntouched = 12345;

// A descriptor on |path| opened for reading, large files allowed.
int open_read(const std::string &path)
{
    return ::open(path.c_str(), O_RDONLY | O_LARGEFILE);
}

off_t position(int fd) { return ::lseek(fd, 0, SEEK_CUR); }

// ---- Descriptors ------------------------------------------------------------

TEST(Open, FormatsThePathAndPassesFlagsAndModeThrough)
{
    ScratchDir dir;
    mode_t old_mask = umask(022);
    int32_t fd = -7, err = kUntouched;
    ASSERT_EQ(zv_util_open(&fd, &err, O_WRONLY | O_CREAT | O_EXCL, 0640, "%s/x.%d",
                           dir.path().c_str(), 7),
              ZV_OK);
    umask(old_mask);
    EXPECT_GE(fd, 0);
    EXPECT_EQ(err, 0);
    close(fd);
    struct stat st;
    ASSERT_EQ(stat((dir / "x.7").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0640u);

    // O_EXCL is honoured, not stripped: the second creation fails.
    unsigned fds = zvt::open_fd_count();
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_open(&fd, &err, O_WRONLY | O_CREAT | O_EXCL, 0640,
                                              "%s/x.%d", dir.path().c_str(), 7));
    EXPECT_EQ(fd, -1);
    EXPECT_EQ(err, EEXIST);
    EXPECT_EQ(zvt::open_fd_count(), fds);
    EXPECT_FRAMES({"zv_util_open", ZV_ERR_SYSTEM});
}

TEST(Open, MissingFileWithoutCreation)
{
    ScratchDir dir;
    int32_t fd = 0, err = kUntouched;
    EXPECT_STATUS(ZV_ERR_SYSTEM,
                  zv_util_open(&fd, &err, O_RDONLY, 0, "%s/missing", dir.path().c_str()));
    EXPECT_EQ(fd, -1);
    EXPECT_EQ(err, ENOENT);
    EXPECT_FRAMES({"zv_util_open", ZV_ERR_SYSTEM});
}

TEST(Open, NullArgumentsAndFormattingFailures)
{
    int32_t fd = kUntouched, err = kUntouched;
    const char *no_format = nullptr;
    EXPECT_EQ(zv_util_open(nullptr, &err, O_RDONLY, 0, "/tmp"), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_open(&fd, &err, O_RDONLY, 0, no_format), ZV_ERR_NULL_ARG);
    EXPECT_EQ(err, kUntouched);
    EXPECT_FRAMES({"zv_util_open", ZV_ERR_NULL_ARG}, {"zv_util_open", ZV_ERR_NULL_ARG});

    // The formatter's frames pass through without one of the opener's own.
    zvt::clear_trace();
    zv_status status = zvt::with_fault("vsnprintf", 1, EOVERFLOW, [&] {
        return zv_util_open(&fd, &err, O_RDONLY, 0, "%s", "/tmp");
    });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(fd, kUntouched);
    EXPECT_FRAMES({"zv_util_printf_vsize", ZV_ERR_SYSTEM}, {"zv_util_vasprintf", ZV_ERR_SYSTEM});

    zvt::sweep_allocations(
        [&] {
            fd = kUntouched;
            zv_status st = zv_util_open(&fd, nullptr, O_RDONLY, 0, "%s", "/tmp");
            if (st == ZV_OK)
                close(fd);
            return st == ZV_OK;
        },
        [&](unsigned) {
            EXPECT_EQ(fd, kUntouched);
            EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_NO_MEMORY});
        });
}

class Pipe : public ::testing::Test {
protected:
    void SetUp() override { ASSERT_EQ(pipe(ends_), 0); }
    void TearDown() override
    {
        close_writer();
        close(ends_[0]);
    }
    void close_writer()
    {
        if (ends_[1] >= 0)
            close(ends_[1]);
        ends_[1] = -1;
    }
    int reader() const { return ends_[0]; }
    int writer() const { return ends_[1]; }

private:
    int ends_[2] = {-1, -1};
};

using WholeTransfer = Pipe;

TEST_F(WholeTransfer, RoundTripAndZeroLength)
{
    const char text[] = "hello, pipe";
    EXPECT_EQ(zv_util_whole_write(writer(), text, sizeof text, nullptr), ZV_OK);
    char back[sizeof text] = {};
    EXPECT_EQ(zv_util_whole_read(reader(), back, sizeof back), int32_t{sizeof text});
    EXPECT_STREQ(back, text);

    // Length 0 never reaches the platform.
    zvt::fault_arm("write", 1, EIO);
    zvt::fault_arm("read", 1, EIO);
    EXPECT_EQ(zv_util_whole_write(writer(), text, 0, nullptr), ZV_OK);
    EXPECT_EQ(zv_util_whole_read(reader(), back, 0), 0);
    EXPECT_EQ(zvt::fault_calls("write") + zvt::fault_calls("read"), 0u);
    zvt::fault_clear();
    EXPECT_NO_FRAMES();
}

TEST_F(WholeTransfer, BadArguments)
{
    int32_t err = kUntouched;
    char byte = 0;
    EXPECT_EQ(zv_util_whole_write(writer(), nullptr, 1, &err), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_whole_write(writer(), &byte, -1, &err), ZV_ERR_OVERFLOW);
    EXPECT_EQ(err, kUntouched);
    EXPECT_FRAMES({"zv_util_whole_write", ZV_ERR_NULL_ARG},
                  {"zv_util_whole_write", ZV_ERR_OVERFLOW});
    zvt::clear_trace();
    EXPECT_EQ(zv_util_whole_read(reader(), nullptr, 1), -EINVAL);
    EXPECT_EQ(zv_util_whole_read(reader(), &byte, -1), -EINVAL);
    EXPECT_NO_FRAMES();
}

TEST_F(WholeTransfer, FailuresAndIdleCalls)
{
    int32_t err = kUntouched;
    zv_status status = zvt::with_fault("write", 1, EPIPE, [&] {
        return zv_util_whole_write(writer(), "abc", 3, &err);
    });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(err, EPIPE);
    EXPECT_FRAMES({"zv_util_whole_write", ZV_ERR_SYSTEM});

    // Five writes in a row that take nothing: -11, no frame, errno_out kept.
    zvt::clear_trace();
    err = kUntouched;
    zvt::fault_arm("write_idle", 1, 0, 4);
    status = zv_util_whole_write(writer(), "abc", 3, &err);
    zvt::fault_clear();
    EXPECT_EQ(status, static_cast<zv_status>(-11));
    EXPECT_EQ(err, kUntouched);
    EXPECT_NO_FRAMES();
    // Four are tolerated.
    zvt::fault_arm("write_idle", 1, 0, 3);
    status = zv_util_whole_write(writer(), "abc", 3, &err);
    zvt::fault_clear();
    EXPECT_EQ(status, ZV_OK);

    char buf[8] = {};
    int saved = 0;
    int32_t got = zvt::with_fault("read", 1, EINTR, [&] {
        int32_t result = zv_util_whole_read(reader(), buf, 3);
        saved = errno;
        return result;
    });
    EXPECT_EQ(got, -1);
    EXPECT_EQ(saved, EINTR);
    EXPECT_EQ(zv_util_whole_read(reader(), buf, 3), 3);
    EXPECT_STREQ(buf, "abc");
}

TEST_F(WholeTransfer, IdleBudgetCountsOnlyConsecutiveEmptyReads)
{
    ASSERT_EQ(write(writer(), "xyz", 3), 3);
    close_writer();
    // Four empty reads, then the three bytes, then end of file: the budget was
    // refilled by the bytes, so five more empty reads end it.
    char buf[8] = {};
    zvt::fault_arm("read_idle", 1, 0, 3);
    int32_t got = zv_util_whole_read(reader(), buf, 6);
    unsigned reads = zvt::fault_calls("read_idle");
    zvt::fault_clear();
    EXPECT_EQ(got, -11);
    EXPECT_EQ(reads, 4u + 1 + 5);
    EXPECT_STREQ(buf, "xyz");
    EXPECT_NO_FRAMES();
}

TEST(ReadFile, WholeFileFromTheCurrentPosition)
{
    ScratchDir dir;
    struct Row {
        std::string content;
    } rows[] = {{""}, {"one line\n"}, {std::string("nul\0inside\0", 11)}, {std::string(5000, 'z')}};
    for (const Row &row : rows) {
        zvt::put_file(dir / "f", row.content);
        int fd = open_read(dir / "f");
        char *buf = nullptr;
        uint32_t size = 99;
        int32_t err = kUntouched;
        ASSERT_EQ(zv_util_read_file(fd, &buf, &size, &err), ZV_OK);
        ASSERT_EQ(size, row.content.size());
        EXPECT_EQ(std::string(buf, size), row.content);
        EXPECT_EQ(buf[size], '\0');
        EXPECT_EQ(err, kUntouched);
        std::free(buf);
        close(fd);
    }
    EXPECT_NO_FRAMES();
}

TEST(ReadFile, SizeZeroFileOfProcReadsNothing)
{
    int fd = open_read("/proc/version");
    ASSERT_GE(fd, 0);
    char *buf = nullptr;
    uint32_t size = 99;
    zvt::fault_arm("read", ~0u, EIO);
    EXPECT_EQ(zv_util_read_file(fd, &buf, &size, nullptr), ZV_OK);
    EXPECT_EQ(zvt::fault_calls("read"), 0u);
    zvt::fault_clear();
    EXPECT_EQ(size, 0u);
    ASSERT_NE(buf, nullptr);
    EXPECT_EQ(buf[0], '\0');
    std::free(buf);
    close(fd);
}

TEST(ReadFile, Failures)
{
    ScratchDir dir;
    zvt::put_file(dir / "f", "0123456789");
    int fd = open_read(dir / "f");
    char *buf = reinterpret_cast<char *>(1);
    uint32_t size = 99;
    int32_t err = kUntouched;

    EXPECT_EQ(zv_util_read_file(fd, nullptr, &size, &err), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_read_file(fd, &buf, nullptr, &err), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_read_file", ZV_ERR_NULL_ARG}, {"zv_util_read_file", ZV_ERR_NULL_ARG});

    zvt::clear_trace();
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_read_file(-1, &buf, &size, &err));
    EXPECT_EQ(err, EBADF);
    EXPECT_EQ(size, 99u);
    EXPECT_EQ(buf, reinterpret_cast<char *>(1));
    EXPECT_FRAMES({"zv_util_read_file", ZV_ERR_SYSTEM});

    // In the middle of the file fewer bytes than the size remain.
    zvt::clear_trace();
    err = kUntouched;
    size_t heap = zvt::heap_in_use();
    ASSERT_EQ(lseek(fd, 4, SEEK_SET), 4);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_read_file(fd, &buf, &size, &err));
    EXPECT_EQ(buf, nullptr);
    EXPECT_EQ(size, 10u);
    EXPECT_EQ(err, kUntouched);
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_FRAMES({"zv_util_read_file", ZV_ERR_SYSTEM});

    zvt::sweep_allocations(
        [&] {
            lseek(fd, 0, SEEK_SET);
            size = 99;
            err = kUntouched;
            zv_status st = zv_util_read_file(fd, &buf, &size, &err);
            if (st == ZV_OK)
                zv_util_free(&buf);
            return st == ZV_OK;
        },
        [&](unsigned) {
            EXPECT_EQ(buf, nullptr);
            EXPECT_EQ(size, 10u);
            EXPECT_EQ(err, ENOMEM);
            EXPECT_FRAMES({"zv_util_read_file", ZV_ERR_NO_MEMORY});
        });
    close(fd);
}

TEST(CountLines, CountsNewlinesAndRestoresThePosition)
{
    ScratchDir dir;
    std::string long_text;
    for (int i = 0; i < 300; i++)
        long_text += "123456789\n";  // crosses the 1024-byte chunks
    struct Row {
        std::string content;
        uint32_t lines;
    } rows[] = {{"a\nb\n", 2}, {"a\nb", 1}, {"", 0}, {"\r\n\r\n\r", 2}, {long_text, 300}};
    for (const Row &row : rows) {
        zvt::put_file(dir / "f", row.content);
        int fd = open_read(dir / "f");
        lseek(fd, row.content.size() / 2, SEEK_SET);
        uint32_t count = 99;
        EXPECT_EQ(zv_util_count_lines(fd, &count, nullptr), ZV_OK);
        EXPECT_EQ(count, row.lines) << row.content.substr(0, 10);
        EXPECT_EQ(position(fd), static_cast<off_t>(row.content.size() / 2));
        close(fd);
    }
    EXPECT_NO_FRAMES();
}

TEST_F(Pipe, CountLinesOnAPipeFailsAtThePositionQuery)
{
    uint32_t count = 99;
    int32_t err = kUntouched;
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_count_lines(reader(), &count, &err));
    EXPECT_EQ(err, ESPIPE);
    EXPECT_FRAMES({"zv_util_count_lines", ZV_ERR_SYSTEM});
}

TEST(CountLines, Failures)
{
    ScratchDir dir;
    std::string text;
    for (int i = 0; i < 200; i++)
        text += "123456789\n";  // 102 lines in the first 1024 bytes
    zvt::put_file(dir / "f", text);
    int fd = open_read(dir / "f");
    uint32_t count = 99;
    int32_t err = kUntouched;

    EXPECT_EQ(zv_util_count_lines(fd, nullptr, &err), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_count_lines(-1, &count, &err), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(err, kUntouched);
    EXPECT_FRAMES({"zv_util_count_lines", ZV_ERR_NULL_ARG},
                  {"zv_util_count_lines", ZV_ERR_BAD_VALUE});

    struct Row {
        const char *point;
        unsigned nth;
        int err;
        uint32_t count;  // after the call
    } rows[] = {
        {"lseek", 1, EBADF, 99},  // position query
        {"fstat", 1, EIO, 99},
        {"lseek", 2, EINVAL, 99},  // seek to the start
        {"read", 2, EIO, 102},     // partial count kept
    };
    for (const Row &row : rows) {
        zvt::clear_trace();
        lseek(fd, 7, SEEK_SET);
        count = 99;
        zv_status status = zvt::with_fault(row.point, row.nth, row.err, [&] {
            return zv_util_count_lines(fd, &count, &err);
        });
        EXPECT_STATUS(ZV_ERR_SYSTEM, status) << row.point << row.nth;
        EXPECT_EQ(err, row.err) << row.point << row.nth;
        EXPECT_EQ(count, row.count) << row.point << row.nth;
        EXPECT_EQ(position(fd), 7) << row.point << row.nth;
        EXPECT_FRAMES({"zv_util_count_lines", ZV_ERR_SYSTEM});
    }
    close(fd);
}

TEST(CountLines, FileThatShrankEndsTheCount)
{
    ScratchDir dir;
    zvt::put_file(dir / "f", "a\nb\nc\n");
    int fd = open_read(dir / "f");
    lseek(fd, 2, SEEK_SET);
    uint32_t count = 99;
    zvt::fault_arm("fstat_grown", 1, 0);
    EXPECT_EQ(zv_util_count_lines(fd, &count, nullptr), ZV_OK);
    zvt::fault_clear();
    EXPECT_EQ(count, 3u);
    EXPECT_EQ(position(fd), 2);
    EXPECT_NO_FRAMES();
    close(fd);
}

TEST(GetFileSize, SizesAndFailures)
{
    ScratchDir dir;
    zvt::put_file(dir / "f", "12345");
    int64_t size = -1;
    EXPECT_EQ(zv_util_get_file_size((dir / "f").c_str(), &size), ZV_OK);
    EXPECT_EQ(size, 5);

    EXPECT_EQ(zv_util_get_file_size(nullptr, &size), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_get_file_size((dir / "f").c_str(), nullptr), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_get_file_size", ZV_ERR_NULL_ARG},
                  {"zv_util_get_file_size", ZV_ERR_NULL_ARG});

    zvt::clear_trace();
    size = -1;
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_get_file_size((dir / "missing").c_str(), &size));
    unsigned fds = zvt::open_fd_count();
    zv_status status = zvt::with_fault("fstat", 1, EIO, [&] {
        return zv_util_get_file_size((dir / "f").c_str(), &size);
    });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(zvt::open_fd_count(), fds);
    EXPECT_EQ(size, -1);
    EXPECT_FRAMES({"zv_util_get_file_size", ZV_ERR_SYSTEM},
                  {"zv_util_get_file_size", ZV_ERR_SYSTEM});
}

TEST(TruncateAndDelete, ChangeTheFileOrFail)
{
    ScratchDir dir;
    std::string f = dir / "f";
    zvt::put_file(f, "0123456789");
    int32_t err = kUntouched;
    EXPECT_EQ(zv_util_truncate_file(f.c_str(), 4, &err), ZV_OK);
    EXPECT_EQ(zvt::get_file(f), "0123");
    EXPECT_EQ(zv_util_truncate_file(f.c_str(), 6, &err), ZV_OK);
    EXPECT_EQ(zvt::get_file(f), std::string("0123\0\0", 6));
    EXPECT_EQ(err, kUntouched);

    EXPECT_EQ(zv_util_truncate_file(nullptr, 0, &err), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_delete_file(nullptr, &err), ZV_ERR_NULL_ARG);
    EXPECT_EQ(err, kUntouched);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_truncate_file(f.c_str(), -1, &err));
    EXPECT_EQ(err, EINVAL);
    EXPECT_FRAMES({"zv_util_truncate_file", ZV_ERR_NULL_ARG},
                  {"zv_util_delete_file", ZV_ERR_NULL_ARG},
                  {"zv_util_truncate_file", ZV_ERR_SYSTEM});

    zvt::clear_trace();
    EXPECT_EQ(zv_util_delete_file(f.c_str(), &err), ZV_OK);
    EXPECT_NE(access(f.c_str(), F_OK), 0);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_delete_file(f.c_str(), &err));
    EXPECT_EQ(err, ENOENT);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_truncate_file(f.c_str(), 0, &err));
    EXPECT_EQ(err, ENOENT);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_delete_file(dir.path().c_str(), &err));
    EXPECT_EQ(err, EISDIR);
    EXPECT_FRAMES({"zv_util_delete_file", ZV_ERR_SYSTEM}, {"zv_util_truncate_file", ZV_ERR_SYSTEM},
                  {"zv_util_delete_file", ZV_ERR_SYSTEM});
}

TEST(QueryFileExists, AnswersAndFailures)
{
    ScratchDir dir;
    zvt::put_file(dir / "f", "x");
    ASSERT_EQ(symlink((dir / "nowhere").c_str(), (dir / "dangling").c_str()), 0);
    struct Row {
        std::string path;
        uint32_t exists;
    } rows[] = {{dir / "f", 1}, {dir.path(), 1}, {dir / "missing", 0}, {dir / "dangling", 0}};
    for (const Row &row : rows) {
        uint32_t exists = 99;
        EXPECT_EQ(zv_util_query_file_exists(row.path.c_str(), &exists), ZV_OK) << row.path;
        EXPECT_EQ(exists, row.exists) << row.path;
    }
    EXPECT_NO_FRAMES();

    uint32_t exists = 99;
    EXPECT_EQ(zv_util_query_file_exists(nullptr, &exists), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_query_file_exists((dir / "f").c_str(), nullptr), ZV_ERR_NULL_ARG);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_query_file_exists((dir / "f/x").c_str(), &exists));
    EXPECT_EQ(exists, 99u);
    EXPECT_FRAMES({"zv_util_query_file_exists", ZV_ERR_NULL_ARG},
                  {"zv_util_query_file_exists", ZV_ERR_NULL_ARG},
                  {"zv_util_query_file_exists", ZV_ERR_SYSTEM});
}

TEST(QueryFileExists, WideInodeNumbersAreNoFailure)
{
    ScratchDir dir;
    zvt::put_file(dir / "f", "x");
    uint32_t exists = 0;
    zvt::fault_arm("stat_wide_inode", 1, 0);
    EXPECT_EQ(zv_util_query_file_exists((dir / "f").c_str(), &exists), ZV_OK);
    EXPECT_TRUE(zvt::fault_fired()) << "the 64-bit status query was not used";
    zvt::fault_clear();
    EXPECT_EQ(exists, 1u);
}

// Files of 2 GiB or more: i386 refuses them everywhere; with 64-bit offsets
// only the descriptor read, whose sizes are 32-bit, refuses them.
TEST(LargeFile, SparseFileJustOver2GiB)
{
    ScratchDir dir;
    std::string f = dir / "big";
    zvt::put_file(f, "");
    ASSERT_EQ(truncate64(f.c_str(), (off64_t{1} << 31) + 1), 0);
    int64_t size = 0;
    uint32_t exists = 99, count = 99;
    char *buf = reinterpret_cast<char *>(1);
    uint32_t buf_size = 99;
    int32_t err = kUntouched;
    int fd = open_read(f);
    ASSERT_GE(fd, 0);

    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_read_file(fd, &buf, &buf_size, &err));
    EXPECT_EQ(err, EOVERFLOW);
    EXPECT_EQ(buf, reinterpret_cast<char *>(1));
    EXPECT_FRAMES({"zv_util_read_file", ZV_ERR_SYSTEM});
    zvt::clear_trace();
    if (sizeof(off_t) == 4) {
        err = kUntouched;
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_count_lines(fd, &count, &err));
        EXPECT_EQ(err, EOVERFLOW);
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_get_file_size(f.c_str(), &size));
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_query_file_exists(f.c_str(), &exists));
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_read_named_file(f.c_str(), &buf, &buf_size, nullptr));
        EXPECT_EQ(size, 0);
        EXPECT_EQ(exists, 99u);
        EXPECT_EQ(buf, reinterpret_cast<char *>(1));
        EXPECT_FRAMES({"zv_util_count_lines", ZV_ERR_SYSTEM},
                      {"zv_util_get_file_size", ZV_ERR_SYSTEM},
                      {"zv_util_query_file_exists", ZV_ERR_SYSTEM},
                      {"zv_util_get_file_size", ZV_ERR_SYSTEM},
                      {"zv_util_read_named_file", ZV_ERR_SYSTEM});
    } else {
        EXPECT_EQ(zv_util_get_file_size(f.c_str(), &size), ZV_OK);
        EXPECT_EQ(size, (int64_t{1} << 31) + 1);
        EXPECT_EQ(zv_util_query_file_exists(f.c_str(), &exists), ZV_OK);
        EXPECT_EQ(exists, 1u);
        EXPECT_NO_FRAMES();
    }
    close(fd);

    // One byte less is within every bound.
    ASSERT_EQ(truncate64(f.c_str(), (off64_t{1} << 31) - 1), 0);
    EXPECT_EQ(zv_util_get_file_size(f.c_str(), &size), ZV_OK);
    EXPECT_EQ(size, INT32_MAX);
}

TEST(LargeFile, NamedReadRefusesSizesBeyond32Bits)
{
    if (sizeof(off_t) == 4)
        GTEST_SKIP() << "the size query already refuses files of 2 GiB";
    ScratchDir dir;
    std::string f = dir / "huge";
    zvt::put_file(f, "");
    ASSERT_EQ(truncate64(f.c_str(), (off64_t{1} << 32) + 1), 0);
    char *buf = reinterpret_cast<char *>(1);
    uint32_t size = 99;
    EXPECT_STATUS(ZV_ERR_OVERFLOW, zv_util_read_named_file(f.c_str(), &buf, &size, nullptr));
    EXPECT_EQ(buf, reinterpret_cast<char *>(1));
    EXPECT_EQ(size, 99u);
    EXPECT_FRAMES({"zv_util_read_named_file", ZV_ERR_OVERFLOW});
}

// ---- Durable sync and path components ---------------------------------------

TEST(Sync, FileThenDirectory)
{
    ScratchDir dir;
    FILE *stream = fopen((dir / "f").c_str(), "w");
    ASSERT_NE(stream, nullptr);
    std::fputs("data", stream);

    // Without a directory none is opened.
    zvt::fault_arm("open", ~0u, EIO);
    zvt::fault_arm("fsync", ~0u, EIO);
    EXPECT_EQ(zv_util_sync(stream, nullptr), ZV_OK);
    EXPECT_EQ(zvt::fault_calls("open"), 0u);
    EXPECT_EQ(zvt::fault_calls("fsync"), 1u);
    zvt::fault_clear();
    EXPECT_EQ(zvt::get_file(dir / "f"), "data");

    zvt::fault_arm("fsync", ~0u, EIO);
    EXPECT_EQ(zv_util_sync(stream, dir.path().c_str()), ZV_OK);
    EXPECT_EQ(zvt::fault_calls("fsync"), 2u);
    zvt::fault_clear();

    // A missing directory fails after the file was synced.
    zvt::fault_arm("fsync", ~0u, EIO);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_sync(stream, (dir / "missing").c_str()));
    EXPECT_EQ(zvt::fault_calls("fsync"), 1u);
    zvt::fault_clear();
    EXPECT_FRAMES({"zv_util_sync", ZV_ERR_SYSTEM});
    std::fclose(stream);
}

TEST(Sync, EachFailingStepRecordsOneFrame)
{
    ScratchDir dir;
    FILE *stream = fopen((dir / "f").c_str(), "w");
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(zv_util_sync(nullptr, nullptr), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_sync", ZV_ERR_NULL_ARG});

    struct Row {
        const char *point;
        unsigned nth;
        unsigned dir_opens;  // directory opens reached
    } rows[] = {{"fflush", 1, 0}, {"fileno", 1, 0}, {"fsync", 1, 0}, {"open", 1, 1}, {"fsync", 2, 1}};
    for (const Row &row : rows) {
        zvt::clear_trace();
        unsigned fds = zvt::open_fd_count();
        zvt::fault_arm(row.point, row.nth, EIO);
        zvt::fault_arm("open", ~0u, 0);  // counts directory opens
        zv_status status = zv_util_sync(stream, dir.path().c_str());
        unsigned opens = zvt::fault_calls("open");  // the first "open" rule's count
        zvt::fault_clear();
        EXPECT_STATUS(ZV_ERR_SYSTEM, status) << row.point << row.nth;
        EXPECT_EQ(opens, row.dir_opens) << row.point << row.nth;
        EXPECT_EQ(zvt::open_fd_count(), fds) << row.point << row.nth;
        EXPECT_FRAMES({"zv_util_sync", ZV_ERR_SYSTEM});
    }
    std::fclose(stream);
}

// A path of exactly |length| bytes naming |file| inside |dir|, padded with
// "./" components.
std::string padded_path(const std::string &dir, const std::string &file, size_t length)
{
    std::string path = dir + "/";
    if ((length - path.size() - file.size()) % 2 != 0)
        path += "/";
    while (path.size() + file.size() < length)
        path += "./";
    return path + file;
}

TEST(SyncFile, PathBoundIs999Bytes)
{
    ScratchDir dir;
    zvt::put_file(dir / "f", "x");
    std::string longest = padded_path(dir.path(), "f", 999);
    ASSERT_EQ(longest.size(), 999u);
    EXPECT_EQ(zv_util_sync_file(longest.c_str()), ZV_OK);

    std::string too_long = padded_path(dir.path(), "f", 1000);
    ASSERT_EQ(too_long.size(), 1000u);
    zvt::fault_arm("open", ~0u, EIO);
    EXPECT_EQ(zv_util_sync_file(too_long.c_str()), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(zvt::fault_calls("open"), 0u);
    zvt::fault_clear();
    EXPECT_EQ(zv_util_sync_file(nullptr), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_sync_file", ZV_ERR_BAD_VALUE}, {"zv_util_sync_file", ZV_ERR_NULL_ARG});
}

TEST(SyncFile, FailureRowsLogThenRecord)
{
    ScratchDir dir;
    std::string f = dir / "f";
    zvt::put_file(f, "x");
    struct Row {
        const char *point;
        unsigned nth;
        const char *line;
    } rows[] = {
        {"open", 1, "Failed to open file"},
        {"open", 2, "Failed to open directory"},
        {"fsync", 1, "Failed to sync file"},
        {"fsync", 2, "Failed to sync directory file"},
    };
    for (const Row &row : rows) {
        zvt::clear_trace();
        zvt::LogCapture log;
        unsigned fds = zvt::open_fd_count();
        size_t heap = zvt::heap_in_use();
        zv_status status =
            zvt::with_fault(row.point, row.nth, EIO, [&] { return zv_util_sync_file(f.c_str()); });
        EXPECT_STATUS(ZV_ERR_SYSTEM, status) << row.line;
        EXPECT_TRUE(zvt::LogIs(log, {{3, row.line}}));
        EXPECT_EQ(log.lines().at(0).frames_before, 0u) << row.line;
        EXPECT_FRAMES({"zv_util_sync_file", ZV_ERR_SYSTEM});
        EXPECT_EQ(zvt::open_fd_count(), fds) << row.line;
        EXPECT_EQ(zvt::heap_in_use(), heap) << row.line;
    }

    // The directory text: the callee's frame, this one's, then the log line.
    zvt::clear_trace();
    zvt::LogCapture log;
    zv_status status =
        zvt::with_fault("alloc", 1, ENOMEM, [&] { return zv_util_sync_file(f.c_str()); });
    EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
    EXPECT_FRAMES({"zv_util_get_directory_component", ZV_ERR_NO_MEMORY},
                  {"zv_util_sync_file", ZV_ERR_NO_MEMORY});
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to get directory component"}}));
    EXPECT_EQ(log.lines().at(0).frames_before, 2u);
}

TEST(SyncFile, BareNameSyncsTheFileInPlaceOfItsDirectory)
{
    ScratchDir dir;
    zvt::put_file(dir / "f", "x");
    zvt::in_child([&] {
        ASSERT_EQ(chdir(dir.path().c_str()), 0);
        zvt::fault_arm("fsync", ~0u, 0);
        EXPECT_EQ(zv_util_sync_file("f"), ZV_OK);
        EXPECT_EQ(zvt::fault_calls("fsync"), 2u);
        zvt::fault_clear();
    });
}

TEST(SyncFile, FileDirectlyUnderTheRootSyncsTheRoot)
{
    char path[] = "/zvutil-test-XXXXXX";
    int fd = mkstemp(path);
    if (fd < 0)
        GTEST_SKIP() << "cannot create a file under /";
    close(fd);
    EXPECT_EQ(zv_util_sync_file(path), ZV_OK);
    EXPECT_EQ(zv_util_write_named_file(path, 1, "root", 4, nullptr), ZV_OK);
    EXPECT_EQ(zvt::get_file(path), "root");
    unlink(path);
    EXPECT_NO_FRAMES();
}

TEST(DirectoryComponent, CutsAtTheLastSlash)
{
    struct Row {
        const char *path;
        const char *directory;
    } rows[] = {
        {"a/b/c", "a/b"}, {"a/b/", "a/b"}, {"a//b", "a/"}, {"/x", ""},
        {"/", ""},        {"x", "x"},      {"", ""},       {"./y", "."},
    };
    for (const Row &row : rows) {
        char *out = nullptr;
        ASSERT_EQ(zv_util_get_directory_component(row.path, &out), ZV_OK);
        EXPECT_STREQ(out, row.directory) << row.path;
        std::free(out);
    }
    char *out = reinterpret_cast<char *>(1);
    zvt::sweep_allocations(
        [&] {
            zv_status status = zv_util_get_directory_component("a/b", &out);
            if (status == ZV_OK)
                zv_util_free(&out);
            return status == ZV_OK;
        },
        [&](unsigned) {
            EXPECT_EQ(out, nullptr);
            EXPECT_FRAMES({"zv_util_get_directory_component", ZV_ERR_NO_MEMORY});
        });
}

TEST(AbsPath, ResolvesOrFails)
{
    ScratchDir dir;
    ASSERT_EQ(mkdir((dir / "sub").c_str(), 0700), 0);
    ASSERT_EQ(symlink((dir / "sub").c_str(), (dir / "link").c_str()), 0);
    char *canonical_dir = realpath(dir.path().c_str(), nullptr);
    char *out = nullptr;
    ASSERT_EQ(zv_util_abs_path((dir / "link/../link/.").c_str(), &out), ZV_OK);
    EXPECT_EQ(std::string(out), std::string(canonical_dir) + "/sub");
    std::free(out);
    std::free(canonical_dir);

    out = reinterpret_cast<char *>(1);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_abs_path((dir / "missing").c_str(), &out));
    EXPECT_EQ(out, nullptr);
    EXPECT_FRAMES({"zv_util_abs_path", ZV_ERR_SYSTEM});
}

// ---- Named files --------------------------------------------------------------

TEST(Fopen, FormatsThePathAndOpens)
{
    ScratchDir dir;
    zvt::put_file(dir / "named", "content");
    FILE *stream = nullptr;
    int32_t err = kUntouched;
    ASSERT_EQ(zv_util_fopen(&stream, &err, "r", "%s/%s", dir.path().c_str(), "named"), ZV_OK);
    EXPECT_EQ(err, 0);
    char text[16] = {};
    EXPECT_NE(std::fgets(text, sizeof text, stream), nullptr);
    EXPECT_STREQ(text, "content");
    std::fclose(stream);

    stream = reinterpret_cast<FILE *>(1);
    unsigned fds = zvt::open_fd_count();
    EXPECT_STATUS(ZV_ERR_SYSTEM,
                  zv_util_fopen(&stream, &err, "r", "%s/%s", dir.path().c_str(), "missing"));
    EXPECT_EQ(err, ENOENT);
    EXPECT_EQ(stream, reinterpret_cast<FILE *>(1));
    EXPECT_EQ(zvt::open_fd_count(), fds);
    EXPECT_FRAMES({"zv_util_fopen", ZV_ERR_SYSTEM});
}

TEST(Fopen, NullArgumentsAndFormattingFailures)
{
    FILE *stream = reinterpret_cast<FILE *>(1);
    int32_t err = kUntouched;
    const char *no_format = nullptr;
    EXPECT_EQ(zv_util_fopen(nullptr, &err, "r", "/tmp"), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_fopen(&stream, &err, nullptr, "/tmp"), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_fopen(&stream, &err, "r", no_format), ZV_ERR_NULL_ARG);
    EXPECT_EQ(err, kUntouched);
    EXPECT_EQ(zvt::frames().size(), 3u);

    zvt::clear_trace();
    zv_status status = zvt::with_fault("vsnprintf", 1, EOVERFLOW, [&] {
        return zv_util_fopen(&stream, &err, "r", "%s", "/tmp");
    });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_FRAMES({"zv_util_printf_vsize", ZV_ERR_SYSTEM}, {"zv_util_vasprintf", ZV_ERR_SYSTEM},
                  {"zv_util_fopen", ZV_ERR_SYSTEM});

    zvt::sweep_allocations(
        [&] {
            stream = reinterpret_cast<FILE *>(1);
            zv_status st = zv_util_fopen(&stream, nullptr, "r", "%s", "/proc/version");
            if (st == ZV_OK)
                std::fclose(stream);
            return st == ZV_OK;
        },
        [&](unsigned) {
            EXPECT_EQ(stream, reinterpret_cast<FILE *>(1));
            EXPECT_FRAMES({"zv_util_vasprintf", ZV_ERR_NO_MEMORY},
                          {"zv_util_fopen", ZV_ERR_NO_MEMORY});
        });
}

TEST(ReadNamedFile, WholeContent)
{
    ScratchDir dir;
    for (const std::string &content :
         {std::string(), std::string("a\0b\0", 4), std::string(70000, 'q')}) {
        zvt::put_file(dir / "f", content);
        char *buf = nullptr;
        uint32_t size = 99;
        ASSERT_EQ(zv_util_read_named_file((dir / "f").c_str(), &buf, &size, nullptr), ZV_OK);
        ASSERT_EQ(size, content.size());
        EXPECT_EQ(std::string(buf, size), content);
        EXPECT_EQ(buf[size], '\0');
        std::free(buf);
    }
    EXPECT_NO_FRAMES();
}

TEST(ReadNamedFile, Failures)
{
    ScratchDir dir;
    std::string f = dir / "f";
    zvt::put_file(f, "0123456789");
    char *buf = reinterpret_cast<char *>(1);
    uint32_t size = 99;

    EXPECT_EQ(zv_util_read_named_file(nullptr, &buf, &size, nullptr), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_read_named_file(f.c_str(), nullptr, &size, nullptr), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_read_named_file(f.c_str(), &buf, nullptr, nullptr), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zvt::frames().size(), 3u);

    zvt::clear_trace();
    EXPECT_STATUS(ZV_ERR_SYSTEM,
                  zv_util_read_named_file((dir / "missing").c_str(), &buf, &size, nullptr));
    EXPECT_EQ(buf, reinterpret_cast<char *>(1));
    EXPECT_EQ(size, 99u);
    EXPECT_FRAMES({"zv_util_get_file_size", ZV_ERR_SYSTEM},
                  {"zv_util_read_named_file", ZV_ERR_SYSTEM});

    // After the size query: the stream cannot be opened, a read fails, or the
    // file ends before its measured size.
    struct Row {
        const char *point;
        bool buf_cleared;
    } rows[] = {{"fopen", false}, {"fread", true}, {"fstat_grown", true}};
    for (const Row &row : rows) {
        zvt::clear_trace();
        buf = reinterpret_cast<char *>(1);
        size = 99;
        unsigned fds = zvt::open_fd_count();
        size_t heap = zvt::heap_in_use();
        zv_status status = zvt::with_fault(row.point, 1, EIO, [&] {
            return zv_util_read_named_file(f.c_str(), &buf, &size, nullptr);
        });
        EXPECT_STATUS(ZV_ERR_SYSTEM, status) << row.point;
        EXPECT_EQ(buf, row.buf_cleared ? nullptr : reinterpret_cast<char *>(1)) << row.point;
        EXPECT_EQ(size, row.point == std::string("fstat_grown") ? 110u : 10u) << row.point;
        EXPECT_EQ(zvt::open_fd_count(), fds) << row.point;
        EXPECT_EQ(zvt::heap_in_use(), heap) << row.point;
        EXPECT_FRAMES({"zv_util_read_named_file", ZV_ERR_SYSTEM});
    }

    zvt::sweep_allocations(
        [&] {
            size = 99;
            zv_status st = zv_util_read_named_file(f.c_str(), &buf, &size, nullptr);
            if (st == ZV_OK)
                zv_util_free(&buf);
            return st == ZV_OK;
        },
        [&](unsigned) {
            EXPECT_EQ(buf, nullptr);
            EXPECT_EQ(size, 10u);
            EXPECT_FRAMES({"zv_util_read_named_file", ZV_ERR_NO_MEMORY});
        });
}

TEST(WriteNamedFile, ReplaceAppendAndCreate)
{
    ScratchDir dir;
    std::string f = dir / "f";
    EXPECT_EQ(zv_util_write_named_file(f.c_str(), 0, "new", 3, nullptr), ZV_OK);
    EXPECT_EQ(zvt::get_file(f), "new");
    EXPECT_EQ(zv_util_write_named_file(f.c_str(), 0, "+more", 5, nullptr), ZV_OK);
    EXPECT_EQ(zvt::get_file(f), "new+more");
    EXPECT_EQ(zv_util_write_named_file(f.c_str(), 1, "x\0y", 3, nullptr), ZV_OK);
    EXPECT_EQ(zvt::get_file(f), std::string("x\0y", 3));
    zvt::fault_arm("fsync", ~0u, 0);
    EXPECT_EQ(zv_util_write_named_file(f.c_str(), 1, "", 0, nullptr), ZV_OK);
    EXPECT_EQ(zvt::fault_calls("fsync"), 2u) << "file and directory";
    zvt::fault_clear();
    EXPECT_EQ(zvt::get_file(f), "");
    EXPECT_NO_FRAMES();

    zvt::in_child([&] {
        ASSERT_EQ(chdir(dir.path().c_str()), 0);
        EXPECT_EQ(zv_util_write_named_file("bare", 1, "b", 1, nullptr), ZV_OK);
        EXPECT_EQ(zvt::get_file("bare"), "b");
    });
}

TEST(WriteNamedFile, FailuresBeforeTheSync)
{
    ScratchDir dir;
    std::string f = dir / "f";
    EXPECT_EQ(zv_util_write_named_file(nullptr, 1, "x", 1, nullptr), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_write_named_file(f.c_str(), 1, nullptr, 0, nullptr), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_write_named_file", ZV_ERR_NULL_ARG},
                  {"zv_util_write_named_file", ZV_ERR_NULL_ARG});

    zvt::clear_trace();
    EXPECT_STATUS(ZV_ERR_SYSTEM,
                  zv_util_write_named_file((dir / "no/f").c_str(), 1, "x", 1, nullptr));
    EXPECT_NE(access((dir / "no").c_str(), F_OK), 0);
    EXPECT_FRAMES({"zv_util_write_named_file", ZV_ERR_SYSTEM});

    zvt::clear_trace();
    zv_status status = zvt::with_fault("alloc", 1, ENOMEM, [&] {
        return zv_util_write_named_file(f.c_str(), 1, "x", 1, nullptr);
    });
    EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
    EXPECT_NE(access(f.c_str(), F_OK), 0) << "file touched";
    EXPECT_FRAMES({"zv_util_get_directory_component", ZV_ERR_NO_MEMORY},
                  {"zv_util_write_named_file", ZV_ERR_NO_MEMORY});

    // A write error: injected, and real (a device that is always full takes
    // nothing once the stream writes past its buffer).
    for (const char *point : {"fwrite", "ferror"}) {
        zvt::clear_trace();
        unsigned fds = zvt::open_fd_count();
        size_t heap = zvt::heap_in_use();
        status = zvt::with_fault(point, 1, EIO, [&] {
            return zv_util_write_named_file(f.c_str(), 1, "x", 1, nullptr);
        });
        EXPECT_STATUS(ZV_ERR_SYSTEM, status) << point;
        EXPECT_EQ(zvt::open_fd_count(), fds) << point;
        EXPECT_EQ(zvt::heap_in_use(), heap) << point;
        EXPECT_FRAMES({"zv_util_write_named_file", ZV_ERR_SYSTEM});
    }
    zvt::clear_trace();
    std::string big(1 << 16, 'b');
    EXPECT_STATUS(ZV_ERR_SYSTEM,
                  zv_util_write_named_file("/dev/full", 1, big.data(), big.size(), nullptr));
    EXPECT_FRAMES({"zv_util_write_named_file", ZV_ERR_SYSTEM});
}

TEST(WriteNamedFile, SyncFailuresAddAFrame)
{
    ScratchDir dir;
    std::string f = dir / "f";
    struct Row {
        const char *point;
        unsigned nth;
    } rows[] = {{"fflush", 1}, {"fsync", 1}, {"open", 1}, {"fsync", 2}};
    for (const Row &row : rows) {
        zvt::clear_trace();
        unsigned fds = zvt::open_fd_count();
        size_t heap = zvt::heap_in_use();
        zv_status status = zvt::with_fault(row.point, row.nth, EIO, [&] {
            return zv_util_write_named_file(f.c_str(), 1, "data", 4, nullptr);
        });
        EXPECT_STATUS(ZV_ERR_SYSTEM, status) << row.point << row.nth;
        EXPECT_EQ(zvt::open_fd_count(), fds) << row.point << row.nth;
        EXPECT_EQ(zvt::heap_in_use(), heap) << row.point << row.nth;
        EXPECT_FRAMES({"zv_util_sync", ZV_ERR_SYSTEM}, {"zv_util_write_named_file", ZV_ERR_SYSTEM});
    }
    // The data reached the file all the same; a full device fails the flush.
    EXPECT_EQ(zvt::get_file(f), "data");
    zvt::clear_trace();
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_write_named_file("/dev/full", 1, "x", 1, nullptr));
    EXPECT_FRAMES({"zv_util_sync", ZV_ERR_SYSTEM}, {"zv_util_write_named_file", ZV_ERR_SYSTEM});
}

TEST(CopyFile, CopiesAndPassesFailuresOn)
{
    ScratchDir dir;
    std::string src = dir / "src", dst = dir / "dst";
    std::string content("copy\0me", 7);
    zvt::put_file(src, content);
    zvt::put_file(dst, "old and longer content");
    EXPECT_EQ(zv_util_copy_file(src.c_str(), dst.c_str()), ZV_OK);
    EXPECT_EQ(zvt::get_file(dst), content);
    EXPECT_EQ(zv_util_copy_file(src.c_str(), src.c_str()), ZV_OK);
    EXPECT_EQ(zvt::get_file(src), content) << "copied onto itself";
    EXPECT_NO_FRAMES();

    EXPECT_EQ(zv_util_copy_file(nullptr, dst.c_str()), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_copy_file(src.c_str(), nullptr), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_copy_file", ZV_ERR_NULL_ARG}, {"zv_util_copy_file", ZV_ERR_NULL_ARG});

    zvt::clear_trace();
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_copy_file((dir / "missing").c_str(), dst.c_str()));
    EXPECT_FRAMES({"zv_util_get_file_size", ZV_ERR_SYSTEM},
                  {"zv_util_read_named_file", ZV_ERR_SYSTEM});
    zvt::clear_trace();
    size_t heap = zvt::heap_in_use();
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_copy_file(src.c_str(), (dir / "no/dst").c_str()));
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_FRAMES({"zv_util_write_named_file", ZV_ERR_SYSTEM});
}

// ---- Permission cases, as an unprivileged user ------------------------------

TEST(FilePermissions, UnprivilegedCallerMeetsTheModes)
{
    if (geteuid() != 0)
        GTEST_SKIP() << "needs root to switch users";
    ScratchDir dir;
    zvt::in_child([&] {
        zvt::drop_privileges();
        std::string secret = dir / "secret", ro = dir / "read-only", closed = dir / "closed";
        zvt::put_file(secret, "s");
        zvt::put_file(ro, "r");
        ASSERT_EQ(chmod(secret.c_str(), 0200), 0);
        ASSERT_EQ(chmod(ro.c_str(), 0400), 0);
        ASSERT_EQ(mkdir(closed.c_str(), 0700), 0);
        zvt::put_file(closed + "/inside", "i");
        ASSERT_EQ(chmod(closed.c_str(), 0), 0);

        int64_t size = -1;
        uint32_t exists = 99;
        char *buf = reinterpret_cast<char *>(1);
        uint32_t buf_size = 99;
        zvt::LogCapture log;
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_get_file_size(secret.c_str(), &size));
        EXPECT_EQ(zv_util_query_file_exists(secret.c_str(), &exists), ZV_OK);
        EXPECT_EQ(exists, 1u) << "exists though it may not be read";
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_read_named_file(secret.c_str(), &buf, &buf_size,
                                                             nullptr));
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_sync_file(ro.c_str()));
        EXPECT_STATUS(ZV_ERR_SYSTEM,
                      zv_util_query_file_exists((closed + "/inside").c_str(), &exists));
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_write_named_file(ro.c_str(), 1, "w", 1, nullptr));
        EXPECT_EQ(zvt::get_file(ro), "r");
        EXPECT_FRAMES({"zv_util_get_file_size", ZV_ERR_SYSTEM},
                      {"zv_util_get_file_size", ZV_ERR_SYSTEM},
                      {"zv_util_read_named_file", ZV_ERR_SYSTEM},
                      {"zv_util_sync_file", ZV_ERR_SYSTEM},
                      {"zv_util_query_file_exists", ZV_ERR_SYSTEM},
                      {"zv_util_write_named_file", ZV_ERR_SYSTEM});
        EXPECT_TRUE(zvt::LogIs(log, {{3, "Failed to open file"}}));
        EXPECT_EQ(size, -1);
    });
}

}  // namespace
