// Scratch directories, small file helpers and forked children for the file,
// directory and group tests.
#pragma once

#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <grp.h>
#include <sstream>
#include <string>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

namespace zvt {

// The unprivileged user and group the permission cases run as.
inline constexpr uid_t kNobody = 65534;
inline constexpr gid_t kNogroup = 65534;

// A fresh directory under /tmp, removed with its content on destruction. It
// is handed to the unprivileged user so a dropped child can work in it.
class ScratchDir {
public:
    ScratchDir()
    {
        char pattern[] = "/tmp/zvutil-test-XXXXXX";
        char *made = mkdtemp(pattern);
        if (made == nullptr)
            std::abort();
        path_ = made;
        if (chown(made, kNobody, kNogroup) != 0 && geteuid() == 0)
            std::abort();
    }
    ~ScratchDir()
    {
        std::error_code ignored;
        std::filesystem::permissions(path_, std::filesystem::perms::owner_all, ignored);
        for (auto &entry : std::filesystem::recursive_directory_iterator(path_, ignored))
            if (entry.is_directory(ignored))
                std::filesystem::permissions(entry.path(), std::filesystem::perms::owner_all,
                                             ignored);
        std::filesystem::remove_all(path_, ignored);
    }
    ScratchDir(const ScratchDir &) = delete;
    ScratchDir &operator=(const ScratchDir &) = delete;

    const std::string &path() const { return path_; }
    std::string operator/(const std::string &name) const { return path_ + "/" + name; }

private:
    std::string path_;
};

inline void put_file(const std::string &path, const std::string &content)
{
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out << content;
}

inline std::string get_file(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    std::ostringstream all;
    all << in.rdbuf();
    return all.str();
}

// Runs |body| in a forked child; its gtest failures print there and fail the
// test here through the exit status.
inline void in_child(const std::function<void()> &body)
{
    std::fflush(nullptr);
    pid_t pid = fork();
    ASSERT_NE(pid, -1);
    if (pid == 0) {
        body();
        std::fflush(nullptr);
        _exit(::testing::Test::HasFailure() ? 1 : 0);
    }
    int status = 0;
    ASSERT_EQ(waitpid(pid, &status, 0), pid);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << "child status " << status;
}

// In a child: become the unprivileged user, group nogroup only.
inline void drop_privileges()
{
    ASSERT_EQ(setgroups(0, nullptr), 0);
    ASSERT_EQ(setgid(kNogroup), 0);
    ASSERT_EQ(setuid(kNobody), 0);
}

}  // namespace zvt
