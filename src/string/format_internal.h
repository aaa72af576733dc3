// Formatting routine shared between the measuring and allocating halves.
#pragma once

#include <cstdarg>
#include <cstdint>

#include "internal.h"

namespace zv {

// vsnprintf(buffer, size, format, args), result unchanged.
ZV_INTERNAL int format_into(char *buffer, uint32_t size, const char *format, va_list args);

}  // namespace zv
