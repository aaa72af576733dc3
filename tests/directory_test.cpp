// Directories: creation, existence and sorted scans.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <fcntl.h>
#include <string>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include "support/fault.h"
#include "support/scratch.h"
#include "support/trace.h"
#include <zvutil/directory.h>

namespace {

using zvt::ScratchDir;

// Every name of a scan, in order; the scan is left at its end.
std::vector<std::string> scan_all(zv_util_dirscan_state *scan)
{
    std::vector<std::string> names;
    while (zv_util_dirscan(scan) == ZV_OK) {
        char *name = zv_dirscan_file_name(scan);
        names.emplace_back(name != nullptr ? name : "(null)");
        std::free(name);
    }
    return names;
}

TEST(Mkdir, ModesAndFailures)
{
    ScratchDir dir;
    mode_t old_mask = umask(022);
    EXPECT_EQ(zv_util_mkdir((dir / "rw").c_str()), ZV_OK);
    EXPECT_EQ(zv_util_mkdir_read_only((dir / "ro").c_str()), ZV_OK);
    umask(old_mask);
    struct stat st;
    ASSERT_EQ(stat((dir / "rw").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0700u);
    ASSERT_EQ(stat((dir / "ro").c_str(), &st), 0);
    EXPECT_EQ(st.st_mode & 0777, 0500u);
    EXPECT_NO_FRAMES();

    EXPECT_EQ(zv_util_mkdir(nullptr), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_mkdir_read_only(nullptr), ZV_ERR_NULL_ARG);
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_mkdir((dir / "rw").c_str()));
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_mkdir_read_only((dir / "a/b").c_str()));
    EXPECT_FRAMES({"zv_util_mkdir", ZV_ERR_NULL_ARG}, {"zv_util_mkdir_read_only", ZV_ERR_NULL_ARG},
                  {"zv_util_mkdir", ZV_ERR_SYSTEM}, {"zv_util_mkdir_read_only", ZV_ERR_SYSTEM});
}

TEST(Dirscan, CaseInsensitiveOrderWithoutDotEntries)
{
    ScratchDir dir;
    for (const char *name : {"beta", "Alpha", "gamma", ".profile", "Zeta", "_u"})
        zvt::put_file(dir / name, "");
    ASSERT_EQ(mkdir((dir / "delta").c_str(), 0700), 0);

    zv_util_dirscan_state *scan = zv_util_dirscan_begin(dir.path().c_str());
    ASSERT_NE(scan, nullptr);
    EXPECT_EQ(zv_dirscan_file_name(scan), nullptr) << "no current entry before the first advance";
    EXPECT_EQ(scan_all(scan),
              (std::vector<std::string>{".profile", "_u", "Alpha", "beta", "delta", "gamma", "Zeta"}));
    EXPECT_FRAMES({"zv_util_dirscan", ZV_ERR_NO_MORE});
    // The end is sticky and records a frame each time.
    EXPECT_EQ(zv_util_dirscan(scan), ZV_ERR_NO_MORE);
    EXPECT_EQ(zv_util_dirscan(scan), ZV_ERR_NO_MORE);
    EXPECT_EQ(zv_dirscan_file_name(scan), nullptr) << "no current entry after the end";
    EXPECT_EQ(zvt::frames().size(), 3u);
    zv_util_dirscan_end(scan);
}

TEST(Dirscan, EmptyDirectoryAndSnapshot)
{
    ScratchDir dir;
    zv_util_dirscan_state *scan = zv_util_dirscan_begin(dir.path().c_str());
    ASSERT_NE(scan, nullptr);
    zvt::put_file(dir / "later", "");  // not part of the listing already read
    EXPECT_EQ(zv_util_dirscan(scan), ZV_ERR_NO_MORE);
    EXPECT_FRAMES({"zv_util_dirscan", ZV_ERR_NO_MORE});
    zv_util_dirscan_end(scan);
}

