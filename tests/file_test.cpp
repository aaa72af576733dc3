// Descriptors, durable sync and path components, named files, directories;
// what the library opens for itself is close-on-exec.
#include <sys/socket.h>

#include "support/zvt.h"

namespace {

using zvt::get_file, zvt::put_file;
constexpr zv_status kSys = ZV_ERR_SYSTEM;
constexpr const char *kAbsent = "/nonexistent/zvt";
int32_t *const kErr = &zvt::row_errno;
using zvt::kUntouched;

TEST(Descriptors, WholeTransfersAndLineCounts)
{
    int ends[2];
    char buf[16] = {};
    // A read takes one datagram; one missing fails the read rather than block.
    ASSERT_EQ(socketpair(AF_UNIX, SOCK_DGRAM | SOCK_NONBLOCK, 0, ends), 0);
    zvt::fault_arm("write_idle", 1, 0, 3);  // four writes that take nothing are tolerated
    EXPECT_EQ(zv_util_whole_write(ends[1], "xyz", 3, nullptr), ZV_OK);
    zvt::fault_arm("write_idle", 1, 0, 4);  // a fifth ends it
    EXPECT_EQ(zv_util_whole_write(ends[1], "abc", 3, nullptr), static_cast<zv_status>(-EAGAIN));
    zvt::fault_arm("write_short", 1, 0);  // "u", then the rest in a second write
    EXPECT_EQ(zv_util_whole_write(ends[1], "uvwXYZ", 6, nullptr), ZV_OK);
    zvt::fault_arm("read_idle", 1, 0, 3);  // four empty reads, a datagram that refills the budget,
    zvt::fault_arm("read_idle", 2, 0, 3);  // four more, then the missing part in two datagrams
    EXPECT_EQ(zv_util_whole_read(ends[0], buf, 6), 6);
    EXPECT_STREQ(buf, "xyzuvw");
    zvt::fault_arm("read_idle", 1, 0, 4);  // five empty reads end it
    EXPECT_EQ(zv_util_whole_read(ends[0], buf, 1), -EAGAIN);
    zvt::fault_clear();
    EXPECT_EQ(std::make_tuple(zv_util_whole_read(-1, nullptr, 1), zv_util_whole_read(-1, buf, -1),
                              zv_util_whole_read(-1, buf, 1), zv_util_whole_read(-1, buf, 0)),
              std::make_tuple(-EINVAL, -EINVAL, -1, 0));
    EXPECT_EQ(zv_util_whole_write(-1, "", 0, nullptr), ZV_OK);
    close(ends[0]), close(ends[1]);

    zvt::ScratchDir dir;
    zvt::in_child(false, [&] {  // lines counted on descriptor 0, which is an ordinary one
        for (size_t size : {0, 4, 17, 1025, 5000})  // around the 16-byte blocks and 1024-byte reads
            for (size_t step : {1, 3, 37}) {
                std::string content(size, 'x');
                for (size_t i = 0; i < size; i += step + i % 5)
                    content[i] = '\n';
                put_file(dir / "f", content);
                ASSERT_NE(std::freopen((dir / "f").c_str(), "r", stdin), nullptr);
                off_t middle = lseek(0, static_cast<off_t>(size / 2), SEEK_SET);
                zvt::for_each_feature_path([&](uint32_t path) {
                    uint32_t count = 0;  // the plain path also sees the file shrink once measured
                    auto lines = ZVT_CALL(zv_util_count_lines(0, &count, nullptr));
                    EXPECT_EQ(zvt::with_fault(path ? "none" : "fstat_grown", 1, 0, lines), ZV_OK);
                    EXPECT_EQ(count, std::count(content.begin(), content.end(), '\n'))
                        << "path " << path << ", size " << size << ", step " << step;
                    EXPECT_EQ(lseek(0, 0, SEEK_CUR), middle);
                });
            }
    });
}

TEST(Descriptors, OpenReadMeasureTruncateDelete)
{
    zvt::ScratchDir dir;
    std::string f = dir / "f", big = dir / "big", f_x = f + "/x";
    put_file(f, std::string(2000, '\n'));
    char *buf = nullptr;
    uint32_t n = 0, exists = 7, gone = 7;
    int32_t fd = -1;
    int64_t size = 0;
    EXPECT_OK(zv_util_open(&fd, nullptr, O_RDONLY, 0, "%s/%c", dir.path.c_str(), 'f'),
              zv_util_read_file(fd, &buf, &n, nullptr));
    EXPECT_EQ(std::string(buf, n + 1), std::string(2000, '\n') + '\0');
    std::free(buf), close(fd);
    EXPECT_OK(zv_util_truncate_file(f.c_str(), 1, nullptr), zv_util_get_file_size(f.c_str(), &size),
              zv_util_query_file_exists(f.c_str(), &exists),
              zv_util_delete_file(f.c_str(), nullptr), zv_util_query_file_exists(f.c_str(), &gone));
    EXPECT_EQ(std::tie(size, exists, gone), std::make_tuple(1, 1u, 0u));
    EXPECT_EQ(zvt::inheritable_opens(), "0 ") << "only the caller's own open";

    // A NULL between two checked pointers fails either || turned into &&.
    EXPECT_ALL(ZV_ERR_NULL_ARG, zv_util_open(nullptr, 0, 0, 0, kAbsent),
        zv_util_read_file(0, &buf, nullptr, 0), zv_util_query_file_exists(kAbsent, nullptr),
        zv_util_get_file_size(kAbsent, nullptr), zv_util_whole_write(-1, nullptr, 1, nullptr),
        zv_util_count_lines(0, nullptr, nullptr),
        zv_util_truncate_file(nullptr, 0, nullptr), zv_util_delete_file(nullptr, nullptr));
    put_file(f, std::string(2000, '\n'));
    ASSERT_EQ(truncate64((put_file(big, ""), big.c_str()), (off64_t{1} << 32) + 1), 0);  // sparse
    int from = open(f.c_str(), O_RDONLY), huge = open(big.c_str(), O_RDONLY | O_LARGEFILE), out = 0;
    lseek(from, 7, SEEK_SET);  // where a failed line count must leave it
    auto read_fd = [&](int of) { return zv_util_read_file(of, &buf, &n, kErr); };
    zvt::expect_failures({
        {"zv_util_open", kSys, ZVT_CALL(zv_util_open(&out, kErr, 0, 0, kAbsent)), 0, 1, ENOENT},
        {"zv_util_whole_write", kSys, ZVT_CALL(zv_util_whole_write(-1, "a", 1, kErr)), 0, 1, EBADF},
        {"zv_util_whole_write", ZV_ERR_OVERFLOW, ZVT_CALL(zv_util_whole_write(-1, "a", -1, kErr))},
        {"zv_util_read_file", kSys, ZVT_CALL(read_fd(-1)), 0, 1, EBADF},
        {"zv_util_read_file", kSys, ZVT_CALL(read_fd(huge)), 0, 1, EOVERFLOW},
        {"zv_util_read_file", kSys, ZVT_CALL(read_fd(from)), "read"},
        {"zv_util_count_lines", ZV_ERR_BAD_VALUE, ZVT_CALL(zv_util_count_lines(-1, &n, nullptr))},
        ROW(kSys, count_lines, (from, &n, kErr), .point = "fstat", .err = EIO),
        ROW(kSys, count_lines, (from, &n, kErr), .point = "read", .nth = 2, .err = EIO),
        ROW(kSys, truncate_file, (kAbsent, 0, kErr), .err = ENOENT),
        {"zv_util_delete_file", kSys, ZVT_CALL(zv_util_delete_file(kAbsent, kErr)), 0, 1, ENOENT},
        // A file used as a directory: ENOTDIR.
        {"zv_util_query_file_exists", kSys, ZVT_CALL(zv_util_query_file_exists(f_x.c_str(), &n))},
        {"zv_util_get_file_size", kSys, ZVT_CALL(zv_util_get_file_size(kAbsent, &size))},
        {"zv_util_get_file_size", kSys, ZVT_CALL(zv_util_get_file_size(f.c_str(), &size)), "fstat"},
    });
    EXPECT_EQ(lseek(from, 0, SEEK_CUR), 7);
    close(from), close(huge);
    // A failed formatting leaves the descriptor unwritten.
    zvt::sweep_allocations([&] {
        zv_status s = zv_util_open(&(out = 77), kErr, O_RDONLY, 0, "%s", f.c_str());
        EXPECT_EQ(out == 77, s != ZV_OK);
        return close(s ? -1 : out), s;
    }, {{"zv_util_vasprintf"}}, 0);
    zvt::sweep_allocations([&] {
        from = open(f.c_str(), O_RDONLY);
        return ZVT_NULLS(char *, zv_util_read_file(from, &o, &n, kErr))() + close(from);
    }, {{"zv_util_read_file", "", 0, ENOMEM}});
}

TEST(Sync, StreamsFilesAndPathComponents)
{
    zvt::ScratchDir dir;
    std::string f = dir / "f";
    put_file(f, "x");
    FILE *stream = fopen(f.c_str(), "a");
    std::string longest = dir.path + std::string(998 - dir.path.size(), '/') + "f";  // 999
    EXPECT_OK(zv_util_sync(stream, nullptr), zv_util_sync(stream, dir.path.c_str()),
              zv_util_sync_file(longest.c_str()));
    EXPECT_EQ(zvt::inheritable_opens(), "a ") << "only the caller's own stream";
    char *out = nullptr;
    for (auto [path, directory] :
         {std::pair{"a/b/c", "a/b"}, {"a//b", "a/"}, {"/x", ""}, {"x", "x"}, {"", ""}}) {
        EXPECT_EQ(zv_util_get_directory_component(path, &out), ZV_OK);
        EXPECT_STREQ(out, directory) << path;
        std::free(out);
    }
    ASSERT_EQ(zv_util_abs_path("/proc/self/../self/.", &out), ZV_OK);
    EXPECT_EQ(std::string(out), "/proc/" + std::to_string(getpid()));
    std::free(out);

    EXPECT_ALL(ZV_ERR_NULL_ARG, zv_util_sync(nullptr, nullptr), zv_util_sync_file(nullptr));
    auto sync = ZVT_CALL(zv_util_sync_file(f.c_str()));
    const char *component = "zv_util_get_directory_component,zv_util_sync_file";
    zvt::expect_failures({
        {"zv_util_sync", kSys, ZVT_CALL(zv_util_sync(stream, kAbsent))},
        {"zv_util_sync", kSys, ZVT_CALL(zv_util_sync(stream, nullptr)), "fflush"},
        {"zv_util_sync", kSys, ZVT_CALL(zv_util_sync(stream, "/")), "fsync", 2},
        {"zv_util_sync_file", kSys, sync, "open", 1, kUntouched, "Failed to open file"},
        {"zv_util_sync_file", kSys, sync, "open", 2, kUntouched, "Failed to open directory"},
        {"zv_util_sync_file", kSys, sync, "fsync", 1, kUntouched, "Failed to sync file"},
        {"zv_util_sync_file", kSys, sync, "fsync", 2, kUntouched, "Failed to sync directory file"},
        ROW(ZV_ERR_BAD_VALUE, sync_file, ((longest + "f").c_str())),  // a path of 1000 bytes
        {"zv_util_abs_path", kSys, ZVT_CALL(zv_util_abs_path(kAbsent, &out))},
    });
    std::fclose(stream);
    zvt::sweep_allocations(sync, {{component, "Failed to get directory component", 2}});
    zvt::sweep_allocations(ZVT_NULLS(char *, zv_util_get_directory_component("a/b", &o)),
                           {{"zv_util_get_directory_component"}});
}

TEST(NamedFiles, WriteAppendReadCopy)
{
    zvt::ScratchDir dir;
    std::string f = dir / "f", g = dir / "g", big = dir / "big";
    auto write = ZVT_CALL(zv_util_write_named_file(f.c_str(), 1, "data", 4, nullptr));
    EXPECT_OK(zv_util_write_named_file(f.c_str(), 0, "new", 3, nullptr),    // created
              zv_util_write_named_file(f.c_str(), 0, "+more", 5, nullptr),  // appended
              zv_util_copy_file(f.c_str(), f.c_str()));                     // onto itself
    EXPECT_EQ(get_file(f), "new+more");
    EXPECT_EQ(zvt::with_fault("fwrite_short", 1, 0, write), ZV_OK);  // the rest in a second call
    EXPECT_EQ(get_file(f), "data");
    char *buf = nullptr;
    uint32_t n = 0;
    auto read_path = [&](auto &p) { return zv_util_read_named_file(p.c_str(), &buf, &n, nullptr); };
    for (std::string content : {std::string("x\0y", 3), std::string(), std::string(70000, 'q')}) {
        EXPECT_OK(zv_util_write_named_file(f.c_str(), 1, content.data(), content.size(), nullptr),
                  zv_util_copy_file(f.c_str(), g.c_str()));
        for (const char *point : {"none", "fread_short"}) {  // the second read takes two parts
            ASSERT_EQ(zvt::with_fault(point, 1, 0, ZVT_CALL(read_path(g))), ZV_OK);
            EXPECT_EQ(std::string(buf, n + 1), content + '\0') << point;
            std::free(buf);
        }
    }
    FILE *stream = nullptr;
    zvt::sweep_allocations([&] {  // an existing file by a formatted name, in the caller's mode
        auto s = zv_util_fopen(&(stream = nullptr), kErr, "r+", "%s/%c", dir.path.c_str(), 'g');
        EXPECT_EQ(stream == nullptr, s != ZV_OK);
        return stream && std::fclose(stream), s;
    }, {{"zv_util_vasprintf,zv_util_fopen"}}, 0);
    EXPECT_EQ(zvt::inheritable_opens(), "r+ ") << "only the caller's own stream";

    EXPECT_ALL(ZV_ERR_NULL_ARG, zv_util_fopen(&stream, 0, nullptr, kAbsent),
        zv_util_read_named_file(kAbsent, nullptr, &n, 0),
        zv_util_write_named_file(kAbsent, 1, nullptr, 0, 0), zv_util_copy_file(kAbsent, nullptr));
    ASSERT_EQ(truncate64((put_file(big, ""), big.c_str()), (off64_t{1} << 32) + 1), 0);
    // Where offsets are 32 bits every size query refuses 2 GiB or more; with
    // 64-bit offsets the named read refuses 4 GiB.
    bool narrow = sizeof(off_t) == 4;
    zvt::expect_failures({
        {"zv_util_fopen", kSys, ZVT_CALL(zv_util_fopen(&stream, kErr, "r", kAbsent)), 0, 1, ENOENT},
        {narrow ? "zv_util_get_file_size,zv_util_read_named_file" : "zv_util_read_named_file",
         narrow ? kSys : static_cast<zv_status>(ZV_ERR_OVERFLOW), ZVT_CALL(read_path(big))},
        // The file ends before its measured size.
        {"zv_util_read_named_file", kSys, ZVT_CALL(read_path(f)), "fstat_grown"},
        {"zv_util_read_named_file", kSys, ZVT_CALL(read_path(f)), "fopen"},
        {"zv_util_write_named_file", kSys, write, "ferror"},
        {"zv_util_write_named_file", kSys, write, "fwrite_idle"},
        {"zv_util_sync,zv_util_write_named_file", kSys, write, "fsync"},
        {"zv_util_write_named_file", kSys, write, "fopen"},
        {"zv_util_get_file_size,zv_util_read_named_file", kSys,
         ZVT_CALL(zv_util_copy_file(kAbsent, f.c_str()))},
    });
    zvt::sweep_allocations(ZVT_NULLS(char *, zv_util_read_named_file(f.c_str(), &o, &n, nullptr)),
                           {{"zv_util_read_named_file"}});
    zvt::sweep_allocations(write, {{"zv_util_get_directory_component,zv_util_write_named_file"}});
    // The content, then the destination's directory component.
    zvt::sweep_allocations(ZVT_CALL(zv_util_copy_file(f.c_str(), g.c_str())),
                           {{"zv_util_read_named_file"},
                            {"zv_util_get_directory_component,zv_util_write_named_file"}});
}

TEST(Directories, CreateScanQuery)
{
    zvt::ScratchDir dir;
    for (const char *name : {"beta", "Alpha", ".profile", "Zeta", "_u"})
        put_file(dir / name, "");
    EXPECT_OK(zv_util_mkdir((dir / "delta").c_str()),
              zv_util_mkdir_read_only((dir / "gamma").c_str()));
    auto mode = [&](const char *name) { return std::filesystem::status(dir / name).permissions(); };
    EXPECT_EQ(std::make_tuple(unsigned(mode("delta")), unsigned(mode("gamma"))),
              std::make_tuple(0700u, 0500u));
    zv_util_dirscan_state *scan = zv_util_dirscan_begin(dir.path.c_str());
    EXPECT_EQ(zv_dirscan_file_name(scan), nullptr) << "no current entry before the first advance";
    std::string names;
    for (char *name; zv_util_dirscan(scan) == ZV_OK; std::free(name))
        names += std::string(name = zv_dirscan_file_name(scan)) + " ";
    EXPECT_EQ(names, ".profile _u Alpha beta delta gamma Zeta ");
    EXPECT_EQ(zv_util_dirscan(scan), ZV_ERR_NO_MORE);  // the end stays
    EXPECT_EQ(zv_dirscan_file_name(scan), nullptr) << "no current entry after the end";
    zv_util_dirscan_end(scan);
    size_t heap = zvt::heap_in_use();
    ASSERT_EQ(zv_util_dirscan(scan = zv_util_dirscan_begin(dir.path.c_str())), ZV_OK);
    zv_util_dirscan_end(scan), zv_util_dirscan_end(nullptr);  // ended midway: all released
    EXPECT_EQ(zvt::heap_in_use(), heap);
    ASSERT_EQ(zv_util_dirscan(scan = zv_util_dirscan_begin(dir.path.c_str())), ZV_OK);
    zvt::sweep_allocations(ZVT_BLOCK(zv_dirscan_file_name(scan)), {{""}});
    zv_util_dirscan_end(scan);
    unsigned fds = zvt::open_fd_count();
    uint32_t found[2] = {9, 9};
    EXPECT_OK(zv_util_query_dir_exists((dir / "delta").c_str(), &found[0]),
              zv_util_query_dir_exists((dir / "beta").c_str(), &found[1]));  // a file
    EXPECT_EQ(std::make_tuple(found[0], found[1]), std::make_tuple(1u, 0u));
    EXPECT_EQ(zvt::open_fd_count(), fds);

    uint32_t n = 0;
    EXPECT_ALL(ZV_ERR_NULL_ARG, zv_util_mkdir(nullptr), zv_util_mkdir_read_only(nullptr),
        zv_util_dirscan(nullptr), zv_util_query_dir_exists(nullptr, &n));
    EXPECT_EQ(zv_util_dirscan_begin(nullptr), nullptr);
    zvt::expect_failures({ROW(kSys, mkdir, (kAbsent)), ROW(kSys, mkdir_read_only, (kAbsent))});
    // A scan that cannot start is a NULL result alone, with errno kept.
    zvt::expect_failures({{"", ZV_ERR_NO_MEMORY, [&] {
        zv_status s = ZVT_BLOCK(zv_util_dirscan_begin(kAbsent))();
        EXPECT_EQ(errno, ENOENT);
        return s;
    }}});
    zvt::sweep_allocations(ZVT_CALL(zv_util_dirscan_end(scan = zv_util_dirscan_begin("/")),
                                    scan ? ZV_OK : ZV_ERR_NO_MEMORY), {{""}});
}

}  // namespace
