// Fault injection: the test executable links the library's archive with
// -Wl,--wrap=NAME for every function support/*.cpp wraps, so calls to it
// (the test's own included) pass through a wrapper that fails with the armed
// errno when its point fires. Points are named after the function ("alloc"
// for every allocation); a name no wrapper serves fails the test. Arming
// covers every caller, so arm right before the call under test and clear
// right after it (with_fault does both).
#pragma once

#include <ctime>
#include <functional>
#include <optional>
#include <string>
#include <utility>

#include <zvutil/status.h>

namespace zvt {

// The point name that arms nothing.
inline constexpr const char *kNoFault = "none";

// The |nth| call (1-based, counted from now) at |point| fails with |err|;
// |count| further calls fail after it (0: only that one; ~0u: all later ones).
void fault_arm(const char *point, unsigned nth, int err, unsigned count = 0);
void fault_clear();
// Calls seen at |point| since it was armed.
unsigned fault_calls(const char *point);

template <class F>
auto with_fault(const char *point, unsigned nth, int err, F &&call)
{
    fault_arm(point, nth, err);
    auto result = std::forward<F>(call)();
    fault_clear();
    return result;
}

// For wrappers: true when this call must fail; errno is then already set.
// Wrappers name their points through ZVT_HIT, which also places the name in
// a linker section, so fault_arm accepts exactly the names some wrapper serves.
bool fault_hit(const char *point);
#define ZVT_HIT(point)                                                                    \
    [] {                                                                                  \
        [[gnu::used, gnu::section("zvt_points")]] static const char *const name = point; \
        return ::zvt::fault_hit(name);                                                    \
    }()

// The open flags or fopen modes of the open and fopen calls since the test
// began that a child could inherit (no O_CLOEXEC, no "e"), each and a space.
std::string inheritable_opens();

// While set, CLOCK_REALTIME, gettimeofday and time all read |now|.
void pin_clock(std::optional<timespec> now);

// Bytes of heap in use (glibc's count, or the sanitizer allocator's).
size_t heap_in_use();
// Open descriptors of this process.
unsigned open_fd_count();

}  // namespace zvt
