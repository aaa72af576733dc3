// Output blocks of the encoders.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "output_block.h"

namespace {

TEST(OutputBlock, LargeBlocksAreOrdinaryAndKeepErrno)
{
    for (size_t size : {size_t{100}, zv::kHugeOutput + 12345}) {
        errno = 1234;
        auto *block = static_cast<char *>(zv::malloc_output(size));
        ASSERT_NE(block, nullptr);
        EXPECT_EQ(errno, 1234) << "the advice's failure, if any, is not seen";
        std::memset(block, 0x5a, size);
        EXPECT_EQ(block[size - 1], 0x5a);
        std::free(block);
    }
}

}  // namespace
