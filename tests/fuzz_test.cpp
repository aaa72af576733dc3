// The fuzz targets' checks over their seed corpora, without libFuzzer. Each
// target, renamed fuzz_NAME by the build, takes the empty input (which
// libFuzzer always tries), then every file of fuzz/corpus/NAME; a failed
// check aborts.
#include "support/zvt.h"

#define X(name) extern "C" int fuzz_##name(const uint8_t *, size_t);
ZV_FUZZ_TARGETS
#undef X

namespace {

void replay(const std::string &name, int (*run)(const uint8_t *, size_t))
{
    std::string input;
    unsigned seeds = 0;
    run(reinterpret_cast<const uint8_t *>(input.data()), 0);
    for (const auto &seed : std::filesystem::directory_iterator(ZVT_SOURCE_DIR "/fuzz/corpus/" +
                                                                name)) {
        input = zvt::get_file(seed.path());
        run(reinterpret_cast<const uint8_t *>(input.data()), input.size()), seeds++;
    }
    zv::cpu::restrict(~0u);  // the targets pick processor paths
    EXPECT_GT(seeds, 0u) << "no seed for " << name;
}

#define X(name) \
    TEST(FuzzSeeds, name) { replay(#name, fuzz_##name); }
ZV_FUZZ_TARGETS
#undef X

}  // namespace
