// Claiming a PID file.
#include <gtest/gtest.h>

#include <fcntl.h>
#include <string>
#include <sys/file.h>
#include <sys/stat.h>
#include <vector>

#include "process/process_internal.h"
#include "support/process_support.h"
#include "support/scratch.h"
#include <zvutil/process.h>

namespace {

const std::string kSelf = std::to_string(getpid());

class PidFile : public ::testing::Test {
protected:
    zv_status claim(const char *name, uint32_t *owner = nullptr)
    {
        return zv_util_claim_pid_file(path_.c_str(), name, owner ? owner : &owner_);
    }
    zvt::ScratchDir dir_;
    std::string path_ = dir_ / "app.pid";
    uint32_t owner_ = 7;
};

TEST_F(PidFile, NewFileHoldsTheCallerIdAlone)
{
    for (mode_t mask : {mode_t{022}, mode_t{077}}) {
        zvt::in_child(false, [&] {
            umask(mask);
            ASSERT_EQ(claim("any"), ZV_OK);
            EXPECT_EQ(zvt::get_file(path_), std::to_string(getpid()));
            struct stat st;
            ASSERT_EQ(stat(path_.c_str(), &st), 0);
            EXPECT_EQ(st.st_mode & 07777, 0664 & ~mask);
            EXPECT_NO_FRAMES();
        });
        unlink(path_.c_str());
    }
    EXPECT_EQ(owner_, 7u);
}

TEST_F(PidFile, StaleContentIsTakenOver)
{
    pid_t other = zvt::start_sleeper("zvt-other");
    pid_t zombie = fork();
    if (zombie == 0)
        _exit(0);
    siginfo_t info = {};
    waitid(P_PID, zombie, &info, WEXITED | WNOWAIT);
    struct Row {
        std::string content;
        std::string name;
    } rows[] = {
        {"", std::string(150, 'n')},  // emptiness is decided before the name is checked
        {"999999999", ""},             // no such process
        {std::to_string(other), "zvt-other-and-more"},
        {std::to_string(zombie), ""},  // an empty command line
        // Not 1 to 10 digits: never looked up, though an empty name matches
        // any live process.
        {"self", ""},
        {"../1", ""},
        {kSelf + "\n", ""},
        {" " + kSelf, ""},
        {kSelf + std::string(1, '\0'), ""},
        {"0000000000" + kSelf, ""},
        {"4294967296", ""},
    };
    for (const Row &row : rows) {
        zvt::clear_trace();
        zvt::put_file(path_, row.content);
        EXPECT_EQ(claim(row.name.c_str()), ZV_OK) << "content '" << row.content << "'";
        EXPECT_EQ(zvt::get_file(path_), kSelf);
        EXPECT_NO_FRAMES();
    }
    EXPECT_EQ(owner_, 7u);
    zvt::stop_child(other);
    waitpid(zombie, nullptr, 0);
}

TEST_F(PidFile, LiveHolderKeepsTheFileUntilItEnds)
{
    std::string program = "zvt-holder-" + kSelf;
    pid_t holder = zvt::start_sleeper(program);
    std::string holder_text = std::to_string(holder);
    zvt::put_file(path_, holder_text);
    // The name need only begin the holder's command line.
    for (const std::string &name : {program, std::string("zvt-holder"), std::string()}) {
        zvt::clear_trace();
        uint32_t owner = 7;
        EXPECT_STATUS(ZV_ERR_IN_USE, claim(name.c_str(), &owner)) << name;
        EXPECT_EQ(owner, static_cast<uint32_t>(holder));
        EXPECT_EQ(zvt::get_file(path_), holder_text);
        EXPECT_FRAMES({"zv_util_claim_pid_file", ZV_ERR_IN_USE});
    }
    zvt::stop_child(holder);
    zvt::clear_trace();
    EXPECT_EQ(claim(program.c_str()), ZV_OK);
    EXPECT_EQ(zvt::get_file(path_), kSelf);
    EXPECT_NO_FRAMES();

    // The caller's own ID under its own program name.
    uint32_t owner = 7;
    EXPECT_STATUS(ZV_ERR_IN_USE, claim(zvt::cmdline_of(getpid()).c_str(), &owner));
    EXPECT_EQ(owner, static_cast<uint32_t>(getpid()));
}

TEST_F(PidFile, Failures)
{
    std::string holder_name = "zvt-holder-" + kSelf;
    pid_t holder = zvt::start_sleeper(holder_name);
    std::string holder_text = std::to_string(holder);
    const char *name = holder_name.c_str();
    auto claim_held = [&] {
        zvt::put_file(path_, holder_text);
        return claim(name);
    };
    auto claim_stale = [&] {
        zvt::put_file(path_, "999999999");
        return claim(name);
    };
    // Faults count the calls of the claim: open 1 creates, 2 reopens, 3 sizes
    // the file, 4 opens the holder's command line; fopen 1 reads the file,
    // 2 rewrites it; allocation 1 is the content, 2 the /proc path, 3 the
    // command line.
    std::string missing = dir_ / "none/app.pid";
    std::string cannot_access = "Cannot access pid file " + missing + " (No such file or directory)";
    zvt::expect_failures({
        {"zv_util_claim_pid_file", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_claim_pid_file(nullptr, "n", &owner_))},
        {"zv_util_claim_pid_file", ZV_ERR_NULL_ARG, ZVT_CALL(claim(nullptr))},
        {"zv_util_claim_pid_file", ZV_ERR_NULL_ARG, ZVT_CALL(zv_util_claim_pid_file(path_.c_str(), "n", nullptr))},
        {"zv_util_claim_pid_file", ZV_ERR_SYSTEM,
         ZVT_CALL(zv_util_claim_pid_file(missing.c_str(), name, &owner_)), nullptr, 1,
         zvt::kUntouched, cannot_access},
        {"zv_util_read_named_file,zv_util_claim_pid_file", ZV_ERR_SYSTEM, claim_held, "fopen", 1},
        {"zv_util_read_named_file,zv_util_claim_pid_file", ZV_ERR_NO_MEMORY, claim_held, "alloc", 1},
        {"zv_util_vasprintf,map_pid_to_exe,map_pid_to_exe,zv_util_claim_pid_file",
         ZV_ERR_NO_MEMORY, claim_held, "alloc", 2},
        {"map_pid_to_exe,zv_util_claim_pid_file", ZV_ERR_NO_MEMORY, claim_held, "alloc", 3},
        {"map_pid_to_exe,zv_util_claim_pid_file", ZV_ERR_SYSTEM, claim_held, "open", 4},
        {"zv_util_claim_pid_file", ZV_ERR_BAD_VALUE,
         ZVT_CALL(claim(std::string(101, 'n').c_str()))},
    });
    EXPECT_EQ(zvt::get_file(path_), holder_text) << "a refused claim changes nothing";
    // A failed rewrite is reported, not taken for a claim.
    zvt::expect_failures({
        {"write_pid_file", ZV_ERR_SYSTEM, claim_stale, "fopen", 2},
        {"write_pid_file", ZV_ERR_SYSTEM, claim_stale, "fwrite", 1},
        {"write_pid_file", ZV_ERR_SYSTEM, claim_stale, "fflush", 1},
        {"write_pid_file", ZV_ERR_SYSTEM, claim_stale, "fclose", 2},
        {"zv_util_claim_pid_file", ZV_ERR_SYSTEM, [&] {
             unlink(path_.c_str());
             return claim(name);
         }, "flock", 1, zvt::kUntouched, "Failed to lock PID file"},
    });
    EXPECT_EQ(owner_, 7u);
    zvt::stop_child(holder);
}

