// The kernel's status record of a process, read from its /proc stat line.
#pragma once

#include <cstdint>

#include "internal.h"

// One slot per field of the stat line, in its order. Slots of "%lu" fields
// hold 32 bits: a negative value (nice, priority) keeps its two's-complement
// pattern. |comm| is never filled.
struct zv_proc_stat {
    int32_t pid;
    uint32_t comm;
    char state;
    int32_t ppid;
    int32_t pgrp;
    int32_t session;
    int32_t tty_nr;
    int32_t tpgid;
    uint32_t flags;
    uint32_t minflt;
    uint32_t cminflt;
    uint32_t majflt;
    uint32_t cmajflt;
    uint32_t utime;
    uint32_t stime;
    uint32_t cutime;
    uint32_t cstime;
    uint32_t priority;
    uint32_t nice;
    uint32_t num_threads;
    uint32_t itrealvalue;
    uint64_t starttime;
    uint32_t vsize;
    int32_t rss;
    uint32_t rsslim;
    uint32_t startcode;
    uint32_t endcode;
    uint32_t startstack;
    uint32_t kstkesp;
    uint32_t kstkeip;
    uint32_t signal;
    uint32_t blocked;
    uint32_t sigignore;
    uint32_t sigcatch;
    uint32_t wchan;
    uint32_t nswap;
    uint32_t cnswap;
    int32_t exit_signal;
    int32_t processor;
    uint32_t rt_priority;
    uint32_t policy;
    uint64_t delayacct_blkio_ticks;
};

namespace zv {

// Fills |*ret_proc_stat| from the first 42 fields of the stat line of |pid|
// (0: the calling process). The command name runs from the first "(" to the
// last ")", so spaces and parentheses in it shift no later field.
//   ZV_ERR_NULL_ARG     |ret_proc_stat| NULL (logged).
//   ZV_ERR_OPEN_FAILED  the stat file cannot be opened; record all zero.
//   ZV_ERR_IO           no line can be read; logged with the errno text.
//   ZV_ERR_SYSTEM       the line has fewer than 42 fields (logged); the
//                       fields before the missing one are filled.
ZV_INTERNAL zv_status zv_util_proc_stat(zv_proc_stat *ret_proc_stat, int32_t pid);

// The same for the stat line in the file |path|; it records its frames under
// the same name.
ZV_INTERNAL zv_status zv_util_proc_stat(zv_proc_stat *ret_proc_stat, const char *path);

}  // namespace zv
