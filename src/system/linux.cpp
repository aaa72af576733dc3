// The calling thread's ID, and a process's stat line from /proc.
#include <zvutil/process.h>

#include <algorithm>
#include <cctype>
#include <cstddef>
#include <cstring>
#include <iterator>
#include <sys/syscall.h>

#include "system/system_internal.h"

namespace {

enum class Conversion : uint8_t { skip, character, i32, u32, u_long, s_long, u64 };

struct Field {
    size_t offset;
    Conversion conversion;
};

#define ZV_STAT_FIELD(slot, conversion) {offsetof(zv_proc_stat, slot), Conversion::conversion}
// Positions 1 to 42 of the stat line, in order.
constexpr Field kFields[] = {
    ZV_STAT_FIELD(pid, i32),          ZV_STAT_FIELD(comm, skip),
    ZV_STAT_FIELD(state, character),  ZV_STAT_FIELD(ppid, i32),
    ZV_STAT_FIELD(pgrp, i32),         ZV_STAT_FIELD(session, i32),
    ZV_STAT_FIELD(tty_nr, i32),       ZV_STAT_FIELD(tpgid, i32),
    ZV_STAT_FIELD(flags, u32),        ZV_STAT_FIELD(minflt, u_long),
    ZV_STAT_FIELD(cminflt, u_long),   ZV_STAT_FIELD(majflt, u_long),
    ZV_STAT_FIELD(cmajflt, u_long),   ZV_STAT_FIELD(utime, u_long),
    ZV_STAT_FIELD(stime, u_long),     ZV_STAT_FIELD(cutime, u_long),
    ZV_STAT_FIELD(cstime, u_long),    ZV_STAT_FIELD(priority, u_long),
    ZV_STAT_FIELD(nice, u_long),      ZV_STAT_FIELD(num_threads, u_long),
    ZV_STAT_FIELD(itrealvalue, u_long), ZV_STAT_FIELD(starttime, u64),
    ZV_STAT_FIELD(vsize, u_long),     ZV_STAT_FIELD(rss, s_long),
    ZV_STAT_FIELD(rsslim, u_long),    ZV_STAT_FIELD(startcode, u_long),
    ZV_STAT_FIELD(endcode, u_long),   ZV_STAT_FIELD(startstack, u_long),
    ZV_STAT_FIELD(kstkesp, u_long),   ZV_STAT_FIELD(kstkeip, u_long),
    ZV_STAT_FIELD(signal, u_long),    ZV_STAT_FIELD(blocked, u_long),
    ZV_STAT_FIELD(sigignore, u_long), ZV_STAT_FIELD(sigcatch, u_long),
    ZV_STAT_FIELD(wchan, u_long),     ZV_STAT_FIELD(nswap, u_long),
    ZV_STAT_FIELD(cnswap, u_long),    ZV_STAT_FIELD(exit_signal, i32),
    ZV_STAT_FIELD(processor, i32),    ZV_STAT_FIELD(rt_priority, u32),
    ZV_STAT_FIELD(policy, u32),       ZV_STAT_FIELD(delayacct_blkio_ticks, u64),
};
#undef ZV_STAT_FIELD
static_assert(std::size(kFields) == 42);

// Converts |text| with |format| into a |Value| and stores it, cut to the
// slot's width, at |slot|. Text that does not convert leaves the slot alone.
template <class Slot, class Value>
void store(char *slot, const char *text, const char *format)
{
    Value value;
    if (std::sscanf(text, format, &value) != 1)
        return;
    Slot narrowed = static_cast<Slot>(value);
    std::memcpy(slot, &narrowed, sizeof narrowed);
}

// The "%lu" and "%ld" fields fill 32-bit slots exactly as they do where long
// is 32 bits, on x86_64 too: a value out of range saturates (as strtoul and
// strtol do) instead of losing its upper bits, and "-n" read as unsigned wraps
// modulo 2^32.
void store_long32(char *slot, const char *text, bool is_signed)
{
    while (std::isspace(static_cast<unsigned char>(*text)))
        text++;
    bool negative = *text == '-';
    if (*text == '-' || *text == '+')
        text++;
    unsigned long long magnitude;
    if (!std::isdigit(static_cast<unsigned char>(*text)) ||
        std::sscanf(text, "%llu", &magnitude) != 1)
        return;
    uint32_t bits;
    if (is_signed) {
        int64_t value = negative ? -static_cast<int64_t>(std::min(magnitude, 0x80000000ull))
                                 : static_cast<int64_t>(std::min(magnitude, 0x7FFFFFFFull));
        bits = static_cast<uint32_t>(value);
    } else if (magnitude > UINT32_MAX) {
        bits = UINT32_MAX;
    } else {
        bits = negative ? 0u - static_cast<uint32_t>(magnitude) : static_cast<uint32_t>(magnitude);
    }
    std::memcpy(slot, &bits, sizeof bits);
}

void convert(zv_proc_stat *record, const Field &field, const char *text)
{
    char *slot = reinterpret_cast<char *>(record) + field.offset;
    switch (field.conversion) {
    case Conversion::skip:
        break;
    case Conversion::character:
        store<char, char>(slot, text, "%c");
        break;
    case Conversion::i32:
        store<int32_t, int>(slot, text, "%d");
        break;
    case Conversion::u32:
        store<uint32_t, unsigned>(slot, text, "%u");
        break;
    case Conversion::u_long:
        store_long32(slot, text, false);
        break;
    case Conversion::s_long:
        store_long32(slot, text, true);
        break;
    case Conversion::u64:
        store<uint64_t, unsigned long long>(slot, text, "%llu");
        break;
    }
}

}  // namespace

