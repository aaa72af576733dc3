// Directories: creation, existence and sorted scans.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <string>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include "support/scratch.h"
#include <zvutil/directory.h>

namespace {

using zvt::put_file;
using zvt::ScratchDir;

TEST(Dirscan, CaseInsensitiveOrderWithoutDotEntries)
{
    ScratchDir dir;
    for (const char *name : {"beta", "Alpha", "gamma", ".profile", "Zeta", "_u"})
        put_file(dir / name, "");
    ASSERT_EQ(mkdir((dir / "delta").c_str(), 0700), 0);
    zv_util_dirscan_state *scan = zv_util_dirscan_begin(dir.path().c_str());
    ASSERT_NE(scan, nullptr);
    put_file(dir / "later", "");  // the listing is a snapshot
    EXPECT_EQ(zv_dirscan_file_name(scan), nullptr) << "no current entry before the first advance";
    std::vector<std::string> names;
    while (zv_util_dirscan(scan) == ZV_OK) {
        char *name = zv_dirscan_file_name(scan);
        names.emplace_back(name);
        std::free(name);
    }
    EXPECT_EQ(names, (std::vector<std::string>{".profile", "_u", "Alpha", "beta", "delta", "gamma",
                                                "Zeta"}));
    EXPECT_EQ(zv_util_dirscan(scan), ZV_ERR_NO_MORE);  // the end stays
    EXPECT_EQ(zv_dirscan_file_name(scan), nullptr) << "no current entry after the end";
    EXPECT_FRAMES({"zv_util_dirscan", ZV_ERR_NO_MORE}, {"zv_util_dirscan", ZV_ERR_NO_MORE});
    zv_util_dirscan_end(scan);
}

TEST(Directories, FailureTable)
{
    ScratchDir dir;
    ASSERT_EQ(mkdir((dir / "sub").c_str(), 0700), 0);
    zv_util_dirscan_state *empty = zv_util_dirscan_begin((dir / "sub").c_str());
    put_file(dir / "file", "");
    zvt::expect_failures({
        {"zv_util_mkdir", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_mkdir(nullptr))},
        {"zv_util_mkdir_read_only", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_mkdir_read_only(nullptr))},
        {"zv_util_mkdir", ZV_ERR_SYSTEM, ZVT_CALL(zv_util_mkdir((dir / "sub").c_str()))},
        {"zv_util_mkdir_read_only", ZV_ERR_SYSTEM,
         ZVT_CALL(zv_util_mkdir_read_only((dir / "a/b").c_str()))},
        {"zv_util_dirscan", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_dirscan(nullptr))},
        {"zv_util_dirscan", ZV_ERR_NO_MORE, ZVT_CALL(zv_util_dirscan(empty))},  // "." and ".."
    });
    zv_util_dirscan_end(empty);
    zvt::clear_trace();

    // The scan's own failures are a NULL result alone, with errno kept.
    struct {
        std::string path;
        const char *point;
        int err;
    } rows[] = {{dir / "missing", "none", ENOENT},
                {dir / "file", "none", ENOTDIR},
                {dir.path(), "alloc", EMFILE},
                {dir.path(), "scandir", EMFILE}};
    size_t heap = zvt::heap_in_use();
    for (const auto &row : rows) {
        zvt::fault_arm(row.point, 1, row.err);
        EXPECT_EQ(zv_util_dirscan_begin(row.path.c_str()), nullptr) << row.point;
        EXPECT_EQ(errno, row.err) << row.point;
        zvt::fault_clear();
    }
    zv_util_dirscan_state *scan = zv_util_dirscan_begin(dir.path().c_str());
    ASSERT_EQ(zv_util_dirscan(scan), ZV_OK);
    EXPECT_EQ(zvt::with_fault("alloc", 1, ENOMEM, ZVT_CALL(zv_dirscan_file_name(scan))), nullptr);
    zv_util_dirscan_end(scan);  // ended midway: everything released
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_EQ(zv_util_dirscan_begin(nullptr), nullptr);
    EXPECT_EQ(zv_dirscan_file_name(nullptr), nullptr);
    zv_util_dirscan_end(nullptr);
    EXPECT_NO_FRAMES();
}

TEST(QueryDirExists, OnlyOpenableDirectoriesCount)
{
    ScratchDir dir;
    put_file(dir / "file", "");
    struct {
        std::string path;
        uint32_t exists;
        const char *point;
    } rows[] = {{dir.path(), 1, "none"}, {dir / "file", 0, "none"}, {dir / "missing", 0, "none"},
                {dir.path(), 0, "opendir"}};
    unsigned fds = zvt::open_fd_count();
    for (const auto &row : rows) {
        uint32_t exists = 99;
        zvt::fault_arm(row.point, 1, EMFILE);
        EXPECT_EQ(zv_util_query_dir_exists(row.path.c_str(), &exists), ZV_OK);
        zvt::fault_clear();
        EXPECT_EQ(exists, row.exists) << row.path << row.point;
    }
    EXPECT_EQ(zvt::open_fd_count(), fds);
    EXPECT_EQ(zv_util_query_dir_exists(nullptr, nullptr), ZV_ERR_NULL_ARG);
    EXPECT_NO_FRAMES();
}

TEST(Directories, ModesForAnUnprivilegedOwner)
{
    ScratchDir dir;
    zvt::in_child(true, [&] {
        std::string rw = dir / "rw", ro = dir / "ro";
        mode_t mask = umask(022);
        ASSERT_EQ(zv_util_mkdir(rw.c_str()), ZV_OK);
        ASSERT_EQ(zv_util_mkdir_read_only(ro.c_str()), ZV_OK);
        struct stat st_rw, st_ro;
        ASSERT_EQ(stat(rw.c_str(), &st_rw) | stat(ro.c_str(), &st_ro), 0);
        EXPECT_EQ(st_rw.st_mode & 0777, 0700u);
        EXPECT_EQ(st_ro.st_mode & 0777, 0500u);
        umask(mask);
        EXPECT_EQ(creat((ro + "/file").c_str(), 0600), -1) << "its owner cannot create entries";
        ASSERT_EQ(chmod(rw.c_str(), 0300), 0);  // searchable, not readable
        uint32_t exists = 99;
        EXPECT_EQ(zv_util_query_dir_exists(rw.c_str(), &exists), ZV_OK);
        EXPECT_EQ(exists, 0u);
        EXPECT_EQ(zv_util_dirscan_begin(rw.c_str()), nullptr);
        EXPECT_EQ(errno, EACCES);
    });
}

}  // namespace
