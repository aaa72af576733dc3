// Shared by the fuzz targets: failed checks abort. Targets of a kernel with
// vector paths run each input on the paths of the first size % 5 processor
// features: none, SSE2, SSSE3 too, AVX2 too, AVX-512 VBMI too (64-bit only).
#pragma once

#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include <zvutil/zvutil.h>

#include "cpu.h"

#define CHECK(condition) ((condition) ? (void)0 : std::abort())
