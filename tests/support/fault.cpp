#include "support/fault.h"

#include <gtest/gtest.h>
#include <zverrortrace.h>

#include <cerrno>
#include <cstring>
#include <dirent.h>
#include <malloc.h>
#include <string>
#include <unistd.h>
#include <vector>

#if defined(__SANITIZE_ADDRESS__)
extern "C" size_t __sanitizer_get_current_allocated_bytes(void);
#endif

namespace zvt {
namespace {

struct Rule {
    const char *point;
    unsigned nth;
    unsigned extra;
    int err;
    unsigned calls;
};

constexpr unsigned kMaxRules = 8;
Rule rules[kMaxRules];
unsigned rule_count;
bool fired;

#if !defined(__SANITIZE_ADDRESS__)
// glibc's count of heap in use includes blocks parked in the per-thread cache,
// so a freed block would look leaked. Run the tests with that cache off:
// the tunable is read at start-up, hence the re-exec.
constexpr char kTunables[] = "glibc.malloc.tcache_count=0";

[[maybe_unused]] const bool tcache_off = [] {
    const char *current = getenv("GLIBC_TUNABLES");
    if (current != nullptr && std::strstr(current, kTunables) != nullptr)
        return true;
    FILE *cmdline = fopen("/proc/self/cmdline", "r");
    if (cmdline == nullptr)
        return false;
    std::string all;
    char chunk[4096];
    size_t n;
    while ((n = fread(chunk, 1, sizeof chunk, cmdline)) > 0)
        all.append(chunk, n);
    fclose(cmdline);
    std::vector<char *> argv;
    for (size_t at = 0; at < all.size(); at += std::strlen(&all[at]) + 1)
        argv.push_back(&all[at]);
    argv.push_back(nullptr);
    setenv("GLIBC_TUNABLES", kTunables, 1);
    execv("/proc/self/exe", argv.data());
    return false;
}();
#endif

}  // namespace

void fault_arm(const char *point, unsigned nth, int err, unsigned count)
{
    if (rule_count == kMaxRules)
        std::abort();
    rules[rule_count++] = Rule{point, nth, count, err, 0};
    fired = false;
}

void fault_clear()
{
    rule_count = 0;
}

bool fault_fired() { return fired; }

unsigned fault_calls(const char *point)
{
    for (unsigned i = 0; i < rule_count; i++)
        if (std::strcmp(rules[i].point, point) == 0)
            return rules[i].calls;
    return 0;
}

bool fault_hit(const char *point)
{
    for (unsigned i = 0; i < rule_count; i++) {
        Rule &r = rules[i];
        if (std::strcmp(r.point, point) != 0)
            continue;
        unsigned call = ++r.calls;
        if (call >= r.nth && (r.extra == ~0u || call - r.nth <= r.extra)) {
            fired = true;
            errno = r.err;
            return true;
        }
    }
    return false;
}

size_t heap_in_use()
{
#if defined(__SANITIZE_ADDRESS__)
    return __sanitizer_get_current_allocated_bytes();
#else
    return mallinfo2().uordblks;
#endif
}

unsigned open_fd_count()
{
    unsigned n = 0;
    DIR *dir = opendir("/proc/self/fd");
    if (dir == nullptr)
        return 0;
    while (readdir(dir) != nullptr)
        n++;
    closedir(dir);
    return n;
}

void sweep_allocations(const std::function<bool()> &call,
                       const std::function<void(unsigned nth)> &check_failure)
{
    // A first plain run settles one-time allocations and must succeed.
    ASSERT_TRUE(call()) << "the call fails without any injected fault";
    for (unsigned nth = 1; nth < 10000; nth++) {
        zv_trace_clear();
        size_t heap_before = heap_in_use();
        unsigned fds_before = open_fd_count();
        fault_arm("alloc", nth, ENOMEM);
        bool ok = call();
        bool hit = fault_fired();
        fault_clear();
        if (!hit) {
            EXPECT_TRUE(ok) << "succeeded after " << nth - 1 << " allocation failures";
            EXPECT_GT(nth, 1u) << "the call made no allocation";
            return;
        }
        EXPECT_FALSE(ok) << "allocation " << nth << " failed, yet the call reported success";
        EXPECT_EQ(heap_before, heap_in_use()) << "heap leaked when allocation " << nth << " failed";
        EXPECT_EQ(fds_before, open_fd_count()) << "descriptor leaked at allocation " << nth;
        check_failure(nth);
        if (::testing::Test::HasFailure())
            return;
    }
    FAIL() << "the call never stopped allocating";
}

}  // namespace zvt