TEST(Dirscan, FailuresAndRelease)
{
    ScratchDir dir;
    zvt::put_file(dir / "file", "");
    zvt::put_file(dir / "other", "");
    EXPECT_EQ(zv_util_dirscan_begin(nullptr), nullptr);
    EXPECT_EQ(zv_util_dirscan_begin((dir / "missing").c_str()), nullptr);
    EXPECT_EQ(errno, ENOENT);
    EXPECT_EQ(zv_util_dirscan_begin((dir / "file").c_str()), nullptr);
    EXPECT_EQ(errno, ENOTDIR);
    EXPECT_EQ(zv_dirscan_file_name(nullptr), nullptr);
    zv_util_dirscan_end(nullptr);
    EXPECT_NO_FRAMES();
    EXPECT_EQ(zv_util_dirscan(nullptr), ZV_ERR_NULL_ARG);
    EXPECT_FRAMES({"zv_util_dirscan", ZV_ERR_NULL_ARG});

    // Record allocation or listing failing: NULL, nothing held, errno kept.
    size_t heap = zvt::heap_in_use();
    unsigned fds = zvt::open_fd_count();
    for (const char *point : {"alloc", "scandir"}) {
        zvt::fault_arm(point, 1, EMFILE);
        zv_util_dirscan_state *scan = zv_util_dirscan_begin(dir.path().c_str());
        int saved = errno;
        zvt::fault_clear();
        EXPECT_EQ(scan, nullptr) << point;
        EXPECT_EQ(saved, EMFILE) << point;
    }
    EXPECT_EQ(zvt::heap_in_use(), heap);

    // A scan ended midway releases everything; a failed name copy is NULL.
    zv_util_dirscan_state *scan = zv_util_dirscan_begin(dir.path().c_str());
    ASSERT_NE(scan, nullptr);
    ASSERT_EQ(zv_util_dirscan(scan), ZV_OK);
    char *name = zvt::with_fault("alloc", 1, ENOMEM, [&] { return zv_dirscan_file_name(scan); });
    EXPECT_EQ(name, nullptr);
    zv_util_dirscan_end(scan);
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_EQ(zvt::open_fd_count(), fds);
}

TEST(QueryDirExists, OnlyOpenableDirectoriesCount)
{
    ScratchDir dir;
    zvt::put_file(dir / "file", "");
    struct Row {
        std::string path;
        uint32_t exists;
    } rows[] = {{dir.path(), 1}, {"/", 1}, {dir / "file", 0}, {dir / "missing", 0}};
    unsigned fds = zvt::open_fd_count();
    for (const Row &row : rows) {
        uint32_t exists = 99;
        EXPECT_EQ(zv_util_query_dir_exists(row.path.c_str(), &exists), ZV_OK) << row.path;
        EXPECT_EQ(exists, row.exists) << row.path;
    }
    uint32_t exists = 99;
    zv_status status = zvt::with_fault("opendir", 1, EMFILE, [&] {
        return zv_util_query_dir_exists(dir.path().c_str(), &exists);
    });
    EXPECT_EQ(status, ZV_OK);
    EXPECT_EQ(exists, 0u);
    EXPECT_EQ(zvt::open_fd_count(), fds);
    EXPECT_EQ(zv_util_query_dir_exists(nullptr, &exists), ZV_ERR_NULL_ARG);
    EXPECT_NO_FRAMES();
}

TEST(DirectoryPermissions, UnprivilegedCallerMeetsTheModes)
{
    if (geteuid() != 0)
        GTEST_SKIP() << "needs root to switch users";
    ScratchDir dir;
    zvt::in_child([&] {
        zvt::drop_privileges();
        std::string ro = dir / "ro", closed = dir / "closed";
        ASSERT_EQ(zv_util_mkdir_read_only(ro.c_str()), ZV_OK);
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_mkdir((ro + "/sub").c_str()));
        EXPECT_EQ(creat((ro + "/file").c_str(), 0600), -1);

        ASSERT_EQ(zv_util_mkdir(closed.c_str()), ZV_OK);
        ASSERT_EQ(chmod(closed.c_str(), 0300), 0);  // searchable, not readable
        uint32_t exists = 99;
        EXPECT_EQ(zv_util_query_dir_exists(closed.c_str(), &exists), ZV_OK);
        EXPECT_EQ(exists, 0u);
        EXPECT_EQ(zv_util_dirscan_begin(closed.c_str()), nullptr);
        EXPECT_EQ(errno, EACCES);
        EXPECT_FRAMES({"zv_util_mkdir", ZV_ERR_SYSTEM});
    });
}

}  // namespace
