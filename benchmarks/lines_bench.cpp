// Line counting of a file through its descriptor against reading the whole
// file into one block and counting its newlines.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

#include <zvutil/file.h>

namespace {

// A file of |size| bytes of text lines, removed when the benchmark ends.
class TextFile {
public:
    explicit TextFile(size_t size)
    {
        char name[] = "/tmp/zvutil_lines_XXXXXX";
        fd_ = mkstemp(name);
        path_ = name;
        std::string text;
        for (size_t line = 0; text.size() < size; line++)
            text += std::string(20 + line * 37 % 60, 'x') + '\n';
        text.resize(size);
        if (fd_ < 0 || write(fd_, text.data(), size) != static_cast<ssize_t>(size))
            std::abort();
    }
    ~TextFile()
    {
        close(fd_);
        unlink(path_.c_str());
    }
    int fd() const { return fd_; }

private:
    int fd_;
    std::string path_;
};

void BM_LinesOurs(benchmark::State &state)
{
    TextFile file(static_cast<size_t>(state.range(0)));
    for (auto _ : state) {
        uint32_t count;
        if (zv_util_count_lines(file.fd(), &count, nullptr) != ZV_OK)
            state.SkipWithError("zv_util_count_lines failed");
        benchmark::DoNotOptimize(count);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}

void BM_LinesReadAll(benchmark::State &state)
{
    TextFile file(static_cast<size_t>(state.range(0)));
    for (auto _ : state) {
        struct stat st;
        fstat(file.fd(), &st);
        auto size = static_cast<size_t>(st.st_size);
        auto *text = static_cast<char *>(std::malloc(size));
        size_t have = 0;
        for (ssize_t n; have < size && (n = pread(file.fd(), text + have, size - have, have)) > 0;)
            have += static_cast<size_t>(n);
        auto count = static_cast<uint32_t>(std::count(text, text + have, '\n'));
        benchmark::DoNotOptimize(count);
        std::free(text);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations()) * state.range(0));
}

BENCHMARK(BM_LinesOurs)->Name("count_lines/zvutil")->Arg(64)->Arg(4 << 10)->Arg(1 << 20)
    ->Arg(64 << 20);
BENCHMARK(BM_LinesReadAll)->Name("count_lines/read_all")->Arg(64)->Arg(4 << 10)->Arg(1 << 20)
    ->Arg(64 << 20);

}  // namespace
