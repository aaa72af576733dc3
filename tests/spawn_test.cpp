// Spawning programs and waiting for them.
#include <gtest/gtest.h>

#include <cstdio>
#include <sys/wait.h>
#include <vector>

#include "support/process_support.h"
#include "support/scratch.h"
#include <zvutil/process.h>

namespace {

// A NULL-terminated argument or environment vector.
struct Args {
    std::vector<char *> items;
    Args(std::initializer_list<const char *> list)
    {
        for (const char *s : list)
            items.push_back(const_cast<char *>(s));
        items.push_back(nullptr);
    }
    char *const *get() { return items.data(); }
};

Args no_env{};
Args sh_true{"/bin/true"};

TEST(Spawn, ExitCodes)
{
    struct Row {
        Args argv;
        int32_t code;
    } rows[] = {
        {{"/bin/true"}, 0},
        {{"/bin/sh", "-c", "exit 255"}, 255},
        {{"/bin/sh", "-c", "kill -9 $$"}, -1},
        {{"/nonexistent/program"}, 1},  // execve fails in the child
        {{"true"}, 1},                  // no PATH search
        {{"/bin/sh", "-c", "test \"$A\" = 1 && test -z \"${HOME+set}\""}, 0},
    };
    Args env{"A=1"};
    for (Row &row : rows) {
        SCOPED_TRACE(::testing::Message() << "row " << &row - rows);
        zv_proc_handle *handle = nullptr;
        ASSERT_EQ(zv_spawn(row.argv.get(), env.get(), &handle), ZV_OK);
        int32_t code = 12345;
        EXPECT_EQ(zv_wait(&handle, &code), ZV_OK);
        EXPECT_EQ(handle, nullptr);
        EXPECT_EQ(code, row.code);
        code = 12345;
        EXPECT_EQ(zv_spawn_and_wait(row.argv.get(), env.get(), &code), ZV_OK);
        EXPECT_EQ(code, row.code);
    }
    EXPECT_NO_FRAMES();
}

// The child of a failed execve must not flush the caller's stdio buffers.
TEST(Spawn, FailedExecWritesNoBufferedOutputTwice)
{
    FILE *stream = std::tmpfile();
    ASSERT_NE(stream, nullptr);
    std::fputs("once", stream);
    Args missing{"/nonexistent/program"};
    int32_t code = 0;
    EXPECT_EQ(zv_spawn_and_wait(missing.get(), no_env.get(), &code), ZV_OK);
    std::rewind(stream);
    char content[16] = {};
    std::fread(content, 1, sizeof content - 1, stream);
    std::fclose(stream);
    EXPECT_STREQ(content, "once");
}

TEST(Spawn, Failures)
{
    zv_proc_handle *handle = nullptr;
    int32_t code = 7;
    auto spawn = [&] {
        zv_status status = zv_spawn(sh_true.get(), no_env.get(), &handle);
        EXPECT_EQ(handle, nullptr);
        return status;
    };
    auto spawn_and_wait = [&] { return zv_spawn_and_wait(sh_true.get(), no_env.get(), &code); };
    // The first wait fails (the handle stays live), a second one reaps.
    auto wait_twice = [&] {
        EXPECT_EQ(zv_spawn(sh_true.get(), no_env.get(), &handle), ZV_OK);
        zv_proc_handle *live = handle;
        zv_status status = zv_wait(&handle, &code);
        EXPECT_EQ(handle, live);
        int32_t second = 7;
        EXPECT_EQ(zv_wait(&handle, &second), ZV_OK);
        return status;
    };
    zvt::expect_failures({
        {"zv_spawn", ZV_ERR_NO_MEMORY, spawn, "alloc"},
        {"zv_spawn", ZV_ERR_SYSTEM, spawn, "fork"},
        {"zv_spawn,zv_spawn_and_wait", ZV_ERR_NO_MEMORY, spawn_and_wait, "alloc"},
        {"zv_spawn,zv_spawn_and_wait", ZV_ERR_SYSTEM, spawn_and_wait, "fork"},
        {"zv_wait", ZV_ERR_NULL_ARG, ZVT_CALL(zv_wait(nullptr, &code))},
        {"zv_wait", ZV_ERR_NULL_ARG, ZVT_CALL(zv_wait(&handle, &code))},
        {"zv_wait", ZV_ERR_SYSTEM, wait_twice, "waitpid"},
        // The handle is released (no heap left); the child is reaped here.
        {"zv_wait", ZV_ERR_SYSTEM, [&] {
             zv_status status = spawn_and_wait();
             EXPECT_GT(waitpid(-1, nullptr, 0), 0);
             return status;
         }, "waitpid"},
    });
    EXPECT_EQ(code, 7) << "no failure writes the exit code";
}

TEST(FreeProcHandle, LeavesTheChildRunning)
{
    zv_free_proc_handle(nullptr);
    zv_proc_handle *handle = nullptr;
    zv_free_proc_handle(&handle);
    Args sleeper{"/bin/sleep", "30"};
    ASSERT_EQ(zv_spawn(sleeper.get(), no_env.get(), &handle), ZV_OK);
    pid_t pid = handle->pid;
    zv_free_proc_handle(&handle);
    EXPECT_EQ(handle, nullptr);
    EXPECT_EQ(waitpid(pid, nullptr, WNOHANG), 0) << "still running";
    zvt::stop_child(pid);
    EXPECT_EQ(zv_util_sleep(0), 0u);
}

}  // namespace
