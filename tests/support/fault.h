// Fault injection: the test executable links the library's archive with
// -Wl,--wrap=NAME for every __wrap_NAME in support/wrap_*.cpp, so calls the
// library makes to those functions pass through here. A wrapper asks
// fault_hit() with its point name ("alloc" for every allocation function, the
// function's own name otherwise) and fails with the armed errno when told to.
//
// Arming covers every caller in the executable, the test's own code included,
// so arm right before the call under test and clear right after it
// (with_fault does both).
#pragma once

#include <functional>
#include <utility>

#include <zvutil/status.h>

namespace zvt {

// The |nth| call (1-based, counted from now) at |point| fails with |err|;
// |count| further calls fail after it (0: only that one; ~0u: all later ones).
void fault_arm(const char *point, unsigned nth, int err, unsigned count = 0);
void fault_clear();
// Whether an armed fault has fired since the last arm/clear.
bool fault_fired();
// Calls seen at |point| since it was armed.
unsigned fault_calls(const char *point);

// For wrappers: true when this call must fail; errno is then already set.
bool fault_hit(const char *point);

template <class F>
auto with_fault(const char *point, unsigned nth, int err, F &&call)
{
    fault_arm(point, nth, err);
    auto result = std::forward<F>(call)();
    fault_clear();
    return result;
}

// Bytes of heap in use (glibc's count, or the sanitizer allocator's).
size_t heap_in_use();
// Open descriptors of this process.
unsigned open_fd_count();

// Runs |call| once normally, then again with the 1st, 2nd, ... allocation
// failing, until a run meets no injected failure. |call| returns true on
// success and must release whatever a success handed out. After each failed
// run, |check_failure| sees the trace of that run (with the failing
// allocation's ordinal); the sweep itself checks that the run reported failure
// and left no heap block or descriptor behind.
void sweep_allocations(const std::function<bool()> &call,
                       const std::function<void(unsigned nth)> &check_failure);

}  // namespace zvt
