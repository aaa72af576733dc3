// The thread ID and the /proc stat line parser.
#include <gtest/gtest.h>

#include <cctype>
#include <cstring>
#include <sys/prctl.h>
#include <string>
#include <thread>

#include "support/process_support.h"
#include "support/scratch.h"
#include "system/system_internal.h"
#include <zvutil/process.h>

namespace {

zv_proc_stat junk()
{
    zv_proc_stat record;
    std::memset(&record, 0x5a, sizeof record);
    return record;
}

bool all_zero(const zv_proc_stat &record)
{
    static const zv_proc_stat zero = {};
    return std::memcmp(&record, &zero, sizeof record) == 0;
}

TEST(ProcStat, FieldsAfterACommandNameWithBlanksAndParentheses)
{
    zvt::ScratchDir dir;
    // 52 fields as a current kernel prints them.
    zvt::put_file(dir / "stat",
                  "4242 (my (odd) ) name) S 1 4243 4244 34816 4245 4194560 1000 2000 3 4 500 "
                  "600 7 8 20 -5 1 0 5000000000 123456789 -1 18446744073709551615 94558123456512 4294967296 "
                  "3000 4000 5000 0 65536 4096 17 0 0 0 17 3 0 2 9000000000 10 11 12 13 14 15 "
                  "16 17 18 0\n");
    zv_proc_stat st = junk();
    ASSERT_EQ(zv_util_proc_stat(&st, (dir / "stat").c_str()), ZV_OK);
    EXPECT_EQ(st.pid, 4242);
    EXPECT_EQ(st.comm, 0u);
    EXPECT_EQ(st.state, 'S');
    EXPECT_EQ(st.ppid, 1);
    EXPECT_EQ(st.flags, 4194560u);
    EXPECT_EQ(static_cast<int32_t>(st.nice), -5) << "two's-complement pattern";
    EXPECT_EQ(st.starttime, 5000000000ull);
    EXPECT_EQ(st.vsize, 123456789u);
    EXPECT_EQ(st.rss, -1);
    EXPECT_EQ(st.rsslim, 4294967295u);
    // Beyond 32 bits a field saturates on both targets rather than keep its low bits.
    EXPECT_EQ(st.startcode, 4294967295u);
    EXPECT_EQ(st.endcode, 4294967295u);
    EXPECT_EQ(st.exit_signal, 17);
    EXPECT_EQ(st.policy, 2u);
    EXPECT_EQ(st.delayacct_blkio_ticks, 9000000000ull);
    EXPECT_NO_FRAMES();
}

TEST(ProcStat, Failures)
{
    zvt::ScratchDir dir;
    zvt::put_file(dir / "short", "1 (x) R 9\n");
    zvt::put_file(dir / "empty", "");
    zv_proc_stat st = junk();
    // Each row refills the record with junk first.
    auto stat_of = [&](auto where) {
        st = junk();
        return zv_util_proc_stat(&st, where);
    };
    auto path = [&](const char *name) { return (dir / name); };
    zvt::expect_failures({
        {"zv_util_proc_stat", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_proc_stat(nullptr, 0)), nullptr, 1,
         zvt::kUntouched, "ret_proc_stat is NULL"},
        {"zv_util_proc_stat", ZV_ERR_OPEN_FAILED, ZVT_CALL(stat_of(999999999))},
        {"zv_util_proc_stat", ZV_ERR_OPEN_FAILED, ZVT_CALL(stat_of(-1))},
        {"zv_util_proc_stat", ZV_ERR_OPEN_FAILED, ZVT_CALL(stat_of(path("none").c_str()))},
        {"zv_util_proc_stat", ZV_ERR_IO, ZVT_CALL(stat_of(path("empty").c_str())), nullptr, 1,
         zvt::kUntouched, "getline() failed: Success"},
        {"zv_util_proc_stat", ZV_ERR_IO, ZVT_CALL(stat_of(dir.path().c_str())), nullptr, 1,
         zvt::kUntouched, "getline() failed: Is a directory"},
    });
    EXPECT_TRUE(all_zero(st));

    // The fields before the missing one are filled.
    zvt::expect_failures({{"zv_util_proc_stat", ZV_ERR_SYSTEM,
                           ZVT_CALL(stat_of(path("short").c_str())), nullptr, 1, zvt::kUntouched,
                           "Parsing logic failed, j=11, len=11"}});
    EXPECT_EQ(st.pid, 1);
    EXPECT_EQ(st.state, 'R');
    EXPECT_EQ(st.ppid, 9);
    EXPECT_EQ(st.pgrp, 0);
}

TEST(ProcStat, LiveProcesses)
{
    zv_proc_stat self;
    ASSERT_EQ(zv_util_proc_stat(&self, 0), ZV_OK);
    EXPECT_EQ(self.pid, getpid());
    // Under user-mode emulation this line is made up (state "0"): stay loose.
    EXPECT_NE(self.state, '\0');

    // A command name with blanks and parentheses, as the kernel prints it.
    pid_t child = fork();
    if (child == 0) {
        prctl(PR_SET_NAME, "z (v) t x");
        pause();
        _exit(0);
    }
    std::string comm_path = "/proc/" + std::to_string(child) + "/comm";
    for (int i = 0; i < 5000 && zvt::get_file(comm_path) != "z (v) t x\n"; i++)
        usleep(1000);
    zv_proc_stat st;
    ASSERT_EQ(zv_util_proc_stat(&st, child), ZV_OK);
    EXPECT_EQ(st.pid, child);
    EXPECT_EQ(st.ppid, getpid());
    EXPECT_TRUE(std::isalpha(static_cast<unsigned char>(st.state)));
    EXPECT_EQ(st.pgrp, getpgrp());
    EXPECT_GE(st.num_threads, 1u);  // emulation adds a thread of its own
    zvt::stop_child(child);
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
