// Output blocks of the encoders: malloc() blocks that callers release with
// free(), advised onto huge pages when they are large.
#pragma once

#include <cstddef>

#include "internal.h"

namespace zv {

// malloc(size). A block of kHugeOutput bytes or more is instead 2 MiB aligned
// and rounded up to whole 2 MiB pages, all advised for transparent huge pages,
// since writing it page by page costs more than coding it. Either is released
// with free(). NULL with errno set on failure; errno is otherwise left as it
// was.
ZV_INTERNAL void *malloc_output(size_t size);

// glibc's allocator serves blocks of this size (its largest automatic mmap
// threshold) from a mapping of their own, released on free().
inline constexpr size_t kHugeOutput = (size_t{4} << 20) * sizeof(long);

}  // namespace zv
