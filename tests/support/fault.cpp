// Fault points, the wrappers that serve them, and the heap and descriptor counts.
#include "support/zvt.h"

#include <cstdarg>
#include <cwchar>
#include <dirent.h>
#include <malloc.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/time.h>

#if __has_include(<valgrind/valgrind.h>)
#include <valgrind/valgrind.h>
#else
#define RUNNING_ON_VALGRIND 0
#endif
#if defined(__SANITIZE_ADDRESS__)
extern "C" size_t __sanitizer_get_current_allocated_bytes(void);
#endif
// The names of the points the wrappers serve, gathered by the linker (see HIT).
extern "C" const char *const __start_zvt_points[], *const __stop_zvt_points[];

namespace zvt {
namespace {

struct Rule {
    const char *point;
    unsigned nth, extra, calls;
    int err;
} rules[8];
unsigned rule_count;
char inheritable[256];
std::optional<timespec> pinned;

bool known(const char *point)
{
    for (const char *const *name = __start_zvt_points; name != __stop_zvt_points; name++)
        if (std::strcmp(*name, point) == 0)
            return true;
    if (std::strcmp(point, kNoFault) != 0)
        ADD_FAILURE() << "no wrapper serves the fault point \"" << point << "\"";
    return false;
}

}  // namespace

void fault_arm(const char *point, unsigned nth, int err, unsigned count)
{
    EXPECT_LT(rule_count, std::size(rules)) << "too many points armed";
    if (known(point) && rule_count < std::size(rules))
        rules[rule_count++] = Rule{point, nth, count, 0, err};
}

void fault_clear() { rule_count = 0; }

bool fault_hit(const char *point)
{
    for (Rule *r = rules; r != rules + rule_count; r++)
        if (std::strcmp(r->point, point) == 0 && ++r->calls >= r->nth &&
            (r->extra == ~0u || r->calls - r->nth <= r->extra))
            return errno = r->err, true;
    return false;
}

void note_open(bool cloexec, const char *what)
{
    size_t used = std::strlen(inheritable);
    if (!cloexec)
        std::snprintf(inheritable + used, sizeof inheritable - used, "%s ", what);
}

std::string inheritable_opens() { return inheritable; }

void pin_clock(std::optional<timespec> now) { pinned = now; }

bool under_valgrind() { return RUNNING_ON_VALGRIND != 0; }

#if !defined(__SANITIZE_ADDRESS__)
constexpr const char *kNoCache = "glibc.malloc.tcache_count=0";
bool cache_off() { return under_valgrind() || strstr(getenv("GLIBC_TUNABLES") ?: "", kNoCache); }

// glibc counts a block parked in its per-thread cache as in use, so the leak
// checks need that cache off; it reads the setting at start-up only, so the
// program starts itself again with it. (valgrind's allocator keeps no cache,
// and a program started again would run outside valgrind.)
[[gnu::constructor]] void start_without_cache(int, char **argv, char **)
{
    if (cache_off())
        return;
    setenv("GLIBC_TUNABLES", kNoCache, 1);
    execv("/proc/self/exe", argv);
    std::perror("restarting with the allocator's cache off");
}
#endif

size_t heap_in_use()
{
#if defined(__SANITIZE_ADDRESS__)
    return __sanitizer_get_current_allocated_bytes();
#else
    EXPECT_TRUE(cache_off()) << "the leak checks need " << kNoCache;
    return mallinfo2().uordblks;
#endif
}

unsigned open_fd_count()
{
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
}

// Every test starts with an empty trace, no noted opens and no armed fault.
struct Reset : ::testing::EmptyTestEventListener {
    void OnTestStart(const ::testing::TestInfo &) override
    {
        fault_clear();
        inheritable[0] = '\0';
        zv_trace_clear();
    }
};
[[maybe_unused]] const bool reset_registered =
    (::testing::UnitTest::GetInstance()->listeners().Append(new Reset), true);

}  // namespace zvt

#define HIT ZVT_HIT

// __wrap_FN returns |fail| when |point| fires, and the value of |...| otherwise
// (which calls __real_FN, FN itself).
#define WRAP(fn, type, params, point, fail, ...) \
    type __real_##fn params;                     \
    type __wrap_##fn params { return HIT(point) ? fail : __VA_ARGS__; }