extern "C" {

ZV_EXPORT int32_t zv_util_tid(void)
{
    return static_cast<int32_t>(syscall(SYS_gettid));
}

}  // extern "C"

zv_status zv::zv_util_proc_stat(zv_proc_stat *ret_proc_stat, int32_t pid)
{
    char path[32] = "/proc/self/stat";
    if (pid != 0)
        std::snprintf(path, sizeof path, "/proc/%d/stat", static_cast<int>(pid));
    return zv_util_proc_stat(ret_proc_stat, path);
}

zv_status zv::zv_util_proc_stat(zv_proc_stat *ret_proc_stat, const char *path)
{
    if (ret_proc_stat == nullptr)
        return ZV_LOG_FAIL(ZV_ERR_NULL_ARG, "ret_proc_stat is NULL\n");
    std::memset(ret_proc_stat, 0, sizeof *ret_proc_stat);

    zv::unique_file stream(std::fopen(path, "re"));
    if (!stream)
        return ZV_FAIL(ZV_ERR_OPEN_FAILED);
    zv::unique_malloc<char> line;
    size_t capacity = 0;
    errno = 0;  // an empty file leaves errno alone: do not report a stale one
    ssize_t n = getline(zv::out_block(line), &capacity, stream.get());
    stream.reset();
    if (n == -1)
        return ZV_PERROR_FAIL(errno, ZV_ERR_IO, "getline() failed\n");

    // The bound takes in the NUL after the line, which ends its last field.
    // Fields are split in place at single spaces; the command name runs to
    // its last ")" so that blanks and parentheses inside it split nothing.
    char *text = line.get();
    const size_t len = static_cast<size_t>(n) + 1;
    size_t start = 0;
    for (size_t position = 0; position < std::size(kFields); position++) {
        size_t j = start;
        if (kFields[position].conversion == Conversion::skip && j < len && text[j] == '(') {
            const void *close = memrchr(text + j, ')', len - j);
            if (close != nullptr)
                j = static_cast<size_t>(static_cast<const char *>(close) - text);
        }
        while (j < len && text[j] != ' ' && text[j] != '\0')
            j++;
        if (j == len)
            return ZV_LOG_FAIL(ZV_ERR_SYSTEM, "Parsing logic failed, j=%zu, len=%zu\n", j, len);
        text[j] = '\0';
        convert(ret_proc_stat, kFields[position], text + start);
        start = j + 1;
    }
    return ZV_OK;
}
