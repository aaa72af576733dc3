// The thread ID and the /proc stat line parser.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <sys/stat.h>
#include <thread>
#include <unistd.h>

#include "support/fault.h"
#include "support/process_support.h"
#include "support/trace.h"
#include "system/system_internal.h"
#include <zvutil/process.h>

namespace {

class StatFile : public ::testing::Test {
protected:
    void SetUp() override
    {
        char pattern[] = "/tmp/zvt-stat-XXXXXX";
        ASSERT_NE(mkdtemp(pattern), nullptr);
        dir_ = pattern;
        path_ = dir_ + "/stat";
    }
    void TearDown() override
    {
        std::remove(path_.c_str());
        rmdir(dir_.c_str());
    }
    const char *write(const std::string &content)
    {
        FILE *f = std::fopen(path_.c_str(), "w");
        std::fwrite(content.data(), 1, content.size(), f);
        std::fclose(f);
        return path_.c_str();
    }
    zv_proc_stat junk()
    {
        zv_proc_stat record;
        std::memset(&record, 0x5a, sizeof record);
        return record;
    }
    static bool all_zero(const zv_proc_stat &record)
    {
        static const zv_proc_stat zero = {};
        return std::memcmp(&record, &zero, sizeof record) == 0;
    }
    std::string dir_, path_;
};

TEST_F(StatFile, FieldsAndCommandNameWithBlanksAndParentheses)
{
    // 52 fields as a current kernel prints them; the name holds ") (" and blanks.
    const char *line =
        "4242 (my (odd) ) name) S 1 4243 4244 34816 4245 4194560 1000 2000 3 4 500 600 7 8 20 "
        "-5 1 0 5000000000 123456789 -1 18446744073709551615 4096 8192 3000 4000 5000 0 65536 "
        "4096 17 0 0 0 17 3 0 2 9000000000 10 11 12 13 14 15 16 17 18 0\n";
    zv_proc_stat st = junk();
    ASSERT_EQ(zv_util_proc_stat(&st, write(line)), ZV_OK);
    EXPECT_EQ(st.pid, 4242);
    EXPECT_EQ(st.comm, 0u);
    EXPECT_EQ(st.state, 'S');
    EXPECT_EQ(st.ppid, 1);
    EXPECT_EQ(st.pgrp, 4243);
    EXPECT_EQ(st.session, 4244);
    EXPECT_EQ(st.tty_nr, 34816);
    EXPECT_EQ(st.tpgid, 4245);
    EXPECT_EQ(st.flags, 4194560u);
    EXPECT_EQ(st.minflt, 1000u);
    EXPECT_EQ(st.cmajflt, 4u);
    EXPECT_EQ(st.stime, 600u);
    EXPECT_EQ(st.cstime, 8u);
    EXPECT_EQ(st.priority, 20u);
    EXPECT_EQ(static_cast<int32_t>(st.nice), -5) << "two's-complement pattern";
    EXPECT_EQ(st.num_threads, 1u);
    EXPECT_EQ(st.starttime, 5000000000ull);
    EXPECT_EQ(st.vsize, 123456789u);
    EXPECT_EQ(st.rss, -1);
    EXPECT_EQ(st.rsslim, 4294967295u);
    EXPECT_EQ(st.kstkeip, 5000u);
    EXPECT_EQ(st.blocked, 65536u);
    EXPECT_EQ(st.sigcatch, 17u);
    EXPECT_EQ(st.exit_signal, 17);
    EXPECT_EQ(st.processor, 3);
    EXPECT_EQ(st.policy, 2u);
    EXPECT_EQ(st.delayacct_blkio_ticks, 9000000000ull);
    EXPECT_NO_FRAMES();
}

TEST_F(StatFile, ExactlyFortyTwoFieldsWithoutNewline)
{
    std::string line = "7 (x) R";
    for (int i = 4; i <= 42; i++)
        line += " " + std::to_string(i);
    zv_proc_stat st = junk();
    ASSERT_EQ(zv_util_proc_stat(&st, write(line)), ZV_OK);
    EXPECT_EQ(st.ppid, 4);
    EXPECT_EQ(st.policy, 41u);
    EXPECT_EQ(st.delayacct_blkio_ticks, 42u);
}

TEST_F(StatFile, DoubleSpaceIsAnEmptyField)
{
    std::string line = "7 (x)  R";
    for (int i = 5; i <= 42; i++)
        line += " " + std::to_string(i);
    zv_proc_stat st = junk();
    ASSERT_EQ(zv_util_proc_stat(&st, write(line + "\n")), ZV_OK);
    EXPECT_EQ(st.state, '\0') << "the empty field converts to nothing";
    EXPECT_EQ(st.ppid, 0) << "'R' is no number";
    EXPECT_EQ(st.pgrp, 5);
}

TEST_F(StatFile, ShortLine)
{
    zv_proc_stat st = junk();
    const char *path = write("1 (x) R 9\n");
    zvt::LogCapture log;
    size_t heap = zvt::heap_in_use();
    unsigned fds = zvt::open_fd_count();
    EXPECT_STATUS(ZV_ERR_SYSTEM, zv_util_proc_stat(&st, path));
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_EQ(zvt::open_fd_count(), fds);
    EXPECT_EQ(st.pid, 1);
    EXPECT_EQ(st.state, 'R');
    EXPECT_EQ(st.ppid, 9);
    EXPECT_EQ(st.pgrp, 0);
    EXPECT_EQ(st.delayacct_blkio_ticks, 0u);
    EXPECT_FRAMES({"zv_util_proc_stat", ZV_ERR_SYSTEM});
    EXPECT_TRUE(zvt::LogIs(log, {{3, "Parsing logic failed, j=11, len=11"}}));
    EXPECT_EQ(log.lines().at(0).frames_before, 0u);
}

TEST_F(StatFile, UnclosedCommandNameSplitsAtBlanks)
{
    std::string line = "7 (a b";
    for (int i = 4; i <= 43; i++)
        line += " " + std::to_string(i);
    zv_proc_stat st = junk();
    ASSERT_EQ(zv_util_proc_stat(&st, write(line)), ZV_OK);
    EXPECT_EQ(st.state, 'b');
    EXPECT_EQ(st.ppid, 4);
}

TEST_F(StatFile, NothingToRead)
{
    struct Row {
        const char *what;
        std::string path;
        const char *message;
    } rows[] = {
        {"empty file", write(""), "getline() failed: Success"},
        {"a directory", dir_, "getline() failed: Is a directory"},
    };
    for (const Row &row : rows) {
        zvt::clear_trace();
        zvt::LogCapture log;
        zv_proc_stat st = junk();
        size_t heap = zvt::heap_in_use();
        unsigned fds = zvt::open_fd_count();
        EXPECT_STATUS(ZV_ERR_IO, zv_util_proc_stat(&st, row.path.c_str())) << row.what;
        EXPECT_EQ(zvt::heap_in_use(), heap);
        EXPECT_EQ(zvt::open_fd_count(), fds);
        EXPECT_TRUE(all_zero(st)) << row.what;
        EXPECT_FRAMES({"zv_util_proc_stat", ZV_ERR_IO});
        EXPECT_TRUE(zvt::LogIs(log, {{3, row.message}})) << row.what;
    }
}

TEST_F(StatFile, CannotOpen)
{
    for (int32_t pid : {999999999, -1, -2147483647 - 1}) {
        zvt::clear_trace();
        zvt::LogCapture log;
        zv_proc_stat st = junk();
        EXPECT_STATUS(ZV_ERR_OPEN_FAILED, zv_util_proc_stat(&st, pid)) << pid;
        EXPECT_TRUE(all_zero(st));
        EXPECT_FRAMES({"zv_util_proc_stat", ZV_ERR_OPEN_FAILED});
        EXPECT_TRUE(zvt::LogIs(log, {}));
    }
    zv_proc_stat st = junk();
    EXPECT_STATUS(ZV_ERR_OPEN_FAILED, zv_util_proc_stat(&st, (dir_ + "/none").c_str()));
}

TEST(ProcStat, NullRecord)
{
    zvt::LogCapture log;
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_util_proc_stat(nullptr, 0));
    EXPECT_FRAMES({"zv_util_proc_stat", ZV_ERR_NULL_ARG});
    EXPECT_TRUE(zvt::LogIs(log, {{3, "ret_proc_stat is NULL"}}));
    EXPECT_EQ(log.lines().at(0).frames_before, 0u);
}

TEST(ProcStat, LiveProcesses)
{
    zv_proc_stat self;
    ASSERT_EQ(zv_util_proc_stat(&self, 0), ZV_OK);
    EXPECT_EQ(self.pid, getpid());
    // Under user-mode emulation this line is made up (state "0"): stay loose.
    EXPECT_NE(self.state, '\0');
    EXPECT_EQ(self.comm, 0u);

    // Another process's line comes straight from the kernel.
    pid_t child = zvt::start_sleeper("zvt stat (child)");
    ASSERT_GT(child, 0);
    zv_proc_stat st;
    ASSERT_EQ(zv_util_proc_stat(&st, child), ZV_OK);
    EXPECT_EQ(st.pid, child);
    EXPECT_EQ(st.ppid, getpid());
    EXPECT_GT(st.num_threads, 0u);
    zvt::stop_child(child);
    EXPECT_NO_FRAMES();
}

TEST(Tid, MainThreadAndAnother)
{
    EXPECT_EQ(zv_util_tid(), getpid());
    int32_t other = 0;
    std::thread([&] { other = zv_util_tid(); }).join();
    EXPECT_NE(other, getpid());
    EXPECT_GT(other, 0);
}

}  // namespace
