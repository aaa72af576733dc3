// Descriptor operations, durable sync, path components and named files.
#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <random>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

#include "support/feature_paths.h"
#include "support/scratch.h"
#include <zvutil/file.h>

namespace {

using zvt::get_file;
using zvt::kUntouched;
using zvt::put_file;
using zvt::row_errno;
using zvt::ScratchDir;

constexpr zv_status kSys = ZV_ERR_SYSTEM;
constexpr zv_status kNull = ZV_ERR_NULL_ARG;
constexpr zv_status kMem = ZV_ERR_NO_MEMORY;

int open_read(const std::string &path) { return open(path.c_str(), O_RDONLY | O_LARGEFILE); }
off_t position(int fd) { return lseek(fd, 0, SEEK_CUR); }

TEST(Open, FormatsThePathAndPassesFlagsThrough)
{
    ScratchDir dir;
    int32_t fd = -7, err = kUntouched;
    mode_t mask = umask(022);
    ASSERT_EQ(zv_util_open(&fd, &err, O_WRONLY | O_CREAT | O_EXCL, 0640, "%s/x.%d",
                           dir.path().c_str(), 7),
              ZV_OK);
    umask(mask);
    close(fd);
    struct stat st;
    EXPECT_EQ(stat((dir / "x.7").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0640u);
    EXPECT_EQ(err, 0);
}

TEST(WholeTransfer, LengthsAndIdleBudget)
{
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    char buf[8] = {};
    zvt::fault_arm("write_idle", 1, 0, 3);  // four writes that take nothing are tolerated
    EXPECT_EQ(zv_util_whole_write(ends[1], "xyz", 3, nullptr), ZV_OK);
    zvt::fault_clear();
    zvt::fault_arm("write_idle", 1, 0, 4);  // a fifth ends it
    EXPECT_EQ(zv_util_whole_write(ends[1], "abc", 3, nullptr), static_cast<zv_status>(-11));
    zvt::fault_clear();
    zvt::fault_arm("write", 1, EIO);  // length 0 calls nothing
    zvt::fault_arm("read", 1, EIO);
    EXPECT_EQ(zv_util_whole_write(ends[1], "", 0, nullptr), ZV_OK);
    EXPECT_EQ(zv_util_whole_read(ends[0], buf, 0), 0);
    zvt::fault_clear();
    close(ends[1]);
    // Four empty reads, three bytes that refill the budget, then end of file.
    zvt::fault_arm("read_idle", 1, 0, 3);
    EXPECT_EQ(zv_util_whole_read(ends[0], buf, 6), -11);
    EXPECT_EQ(zvt::fault_calls("read_idle"), 4u + 1 + 5);
    zvt::fault_clear();
    EXPECT_STREQ(buf, "xyz");
    EXPECT_EQ(zv_util_whole_read(ends[0], nullptr, 1), -22);
    EXPECT_EQ(zv_util_whole_read(ends[0], buf, -1), -22);
    EXPECT_EQ(zvt::with_fault("read", 1, EIO, ZVT_CALL(zv_util_whole_read(ends[0], buf, 1))), -1);
    EXPECT_NO_FRAMES();
    close(ends[0]);
}

TEST(CountLines, CountsNewlinesAndRestoresThePosition)
{
    ScratchDir dir;
    std::string chunks;
    for (int i = 0; i < 300; i++)
        chunks += "123456789\n";  // crosses the 1024-byte reads
    struct {
        std::string content;
        uint32_t lines;
        const char *point;  // "fstat_grown": measured larger, as if it shrank meanwhile
    } rows[] = {{"a\nb\n", 2, "none"},  {"a\nb", 1, "none"},     {"", 0, "none"},
                {"\r\n\r", 1, "none"},  {chunks, 300, "none"},   {"a\nb\n", 2, "fstat_grown"}};
    for (const auto &row : rows) {
        put_file(dir / "f", row.content);
        int fd = open_read(dir / "f");
        lseek(fd, row.content.size() / 2, SEEK_SET);
        uint32_t count = 99;
        zvt::fault_arm(row.point, 1, 0);
        EXPECT_EQ(zv_util_count_lines(fd, &count, nullptr), ZV_OK);
        zvt::fault_clear();
        EXPECT_EQ(count, row.lines);
        EXPECT_EQ(position(fd), static_cast<off_t>(row.content.size() / 2));
        close(fd);
    }
    EXPECT_NO_FRAMES();
}

TEST(CountLines, EveryPathCountsEveryNewline)
{
    ScratchDir dir;
    std::mt19937 random(3);
    // Sizes around the 16-byte blocks and the 1024-byte reads; newlines from
    // none to every byte.
    for (size_t size : {1, 15, 16, 17, 1023, 1024, 1025, 2047, 5000}) {
        for (unsigned percent : {0, 3, 50, 100}) {
            std::string content(size, 'x');
            for (char &c : content)
                if (random() % 100 < percent)
                    c = '\n';
            put_file(dir / "f", content);
            int fd = open_read(dir / "f");
            zvt::for_each_feature_path([&](uint32_t path) {
                uint32_t count = 0;
                EXPECT_EQ(zv_util_count_lines(fd, &count, nullptr), ZV_OK);
                EXPECT_EQ(count, std::count(content.begin(), content.end(), '\n')) << path << " " << size;
            });
            close(fd);
        }
    }
}

TEST(QueryFileExists, Answers)
{
    ScratchDir dir;
    put_file(dir / "f", "x");
    ASSERT_EQ(symlink((dir / "nowhere").c_str(), (dir / "dangling").c_str()), 0);
    struct {
        std::string path;
        uint32_t exists;
        const char *point;  // "stat_wide_inode": an inode number beyond 32 bits
    } rows[] = {{dir / "f", 1, "none"}, {dir / "missing", 0, "none"},
                {dir / "dangling", 0, "none"}, {dir / "f", 1, "stat_wide_inode"}};
    for (const auto &row : rows) {
        uint32_t exists = 99;
        zvt::fault_arm(row.point, 1, 0);
        EXPECT_EQ(zv_util_query_file_exists(row.path.c_str(), &exists), ZV_OK);
        EXPECT_EQ(zvt::fault_fired(), std::string(row.point) != "none");
        zvt::fault_clear();
        EXPECT_EQ(exists, row.exists) << row.path;
    }
}

// Files of 2 GiB or more: where offsets are 32 bits every size query refuses
// them; with 64-bit offsets only the descriptor read (32-bit sizes) and the
// named read (sizes beyond 32 bits) do.
TEST(LargeFile, SparseFilesAroundTheBounds)
{
    ScratchDir dir;
    std::string f = dir / "big";
    put_file(f, "");
    int64_t size = 0;
    uint32_t exists = 0, count = 0;
    char *buf = nullptr;
    ASSERT_EQ(truncate64(f.c_str(), (off64_t{1} << 31) - 1), 0);
    EXPECT_EQ(zv_util_get_file_size(f.c_str(), &size), ZV_OK);
    EXPECT_EQ(size, INT32_MAX);

    ASSERT_EQ(truncate64(f.c_str(), (off64_t{1} << 31) + 1), 0);
    int fd = open_read(f);
    auto read_named = ZVT_CALL(zv_util_read_named_file(f.c_str(), &buf, &count, nullptr));
    zvt::expect_failures({{"zv_util_read_file", kSys,
                           ZVT_CALL(zv_util_read_file(fd, &buf, &count, &row_errno)), nullptr, 1,
                           EOVERFLOW}});
    if (sizeof(off_t) == 4) {
        zvt::expect_failures({
            {"zv_util_count_lines", kSys, ZVT_CALL(zv_util_count_lines(fd, &count, &row_errno)),
             nullptr, 1, EOVERFLOW},
            {"zv_util_get_file_size", kSys, ZVT_CALL(zv_util_get_file_size(f.c_str(), &size))},
            {"zv_util_query_file_exists", kSys,
             ZVT_CALL(zv_util_query_file_exists(f.c_str(), &exists))},
            {"zv_util_get_file_size,zv_util_read_named_file", kSys, read_named},
        });
    } else {
        EXPECT_EQ(zv_util_get_file_size(f.c_str(), &size), ZV_OK);
        EXPECT_EQ(size, (int64_t{1} << 31) + 1);
        EXPECT_EQ(zv_util_query_file_exists(f.c_str(), &exists), ZV_OK);
        EXPECT_EQ(exists, 1u);
        ASSERT_EQ(truncate64(f.c_str(), (off64_t{1} << 32) + 1), 0);
        zvt::expect_failures({{"zv_util_read_named_file", ZV_ERR_OVERFLOW, read_named}});
    }
    close(fd);
}

TEST(DescriptorOperations, FailureTable)
{
    ScratchDir dir;
    std::string f = dir / "f", missing = dir / "missing";
    std::string text;
    for (int i = 0; i < 200; i++)
        text += "123456789\n";
    put_file(f, text);
    int fd = open_read(f), ends[2];
    ASSERT_EQ(pipe(ends), 0);
    int32_t out = kUntouched;
    uint32_t count = 0, exists = 0;
    int64_t size = 0;
    char *buf = nullptr;
    auto open_f = ZVT_CALL(zv_util_open(&out, &row_errno, 0, 0, "%s", f.c_str()));
    auto read_file = ZVT_CALL(zv_util_read_file(fd, &buf, &count, &row_errno));
    auto count_lines = [&] {  // from the middle, where every failure must leave it
        lseek(fd, 7, SEEK_SET);
        zv_status status = zv_util_count_lines(fd, &count, &row_errno);
        EXPECT_EQ(position(fd), 7);
        return status;
    };
    zvt::expect_failures({
        {"zv_util_open", kNull, ZVT_CALL(zv_util_open(nullptr, &row_errno, 0, 0, "x"))},
        {"zv_util_open", kSys,
         ZVT_CALL(zv_util_open(&out, &row_errno, 0, 0, "%s", missing.c_str())), nullptr, 1, ENOENT},
        {"zv_util_printf_vsize,zv_util_vasprintf", kSys, open_f, "vsnprintf"},
        {"zv_util_vasprintf", kMem, open_f, "alloc"},
        {"zv_util_whole_write", kNull,
         ZVT_CALL(zv_util_whole_write(ends[1], nullptr, 1, &row_errno))},
        {"zv_util_whole_write", ZV_ERR_OVERFLOW,
         ZVT_CALL(zv_util_whole_write(ends[1], "", -1, &row_errno))},
        {"zv_util_whole_write", kSys, ZVT_CALL(zv_util_whole_write(ends[1], "ab", 2, &row_errno)),
         "write", 1, EIO},
        {"zv_util_read_file", kNull, ZVT_CALL(zv_util_read_file(fd, nullptr, &count, &row_errno))},
        {"zv_util_read_file", kSys, ZVT_CALL(zv_util_read_file(-1, &buf, &count, &row_errno)),
         nullptr, 1, EBADF},
        {"zv_util_read_file", kMem, read_file, "alloc", 1, EIO},
        {"zv_util_read_file", kSys, ZVT_CALL(lseek(fd, 4, SEEK_SET), read_file())},  // short read
        {"zv_util_count_lines", kNull, ZVT_CALL(zv_util_count_lines(fd, nullptr, &row_errno))},
        {"zv_util_count_lines", ZV_ERR_BAD_VALUE,
         ZVT_CALL(zv_util_count_lines(-1, &count, &row_errno))},
        {"zv_util_count_lines", kSys, ZVT_CALL(zv_util_count_lines(ends[0], &count, &row_errno)),
         nullptr, 1, ESPIPE},
        {"zv_util_count_lines", kSys, count_lines, "lseek", 2, EIO},  // the test's seek is 1st
        {"zv_util_count_lines", kSys, count_lines, "fstat", 1, EIO},
        {"zv_util_count_lines", kSys, count_lines, "lseek", 3, EIO},
        {"zv_util_count_lines", kSys, count_lines, "read", 2, EIO},
        {"zv_util_get_file_size", kNull, ZVT_CALL(zv_util_get_file_size(nullptr, &size))},
        {"zv_util_get_file_size", kSys, ZVT_CALL(zv_util_get_file_size(missing.c_str(), &size))},
        {"zv_util_get_file_size", kSys, ZVT_CALL(zv_util_get_file_size(f.c_str(), &size)), "fstat"},
        {"zv_util_truncate_file", kNull, ZVT_CALL(zv_util_truncate_file(nullptr, 0, &row_errno))},
        {"zv_util_truncate_file", kSys,
         ZVT_CALL(zv_util_truncate_file(missing.c_str(), 0, &row_errno)), nullptr, 1, ENOENT},
        {"zv_util_delete_file", kNull, ZVT_CALL(zv_util_delete_file(nullptr, &row_errno))},
        {"zv_util_delete_file", kSys, ZVT_CALL(zv_util_delete_file(dir.path().c_str(), &row_errno)),
         nullptr, 1, EISDIR},
        {"zv_util_query_file_exists", kNull, ZVT_CALL(zv_util_query_file_exists(nullptr, &exists))},
        {"zv_util_query_file_exists", kSys,  // a file used as a directory: ENOTDIR
         ZVT_CALL(zv_util_query_file_exists((f + "/x").c_str(), &exists))},
    });
    EXPECT_EQ(count, 102u) << "the lines of the 1024 bytes read before the failure";
    EXPECT_EQ(buf, nullptr);
    EXPECT_EQ(out, -1);
    EXPECT_EQ(size + exists, 0);
    close(fd);
    close(ends[0]);
    close(ends[1]);
}

// A path of exactly |length| bytes naming |file| in |dir|, padded with "./".
std::string padded_path(const std::string &dir, const std::string &file, size_t length)
{
    std::string path = dir + ((length - dir.size() - file.size()) % 2 == 0 ? "//" : "/");
    while (path.size() + file.size() < length)
        path += "./";
    return path + file;
}

TEST(Sync, FileAloneOrWithItsDirectory)
{
    ScratchDir dir;
    FILE *stream = fopen((dir / "f").c_str(), "w");
    std::fputs("data", stream);
    zvt::fault_arm("open", ~0u, 0);  // counters only
    zvt::fault_arm("fsync", ~0u, 0);
    EXPECT_EQ(zv_util_sync(stream, nullptr), ZV_OK);
    EXPECT_EQ(zvt::fault_calls("open"), 0u);
    EXPECT_EQ(zvt::fault_calls("fsync"), 1u);
    EXPECT_EQ(zv_util_sync(stream, dir.path().c_str()), ZV_OK);
    EXPECT_EQ(zvt::fault_calls("open"), 1u);
    EXPECT_EQ(zvt::fault_calls("fsync"), 3u);
    zvt::fault_clear();
    EXPECT_EQ(get_file(dir / "f"), "data");
    std::fclose(stream);

    std::string longest = padded_path(dir.path(), "f", 999);
    ASSERT_EQ(longest.size(), 999u);
    EXPECT_EQ(zv_util_sync_file(longest.c_str()), ZV_OK);
    zvt::in_child(false, [&] {
        ASSERT_EQ(chdir(dir.path().c_str()), 0);
        zvt::fault_arm("fsync", ~0u, 0);
        EXPECT_EQ(zv_util_sync_file("f"), ZV_OK);  // the file stands in for its directory
        EXPECT_EQ(zv_util_write_named_file("bare", 1, "b", 1, nullptr), ZV_OK);
        EXPECT_EQ(zvt::fault_calls("fsync"), 4u);
        EXPECT_EQ(get_file("bare"), "b");
    });
    // Directly under the root the directory text is empty: "/" is synced.
    char path[] = "/zvutil-test-XXXXXX";
    int fd = mkstemp(path);
    if (fd >= 0) {
        close(fd);
        EXPECT_EQ(zv_util_sync_file(path), ZV_OK);
        EXPECT_EQ(zv_util_write_named_file(path, 1, "root", 4, nullptr), ZV_OK);
        EXPECT_EQ(get_file(path), "root");
        unlink(path);
    }
    EXPECT_NO_FRAMES();
}

TEST(Sync, FailureTable)
{
    ScratchDir dir;
    std::string f = dir / "f";
    put_file(f, "x");
    FILE *stream = fopen(f.c_str(), "a");
    auto sync = ZVT_CALL(zv_util_sync(stream, dir.path().c_str()));
    auto sync_file = ZVT_CALL(zv_util_sync_file(f.c_str()));
    std::string too_long = padded_path(dir.path(), "f", 1000);
    char *out = nullptr;
    zvt::expect_failures({
        {"zv_util_sync", kNull, ZVT_CALL(zv_util_sync(nullptr, nullptr))},
        {"zv_util_sync", kSys, sync, "fflush"},
        {"zv_util_sync", kSys, sync, "fileno"},
        {"zv_util_sync", kSys, sync, "fsync"},
        {"zv_util_sync", kSys, sync, "open"},
        {"zv_util_sync", kSys, sync, "fsync", 2},
        {"zv_util_sync", kSys, ZVT_CALL(zv_util_sync(stream, (dir / "missing").c_str()))},
        {"zv_util_sync_file", kNull, ZVT_CALL(zv_util_sync_file(nullptr))},
        {"zv_util_sync_file", ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_sync_file(too_long.c_str())),
         "open"},  // refused before any open
        {"zv_util_get_directory_component,zv_util_sync_file", kMem, sync_file, "alloc", 1,
         kUntouched, "Failed to get directory component", 2},
        {"zv_util_sync_file", kSys, sync_file, "open", 1, kUntouched, "Failed to open file"},
        {"zv_util_sync_file", kSys, sync_file, "open", 2, kUntouched, "Failed to open directory"},
        {"zv_util_sync_file", kSys, sync_file, "fsync", 1, kUntouched, "Failed to sync file"},
        {"zv_util_sync_file", kSys, sync_file, "fsync", 2, kUntouched,
         "Failed to sync directory file"},
        {"zv_util_get_directory_component", kMem,
         ZVT_CALL(zv_util_get_directory_component("a/b", &out)), "alloc"},
        {"zv_util_abs_path", kSys, ZVT_CALL(zv_util_abs_path((dir / "missing").c_str(), &out))},
    });
    EXPECT_EQ(out, nullptr);
    std::fclose(stream);
}

TEST(PathComponents, DirectoryTextAndAbsolutePath)
{
    struct {
        const char *path, *directory;
    } rows[] = {{"a/b/c", "a/b"}, {"a/b/", "a/b"}, {"a//b", "a/"}, {"/x", ""},
                {"/", ""},        {"x", "x"},      {"", ""}};
    for (const auto &row : rows) {
        char *out = nullptr;
        ASSERT_EQ(zv_util_get_directory_component(row.path, &out), ZV_OK);
        EXPECT_STREQ(out, row.directory) << row.path;
        std::free(out);
    }
    ScratchDir dir;
    ASSERT_EQ(mkdir((dir / "sub").c_str(), 0700), 0);
    ASSERT_EQ(symlink("sub", (dir / "link").c_str()), 0);
    char *out = nullptr, *base = realpath(dir.path().c_str(), nullptr);
    ASSERT_EQ(zv_util_abs_path((dir / "link/../link/.").c_str(), &out), ZV_OK);
    EXPECT_EQ(std::string(out), std::string(base) + "/sub");
    std::free(out);
    std::free(base);
}

TEST(NamedFiles, WriteAppendReadCopy)
{
    ScratchDir dir;
    std::string f = dir / "f", g = dir / "g";
    FILE *stream = nullptr;
    int32_t err = kUntouched;
    ASSERT_EQ(zv_util_fopen(&stream, &err, "w", "%s/%s", dir.path().c_str(), "f"), ZV_OK);
    std::fclose(stream);
    EXPECT_EQ(err, 0);
    EXPECT_EQ(zv_util_write_named_file(g.c_str(), 0, "new", 3, nullptr), ZV_OK);  // created
    EXPECT_EQ(zv_util_write_named_file(g.c_str(), 0, "+more", 5, nullptr), ZV_OK);
    EXPECT_EQ(zv_util_copy_file(g.c_str(), g.c_str()), ZV_OK);  // onto itself
    EXPECT_EQ(get_file(g), "new+more");
    for (const std::string &content :
         {std::string("x\0y", 3), std::string(), std::string(70000, 'q')}) {
        EXPECT_EQ(zv_util_write_named_file(g.c_str(), 1, content.data(), content.size(), nullptr),
                  ZV_OK);
        EXPECT_EQ(zv_util_copy_file(g.c_str(), f.c_str()), ZV_OK);
        char *named = nullptr, *whole = nullptr;
        uint32_t named_size = 99, whole_size = 99;
        int fd = open_read(f);
        ASSERT_EQ(zv_util_read_named_file(f.c_str(), &named, &named_size, nullptr), ZV_OK);
        ASSERT_EQ(zv_util_read_file(fd, &whole, &whole_size, nullptr), ZV_OK);
        EXPECT_EQ(std::string(named, named_size + 1), content + '\0');
        EXPECT_EQ(std::string(whole, whole_size + 1), content + '\0');
        std::free(named);
        std::free(whole);
        close(fd);
    }
    int fd = open_read("/proc/version");  // its size reads 0: nothing is read
    char *whole = nullptr;
    uint32_t whole_size = 99;
    EXPECT_EQ(zv_util_read_file(fd, &whole, &whole_size, nullptr), ZV_OK);
    EXPECT_EQ(std::string(whole, whole_size + 1), std::string(1, '\0'));
    std::free(whole);
    close(fd);
    EXPECT_NO_FRAMES();
}

TEST(NamedFiles, FailureTable)
{
    ScratchDir dir;
    std::string f = dir / "f", missing = dir / "missing", nowhere = dir / "no/f";
    put_file(f, "0123456789");
    FILE *stream = nullptr;
    char *buf = reinterpret_cast<char *>(1);
    uint32_t size = 99;
    const std::string big(1 << 16, 'b');
    auto fopen_f = ZVT_CALL(zv_util_fopen(&stream, &row_errno, "r", "%s", f.c_str()));
    auto read = ZVT_CALL(zv_util_read_named_file(f.c_str(), &buf, &size, nullptr));
    auto write = ZVT_CALL(zv_util_write_named_file(f.c_str(), 1, "data", 4, nullptr));
    zvt::expect_failures({
        {"zv_util_fopen", kNull, ZVT_CALL(zv_util_fopen(&stream, &row_errno, nullptr, "x"))},
        {"zv_util_printf_vsize,zv_util_vasprintf,zv_util_fopen", kSys, fopen_f, "vsnprintf"},
        {"zv_util_vasprintf,zv_util_fopen", kMem, fopen_f, "alloc"},
        {"zv_util_fopen", kSys,
         ZVT_CALL(zv_util_fopen(&stream, &row_errno, "r", "%s/%s", dir.path().c_str(), "missing")),
         nullptr, 1, ENOENT},
        {"zv_util_read_named_file", kNull,
         ZVT_CALL(zv_util_read_named_file(nullptr, &buf, &size, nullptr))},
        {"zv_util_get_file_size,zv_util_read_named_file", kSys,
         ZVT_CALL(zv_util_read_named_file(missing.c_str(), &buf, &size, nullptr))},
        {"zv_util_read_named_file", kSys, read, "fopen"},
    });
    EXPECT_EQ(stream, nullptr);
    EXPECT_EQ(buf, reinterpret_cast<char *>(1)) << "untouched until the buffer is allocated";
    EXPECT_EQ(size, 10u);
    zvt::expect_failures({
        {"zv_util_read_named_file", kMem, read, "alloc"},
        {"zv_util_read_named_file", kSys, read, "fread"},
        {"zv_util_read_named_file", kSys, read, "fstat_grown"},  // ends before its measured size
        {"zv_util_write_named_file", kNull,
         ZVT_CALL(zv_util_write_named_file(f.c_str(), 1, nullptr, 0, nullptr))},
        {"zv_util_get_directory_component,zv_util_write_named_file", kMem, write, "alloc"},
        {"zv_util_write_named_file", kSys,
         ZVT_CALL(zv_util_write_named_file(nowhere.c_str(), 1, "x", 1, nullptr))},
        {"zv_util_write_named_file", kSys, write, "fwrite"},
        {"zv_util_write_named_file", kSys, write, "ferror"},
        {"zv_util_write_named_file", kSys,  // a device that is always full
         ZVT_CALL(zv_util_write_named_file("/dev/full", 1, big.data(), big.size(), nullptr))},
        {"zv_util_sync,zv_util_write_named_file", kSys, write, "fflush"},
        {"zv_util_sync,zv_util_write_named_file", kSys, write, "fsync"},
        {"zv_util_sync,zv_util_write_named_file", kSys, write, "open"},
        {"zv_util_sync,zv_util_write_named_file", kSys, write, "fsync", 2},
        {"zv_util_copy_file", kNull, ZVT_CALL(zv_util_copy_file(f.c_str(), nullptr))},
        {"zv_util_get_file_size,zv_util_read_named_file", kSys,
         ZVT_CALL(zv_util_copy_file(missing.c_str(), f.c_str()))},
        {"zv_util_write_named_file", kSys, ZVT_CALL(zv_util_copy_file(f.c_str(), nowhere.c_str()))},
    });
    EXPECT_EQ(buf, nullptr);
    EXPECT_EQ(get_file(f), "data") << "written, though not known to be durable";
    EXPECT_NE(access(nowhere.c_str(), F_OK), 0);
}

TEST(FilePermissions, UnprivilegedCaller)
{
    ScratchDir dir;
    zvt::in_child(true, [&] {
        std::string secret = dir / "secret", ro = dir / "ro", closed = dir / "closed";
        put_file(secret, "s");
        put_file(ro, "r");
        ASSERT_EQ(chmod(secret.c_str(), 0200) | chmod(ro.c_str(), 0400) | mkdir(closed.c_str(), 0),
                  0);
        int64_t size = -1;
        uint32_t exists = 99;
        char *buf = nullptr;
        zvt::expect_failures({
            {"zv_util_get_file_size", kSys, ZVT_CALL(zv_util_get_file_size(secret.c_str(), &size))},
            {"zv_util_get_file_size,zv_util_read_named_file", kSys,
             ZVT_CALL(zv_util_read_named_file(secret.c_str(), &buf, &exists, nullptr))},
            {"zv_util_sync_file", kSys, ZVT_CALL(zv_util_sync_file(ro.c_str())), nullptr, 1,
             kUntouched, "Failed to open file"},
            {"zv_util_write_named_file", kSys,
             ZVT_CALL(zv_util_write_named_file(ro.c_str(), 1, "w", 1, nullptr))},
            {"zv_util_query_file_exists", kSys,
             ZVT_CALL(zv_util_query_file_exists((closed + "/x").c_str(), &exists))},
        });
        EXPECT_EQ(zv_util_query_file_exists(secret.c_str(), &exists), ZV_OK);
        EXPECT_EQ(exists, 1u) << "exists, though it may not be read";
        EXPECT_EQ(get_file(ro), "r");
    });
}

}  // namespace
