// Runs one fuzz target's checks over its seed corpus without libFuzzer:
//   fuzz_replay TARGET CORPUS_DIR
// The empty input, which libFuzzer always tries, comes first. A failed check
// aborts; an unknown target or a missing or empty corpus fails too.
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

// Each target's entry point is renamed fuzz_NAME by the build.
#define X(name) extern "C" int fuzz_##name(const uint8_t *, size_t);
ZV_FUZZ_TARGETS
#undef X

int main(int argc, char **argv)
{
    struct Target {
        const char *name;
        int (*run)(const uint8_t *, size_t);
    };
#define X(name) {#name, fuzz_##name},
    const Target targets[] = {ZV_FUZZ_TARGETS};
#undef X
    const Target *target = nullptr;
    for (const Target &t : targets)
        if (argc == 3 && std::strcmp(t.name, argv[1]) == 0)
            target = &t;
    if (target == nullptr) {
        std::fprintf(stderr, "usage: %s TARGET CORPUS_DIR\n", argv[0]);
        return 2;
    }
    std::string input;
    unsigned seeds = 0;
    target->run(reinterpret_cast<const uint8_t *>(input.data()), 0);
    for (const auto &entry : std::filesystem::directory_iterator(argv[2])) {
        std::ifstream file(entry.path(), std::ios::binary);
        input.assign(std::istreambuf_iterator<char>(file), {});
        target->run(reinterpret_cast<const uint8_t *>(input.data()), input.size());
        seeds++;
    }
    std::printf("%s: the empty input and %u seeds passed\n", target->name, seeds);
    return seeds == 0;
}
