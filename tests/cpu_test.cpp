// Feature detection and the switch that forces the scalar paths.
#include <gtest/gtest.h>

#include "cpu.h"

namespace {

TEST(Cpu, RestrictHidesFeaturesUntilLifted)
{
    uint32_t all = zv::cpu::features();
#if defined(__x86_64__)
    EXPECT_TRUE(zv::cpu::has(zv::cpu::kSSE2)) << "every x86-64 processor has SSE2";
#endif
    zv::cpu::restrict(0);
    EXPECT_EQ(zv::cpu::features(), 0u);
    zv::cpu::restrict(zv::cpu::kSSE2);
    EXPECT_EQ(zv::cpu::features(), all & zv::cpu::kSSE2);
    zv::cpu::restrict(~0u);
    EXPECT_EQ(zv::cpu::features(), all);
}

}  // namespace
