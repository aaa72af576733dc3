// Starting a child: zv_spawn clones, and its failure is armed as "fork".
#include <sched.h>

#include "support/fault.h"

extern "C" {

int __real_clone(int (*start)(void *), void *stack, int flags, void *arg, ...);

// The library passes no parent or child thread ID and no TLS, so only the
// four fixed arguments are forwarded.
int __wrap_clone(int (*start)(void *), void *stack, int flags, void *arg, ...)
{
    return zvt::fault_hit("fork") ? -1 : __real_clone(start, stack, flags, arg);
}

}  // extern "C"
