// Descriptors and streams the library opens for itself are close-on-exec, so
// a child started meanwhile by another thread inherits none of them; the
// caller's own flags and modes pass through as given.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <unistd.h>

#include "process/process_internal.h"
#include "support/scratch.h"
#include "system/system_internal.h"
#include <zvutil/file.h>
#include <zvutil/process.h>

TEST(CloseOnExec, InternalOpensOnly)
{
    zvt::ScratchDir dir;
    std::string file = dir / "f", pid_file = dir / "app.pid";
    zvt::put_file(file, "x");
    int64_t size;
    char *buf;
    uint32_t n, owner, count, *pids = nullptr;
    zv_proc_stat stat;
    ASSERT_EQ(zv_util_get_file_size(file.c_str(), &size), ZV_OK);
    ASSERT_EQ(zv_util_sync_file(file.c_str()), ZV_OK);
    ASSERT_EQ(zv_util_write_named_file(file.c_str(), 1, "y", 1, nullptr), ZV_OK);
    ASSERT_EQ(zv_util_read_named_file(file.c_str(), &buf, &n, nullptr), ZV_OK);
    std::free(buf);
    ASSERT_EQ(zv_util_claim_pid_file(pid_file.c_str(), "app", &owner), ZV_OK);  // created
    ASSERT_EQ(zv_util_claim_pid_file(pid_file.c_str(), "app", &owner), ZV_OK);  // taken over
    (void)zv_util_proc_stat(&stat, getpid());
    ASSERT_EQ(zv_util_pid_of("no-such-program", 0, &pids, &count), ZV_OK);
    std::free(pids);
    unsigned internal = 0;
    for (const zvt::OpenCall &call : zvt::open_log()) {
        internal++;
        EXPECT_TRUE(call.flags == -1 ? std::strchr(call.mode, 'e') != nullptr
                                     : (call.flags & O_CLOEXEC) != 0)
            << call.function << " " << call.path << " " << call.flags << " " << call.mode;
    }
    EXPECT_GE(internal, 10u);

    zvt::open_log_clear();
    int32_t fd;
    FILE *stream;
    ASSERT_EQ(zv_util_open(&fd, nullptr, O_RDONLY, 0, "%s", file.c_str()), ZV_OK);
    ASSERT_EQ(zv_util_fopen(&stream, nullptr, "r", "%s", file.c_str()), ZV_OK);
    close(fd);
    std::fclose(stream);
    std::vector<zvt::OpenCall> caller = zvt::open_log();
    ASSERT_EQ(caller.size(), 2u);
    EXPECT_EQ(caller[0].flags, O_RDONLY);
    EXPECT_STREQ(caller[1].mode, "r");
}