extern "C" {

// "alloc_huge" fails only a request of 2 GiB or more, as a system short of
// memory would.
WRAP(malloc, void *, (size_t a), "alloc", nullptr,
     a >> 31 && HIT("alloc_huge") ? nullptr : __real_malloc(a))
WRAP(calloc, void *, (size_t a, size_t b), "alloc", nullptr,
     a * b >> 31 && HIT("alloc_huge") ? nullptr : __real_calloc(a, b))
WRAP(aligned_alloc, void *, (size_t a, size_t b), "alloc", nullptr,
     b >> 31 && HIT("alloc_huge") ? nullptr : __real_aligned_alloc(a, b))
WRAP(strndup, char *, (const char *a, size_t b), "alloc", nullptr, __real_strndup(a, b))
// "read_idle" and "write_idle" make a call return 0 without moving a byte;
// "write_short" moves one byte at most.
WRAP(read, ssize_t, (int a, void *b, size_t c), "read", -1,
     HIT("read_idle") ? 0 : __real_read(a, b, c))
WRAP(write, ssize_t, (int a, const void *b, size_t c), "write", -1,
     HIT("write_idle") ? 0 : __real_write(a, b, HIT("write_short") && c > 1 ? 1 : c))
WRAP(fsync, int, (int a), "fsync", -1, __real_fsync(a))
WRAP(mmap, void *, (void *a, size_t b, int c, int d, int e, off_t f), "mmap", MAP_FAILED,
     __real_mmap(a, b, c, d, e, f))
WRAP(mprotect, int, (void *a, size_t b, int c), "mprotect", -1, __real_mprotect(a, b, c))
// "fstat_grown" reports a file 100 bytes larger than it is, as if it had
// shrunk since it was measured.
WRAP(fstat64, int, (int a, struct stat64 *b), "fstat", -1,
     __real_fstat64(a, b) != 0 ? -1 : HIT("fstat_grown") ? (b->st_size += 100, 0) : 0)
// A failed transfer sets the stream's error indicator, as glibc does;
// "fwrite_idle" writes nothing and sets nothing, "fwrite_short" one item at
// most; an armed "ferror" reports the indicator set; a failing fclose still
// releases the stream.
WRAP(fwrite, size_t, (const void *a, size_t b, size_t c, FILE *d), "fwrite",
     (d->_flags |= _IO_ERR_SEEN, 0),
     HIT("fwrite_idle") ? 0 : __real_fwrite(a, b, HIT("fwrite_short") && c > 1 ? 1 : c, d))
// "fread_short" reads one item at most.
WRAP(fread, size_t, (void *a, size_t b, size_t c, FILE *d), "fread_short",
     __real_fread(a, b, c > 1 ? 1 : c, d), __real_fread(a, b, c, d))
WRAP(fflush, int, (FILE *a), "fflush", EOF, __real_fflush(a))
WRAP(ferror, int, (FILE *a), "ferror", 1, __real_ferror(a))
WRAP(fclose, int, (FILE *a), "fclose",
     ([&, e = errno] { return __real_fclose(a), errno = e, EOF; }()), __real_fclose(a))
WRAP(scandir64, int,
     (const char *a, dirent64 ***b, int (*c)(const dirent64 *),
      int (*d)(const dirent64 **, const dirent64 **)),
     "scandir", -1, __real_scandir64(a, b, c, d))
WRAP(getgrnam_r, int, (const char *a, group *b, char *c, size_t d, group **e), "getgrnam_r",
     (*e = nullptr, errno), __real_getgrnam_r(a, b, c, d, e))
WRAP(setegid, int, (gid_t a), "setegid", -1, __real_setegid(a))
WRAP(sysconf, long, (int a), "sysconf", -1, __real_sysconf(a))
WRAP(gethostname, int, (char *a, size_t b), "gethostname", -1, __real_gethostname(a, b))
WRAP(vsnprintf, int, (char *a, size_t b, const char *c, va_list d), "vsnprintf", -1,
     __real_vsnprintf(a, b, c, d))
// "mbsrtowcs_short" cuts a conversion into a buffer one wide character short,
// as a locale changed between measuring and converting would.
WRAP(mbsrtowcs, size_t, (wchar_t *a, const char **b, size_t c, mbstate_t *d), "mbsrtowcs",
     size_t(-1), __real_mbsrtowcs(a, b, c - (a != nullptr && c > 0 && HIT("mbsrtowcs_short")), d))
WRAP(sigaction, int, (int a, const struct sigaction *b, struct sigaction *c), "sigaction", -1,
     __real_sigaction(a, b, c))
WRAP(flock, int, (int a, int b), "flock", -1, __real_flock(a, b))
// While a clock is pinned, the wall-clock readings answer it.
WRAP(clock_gettime, int, (clockid_t a, timespec *b), "clock_gettime", -1,
     zvt::pinned && a == CLOCK_REALTIME ? (*b = *zvt::pinned, 0) : __real_clock_gettime(a, b))
WRAP(gettimeofday, int, (timeval *a, void *b), "gettimeofday", -1,
     zvt::pinned ? (*a = {zvt::pinned->tv_sec, zvt::pinned->tv_nsec / 1000}, 0)
                 : __real_gettimeofday(a, b))
WRAP(time, time_t, (time_t *a), "time", -1,
     !zvt::pinned ? __real_time(a) : a != nullptr ? *a = zvt::pinned->tv_sec : zvt::pinned->tv_sec)
WRAP(localtime_r, tm *, (const time_t *a, tm *b), "localtime_r", nullptr, __real_localtime_r(a, b))
WRAP(gmtime_r, tm *, (const time_t *a, tm *b), "gmtime_r", nullptr, __real_gmtime_r(a, b))
WRAP(asctime_r, char *, (const tm *a, char *b), "asctime_r", nullptr, __real_asctime_r(a, b))
// A failed ctime_r leaves 26 bytes without a terminator, the worst a caller could be handed.
WRAP(ctime_r, char *, (const time_t *a, char *b), "ctime_r",
     (std::memset(b, '#', 26), nullptr), __real_ctime_r(a, b))
// The open calls also note what they leave inheritable.
FILE *__real_fopen(const char *path, const char *mode);
FILE *__wrap_fopen(const char *path, const char *mode)
{
    zvt::note_open(std::strchr(mode, 'e') != nullptr, mode);
    return HIT("fopen") ? nullptr : __real_fopen(path, mode);
}

int __real_open(const char *path, int flags, ...);
int __wrap_open(const char *path, int flags, ...)
{
    va_list args;
    va_start(args, flags);
    mode_t mode = __OPEN_NEEDS_MODE(flags) ? va_arg(args, unsigned) : 0;
    va_end(args);
    zvt::note_open(flags & O_CLOEXEC, std::to_string(flags).c_str());
    return HIT("open") ? -1 : __real_open(path, flags, mode);
}

}  // extern "C"
