// Clock and calendar calls, and a pinned clock for exact readings.
#include <cstring>
#include <ctime>
#include <sys/time.h>

#include "support/fault.h"
#include "support/wrap_time.h"

namespace {
std::optional<timespec> pinned;
}

void zvt::pin_clock(std::optional<timespec> now) { pinned = now; }

extern "C" {

int __real_clock_gettime(clockid_t clock, timespec *now);
int __real_gettimeofday(timeval *now, void *zone);
time_t __real_time(time_t *now);
tm *__real_localtime_r(const time_t *when, tm *out);
tm *__real_gmtime_r(const time_t *when, tm *out);
char *__real_asctime_r(const tm *when, char *text);
char *__real_ctime_r(const time_t *when, char *text);

int __wrap_clock_gettime(clockid_t clock, timespec *now)
{
    if (zvt::fault_hit("clock_gettime"))
        return -1;
    if (!pinned || clock != CLOCK_REALTIME)
        return __real_clock_gettime(clock, now);
    *now = *pinned;
    return 0;
}

int __wrap_gettimeofday(timeval *now, void *zone)
{
    if (zvt::fault_hit("gettimeofday"))
        return -1;
    if (!pinned)
        return __real_gettimeofday(now, zone);
    *now = timeval{pinned->tv_sec, pinned->tv_nsec / 1000};
    return 0;
}

time_t __wrap_time(time_t *now)
{
    if (zvt::fault_hit("time"))
        return -1;
    if (!pinned)
        return __real_time(now);
    if (now != nullptr)
        *now = pinned->tv_sec;
    return pinned->tv_sec;
}

tm *__wrap_localtime_r(const time_t *when, tm *out)
{
    return zvt::fault_hit("localtime_r") ? nullptr : __real_localtime_r(when, out);
}

tm *__wrap_gmtime_r(const time_t *when, tm *out)
{
    return zvt::fault_hit("gmtime_r") ? nullptr : __real_gmtime_r(when, out);
}

char *__wrap_asctime_r(const tm *when, char *text)
{
    return zvt::fault_hit("asctime_r") ? nullptr : __real_asctime_r(when, text);
}

// A failed conversion here leaves 26 bytes without a terminator, the worst a
// caller could be handed.
char *__wrap_ctime_r(const time_t *when, char *text)
{
    if (!zvt::fault_hit("ctime_r"))
        return __real_ctime_r(when, text);
    std::memset(text, '#', 26);
    return nullptr;
}

}  // extern "C"
