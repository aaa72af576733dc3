#include "output_block.h"

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <sys/mman.h>

namespace zv {

void *malloc_output(size_t size)
{
    if (size < kHugeOutput)
        return std::malloc(size);
    // Whole huge pages, so no part of the block is faulted 4 KiB at a time.
    // glibc serves the block from its own mapping; free() unmaps it.
    constexpr size_t kHugePage = size_t{2} << 20;
    size_t rounded = (size + kHugePage - 1) & ~(kHugePage - 1);
    if (rounded < size) {
        errno = ENOMEM;
        return nullptr;
    }
    void *block = std::aligned_alloc(kHugePage, rounded);
    if (block != nullptr) {
        // Only advice: without huge pages the block works the same.
        int saved = errno;
        ::madvise(block, rounded, MADV_HUGEPAGE);
        errno = saved;
    }
    return block;
}

}  // namespace zv
