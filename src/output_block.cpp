#include "output_block.h"

#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <sys/mman.h>

namespace zv {

void *malloc_output(size_t size)
{
    void *block = std::malloc(size);
    if (block == nullptr || size < kHugeOutput)
        return block;
    constexpr uintptr_t kHugePage = uintptr_t{2} << 20;
    auto start = (reinterpret_cast<uintptr_t>(block) + kHugePage - 1) & ~(kHugePage - 1);
    auto end = (reinterpret_cast<uintptr_t>(block) + size) & ~(kHugePage - 1);
    if (end > start) {
        // Only advice: without huge pages the block works the same.
        int saved = errno;
        ::madvise(reinterpret_cast<void *>(start), end - start, MADV_HUGEPAGE);
        errno = saved;
    }
    return block;
}

}  // namespace zv
