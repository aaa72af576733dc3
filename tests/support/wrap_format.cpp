// Formatting calls.
#include <cstdarg>
#include <cstddef>
#include <cstdio>

#include "support/fault.h"

extern "C" {

int __real_vsnprintf(char *buffer, size_t size, const char *format, va_list args);

int __wrap_vsnprintf(char *buffer, size_t size, const char *format, va_list args)
{
    return zvt::fault_hit("vsnprintf") ? -1 : __real_vsnprintf(buffer, size, format, args);
}

}  // extern "C"