TEST_F(PidFile, LockHeldByAnotherClaimer)
{
    zvt::put_file(path_, "1");
    int fd = open(path_.c_str(), O_RDWR);
    ASSERT_EQ(flock(fd, LOCK_EX), 0);
    zvt::expect_failures({{"zv_util_claim_pid_file", ZV_ERR_SYSTEM, ZVT_CALL(claim("")), nullptr,
                           1, zvt::kUntouched, "Failed to lock PID file"}});
    EXPECT_EQ(zvt::get_file(path_), "1");
    close(fd);
    // The claim gives its own lock back.
    EXPECT_STATUS(ZV_ERR_IN_USE, claim(""));
    fd = open(path_.c_str(), O_RDWR);
    EXPECT_EQ(flock(fd, LOCK_EX | LOCK_NB), 0);
    close(fd);
}

TEST_F(PidFile, PermissionDenied)
{
    // A directory the unprivileged child may search but not write.
    std::string locked = dir_ / "locked";
    ASSERT_EQ(mkdir(locked.c_str(), 0755), 0);
    path_ = locked + "/app.pid";
    zvt::in_child(true, [&] {
        zvt::expect_failures({{"zv_util_claim_pid_file", ZV_ERR_ACCESS, ZVT_CALL(claim("n"))}});
    });
    zvt::put_file(path_, "1");
    zvt::in_child(true, [&] {
        zvt::expect_failures({{"zv_util_claim_pid_file", ZV_ERR_SYSTEM, ZVT_CALL(claim("n")),
                               nullptr, 1, zvt::kUntouched,
                               "Failed to open pid file " + path_ + " errno 13"}});
    });
    EXPECT_EQ(zvt::get_file(path_), "1");
    unlink(path_.c_str());
}

// Claimers of a new file that all stay alive until each has finished:
// exactly one may win, whatever the interleaving.
TEST_F(PidFile, RacingClaimersOfANewFile)
{
    constexpr int kClaimers = 4;
    for (int round = 0; round < 20 && !HasFailure(); round++) {
        unlink(path_.c_str());
        int start[2], report[2], hold[2];
        ASSERT_EQ(pipe(start) | pipe(report) | pipe(hold), 0);
        std::fflush(nullptr);
        for (int i = 0; i < kClaimers; i++) {
            if (fork() != 0)
                continue;
            zvt::LogCapture quiet;
            close(start[1]);
            close(hold[1]);
            char byte;
            [[maybe_unused]] ssize_t n = read(start[0], &byte, 1);
            uint32_t message[3] = {static_cast<uint32_t>(getpid()), 0, 0};
            message[1] = claim("", &message[2]);
            n = write(report[1], message, sizeof message);
            n = read(hold[0], &byte, 1);  // returns once the parent closes it
            _exit(0);
        }
        close(start[0]);
        close(report[1]);
        close(hold[0]);
        close(start[1]);  // go
        std::vector<uint32_t> winners, owners;
        for (int i = 0; i < kClaimers; i++) {
            uint32_t message[3] = {};
            EXPECT_EQ(read(report[0], message, sizeof message), ssize_t{sizeof message});
            if (message[1] == ZV_OK)
                winners.push_back(message[0]);
            else if (message[1] == ZV_ERR_IN_USE)
                owners.push_back(message[2]);
            else
                EXPECT_STATUS(ZV_ERR_SYSTEM, message[1]) << "only a held lock may refuse";
        }
        ASSERT_EQ(winners.size(), 1u) << "round " << round;
        EXPECT_EQ(zvt::get_file(path_), std::to_string(winners[0]));
        for (uint32_t owner : owners)
            EXPECT_EQ(owner, winners[0]);
        close(report[0]);
        close(hold[1]);
        while (wait(nullptr) > 0) {
        }
    }
}

}  // namespace
