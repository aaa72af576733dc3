// Spawning programs and waiting for them.
#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <string>
#include <sys/wait.h>
#include <vector>

#include "support/fault.h"
#include "support/process_support.h"
#include "support/trace.h"
#include <zvutil/process.h>

namespace {

// argv/envp arrays built from string literals.
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

TEST(Spawn, ExitCodes)
{
    struct Row {
        Args argv;
        int32_t code;
    } rows[] = {
        {{"/bin/true"}, 0},
        {{"/bin/false"}, 1},
        {{"/bin/sh", "-c", "exit 255"}, 255},
        {{"/bin/sh", "-c", "kill -9 $$"}, -1},
        {{"/nonexistent/program"}, 1},  // execve fails in the child
        {{"true"}, 1},                  // no PATH search
    };
    for (Row &row : rows) {
        zv_proc_handle *handle = nullptr;
        ASSERT_EQ(zv_spawn(row.argv.get(), no_env.get(), &handle), ZV_OK);
        ASSERT_NE(handle, nullptr);
        int32_t code = 12345;
        EXPECT_EQ(zv_wait(&handle, &code), ZV_OK);
        EXPECT_EQ(handle, nullptr);
        EXPECT_EQ(code, row.code) << row.argv.items[0];

        code = 12345;
        EXPECT_EQ(zv_spawn_and_wait(row.argv.get(), no_env.get(), &code), ZV_OK);
        EXPECT_EQ(code, row.code) << row.argv.items[0];
    }
    EXPECT_NO_FRAMES();
}

TEST(Spawn, EnvironmentIsExactlyTheOneGiven)
{
    Args argv{"/bin/sh", "-c", "test \"$ZVT_A\" = one && test -z \"${HOME+set}\""};
    Args env{"ZVT_A=one"};
    int32_t code = -2;
    EXPECT_EQ(zv_spawn_and_wait(argv.get(), env.get(), &code), ZV_OK);
    EXPECT_EQ(code, 0);
}

TEST(Spawn, FailedExecWritesNoBufferedOutputTwice)
{
    FILE *stream = std::tmpfile();
    ASSERT_NE(stream, nullptr);
    static char buffer[BUFSIZ];
    std::setvbuf(stream, buffer, _IOFBF, sizeof buffer);
    std::fputs("once", stream);
    Args argv{"/nonexistent/program"};
    int32_t code = 0;
    EXPECT_EQ(zv_spawn_and_wait(argv.get(), no_env.get(), &code), ZV_OK);
    EXPECT_EQ(code, 1);
    std::fflush(stream);
    std::rewind(stream);
    char content[32] = {};
    std::fread(content, 1, sizeof content - 1, stream);
    std::fclose(stream);
    EXPECT_STREQ(content, "once");
}

TEST(Wait, NullHandleAndSecondWait)
{
    int32_t code = 7;
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_wait(nullptr, &code));
    zv_proc_handle *handle = nullptr;
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_wait(&handle, &code));
    EXPECT_EQ(code, 7);
    EXPECT_FRAMES({"zv_wait", ZV_ERR_NULL_ARG}, {"zv_wait", ZV_ERR_NULL_ARG});

    zvt::clear_trace();
    Args argv{"/bin/true"};
    ASSERT_EQ(zv_spawn(argv.get(), no_env.get(), &handle), ZV_OK);
    ASSERT_EQ(zv_wait(&handle, &code), ZV_OK);
    EXPECT_STATUS(ZV_ERR_NULL_ARG, zv_wait(&handle, &code));
    EXPECT_FRAMES({"zv_wait", ZV_ERR_NULL_ARG});
}

TEST(Wait, FailedWaitKeepsTheHandleLive)
{
    Args argv{"/bin/true"};
    zv_proc_handle *handle = nullptr;
    ASSERT_EQ(zv_spawn(argv.get(), no_env.get(), &handle), ZV_OK);
    zv_proc_handle *live = handle;
    int32_t code = 7;
    zv_status status = zvt::with_fault("waitpid", 1, EINTR, [&] { return zv_wait(&handle, &code); });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(handle, live);
    EXPECT_EQ(code, 7);
    EXPECT_FRAMES({"zv_wait", ZV_ERR_SYSTEM});
    // The caller may simply wait again.
    EXPECT_EQ(zv_wait(&handle, &code), ZV_OK);
    EXPECT_EQ(code, 0);
}

