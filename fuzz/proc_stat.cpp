// The /proc stat line parser over any text, and over a well-formed line whose
// command name is the input: the fields after the name land in place.
#include <sys/mman.h>
#include <unistd.h>

#include "fuzz.h"
#include "system/system_internal.h"

static zv_status parse(const std::string &line, zv_proc_stat *record)
{
    static const int fd = memfd_create("stat", 0);
    static const std::string path = "/proc/self/fd/" + std::to_string(fd);
    CHECK(ftruncate(fd, 0) == 0 && pwrite(fd, line.data(), line.size(), 0) == ssize_t(line.size()));
    return zv::zv_util_proc_stat(record, path.c_str());
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    std::string text(reinterpret_cast<const char *>(data), size), line = "7 (";
    zv_proc_stat record;
    zv_status status = parse(text, &record);
    CHECK(status == ZV_OK || status == ZV_ERR_SYSTEM || status == ZV_ERR_IO);
    line += text.substr(0, text.find_first_of(std::string("\n\0", 2))) + ") R";
    for (int field = 4; field <= 42; ++field)
        line += ' ' + std::to_string(field);
    CHECK(parse(line + '\n', &record) == ZV_OK && record.pid == 7 && record.state == 'R' &&
          record.ppid == 4 && record.rsslim == 25 && record.delayacct_blkio_ticks == 42);
    return 0;
}