TEST(Wait, ChildrenReapedByTheKernelWhenSigchldIsIgnored)
{
    EXPECT_IN_CHILD([] {
        ASSERT_EQ(zv_util_ignore_common_signals(), ZV_OK);
        Args argv{"/bin/true"};
        zv_proc_handle *handle = nullptr;
        ASSERT_EQ(zv_spawn(argv.get(), no_env.get(), &handle), ZV_OK);
        int32_t code = 7;
        EXPECT_STATUS(ZV_ERR_SYSTEM, zv_wait(&handle, &code));
        EXPECT_NE(handle, nullptr);
        EXPECT_EQ(code, 7);
        EXPECT_FRAMES({"zv_wait", ZV_ERR_SYSTEM});
        zv_free_proc_handle(&handle);
    });
}

TEST(Spawn, ForkFailure)
{
    Args argv{"/bin/true"};
    zv_proc_handle *handle = reinterpret_cast<zv_proc_handle *>(1);
    size_t heap = zvt::heap_in_use();
    zv_status status = zvt::with_fault("fork", 1, EAGAIN,
                                       [&] { return zv_spawn(argv.get(), no_env.get(), &handle); });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(handle, nullptr);
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_FRAMES({"zv_spawn", ZV_ERR_SYSTEM});

    zvt::clear_trace();
    int32_t code = 7;
    status = zvt::with_fault("fork", 1, EAGAIN,
                             [&] { return zv_spawn_and_wait(argv.get(), no_env.get(), &code); });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(code, 7);
    EXPECT_FRAMES({"zv_spawn", ZV_ERR_SYSTEM}, {"zv_spawn_and_wait", ZV_ERR_SYSTEM});
}

TEST(Spawn, AllocationFailure)
{
    Args argv{"/bin/true"};
    int32_t code = 7;
    zvt::sweep_allocations(
        [&] {
            code = 7;
            return zv_spawn_and_wait(argv.get(), no_env.get(), &code) == ZV_OK && code == 0;
        },
        [&](unsigned) {
            EXPECT_EQ(code, 7);
            EXPECT_FRAMES({"zv_spawn", ZV_ERR_NO_MEMORY},
                          {"zv_spawn_and_wait", ZV_ERR_NO_MEMORY});
        });

    zvt::clear_trace();
    zv_proc_handle *handle = reinterpret_cast<zv_proc_handle *>(1);
    zv_status status = zvt::with_fault("alloc", 1, ENOMEM,
                                       [&] { return zv_spawn(argv.get(), no_env.get(), &handle); });
    EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
    EXPECT_EQ(handle, nullptr);
    EXPECT_FRAMES({"zv_spawn", ZV_ERR_NO_MEMORY});
}

TEST(Spawn, FailedWaitInsideSpawnAndWaitReleasesTheHandle)
{
    Args argv{"/bin/true"};
    int32_t code = 7;
    size_t heap = zvt::heap_in_use();
    zv_status status = zvt::with_fault(
        "waitpid", 1, EINTR, [&] { return zv_spawn_and_wait(argv.get(), no_env.get(), &code); });
    EXPECT_STATUS(ZV_ERR_SYSTEM, status);
    EXPECT_EQ(code, 7);
    EXPECT_EQ(zvt::heap_in_use(), heap);
    EXPECT_FRAMES({"zv_wait", ZV_ERR_SYSTEM});
    int child_status;
    EXPECT_GT(waitpid(-1, &child_status, 0), 0) << "the child is left for the caller to reap";
}

TEST(FreeProcHandle, LeavesTheChildAlone)
{
    zv_free_proc_handle(nullptr);
    zv_proc_handle *handle = nullptr;
    zv_free_proc_handle(&handle);
    EXPECT_EQ(handle, nullptr);

    Args argv{"/bin/sleep", "30"};
    ASSERT_EQ(zv_spawn(argv.get(), no_env.get(), &handle), ZV_OK);
    pid_t pid = handle->pid;
    zv_free_proc_handle(&handle);
    EXPECT_EQ(handle, nullptr);
    int child_status;
    EXPECT_EQ(waitpid(pid, &child_status, WNOHANG), 0) << "still running";
    zvt::stop_child(pid);
    EXPECT_NO_FRAMES();
}

TEST(Sleep, ZeroReturnsAtOnce)
{
    EXPECT_EQ(zv_util_sleep(0), 0u);
}

}  // namespace
