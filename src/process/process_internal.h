// Process operations the library keeps to itself.
#pragma once

#include <dirent.h>
#include <sys/types.h>

#include <cstdint>

#include "internal.h"

namespace zv {

// Looks up the running processes whose command line matches |name| by
// scanning /proc. |match_mode| 1: the first word of the command line equals
// |name|; otherwise |name| occurs in it. |*count_out| gets the number of
// matches and, when |pids_out| is given, |*pids_out| a new array of their IDs
// in the text order of the /proc names (NULL when nothing qualifies; free
// it). |name| and |count_out| are not tested. Processes that end during the
// scan are skipped.
//   ZV_ERR_SYSTEM     /proc cannot be scanned (logged).
//   ZV_ERR_NO_MEMORY  the array cannot be allocated (logged).
//   other             the status of a failed path formatting (frame, then log).
// |*count_out| is written only on success; after any failure past the scan
// |*pids_out| is NULL, so there is nothing to release.
ZV_INTERNAL zv_status zv_util_pid_of(const char *name, int match_mode, uint32_t **pids_out,
                                     uint32_t *count_out);

// The scandir filter of zv_util_pid_of: 1 for a directory entry with an
// all-digit name whose cmdline file can be opened, 0 otherwise (a failed path
// formatting also drops the entry, with a frame and a log line).
ZV_INTERNAL int vet_possible_directory(const struct dirent64 *entry);

// Bounded wait for the child |pid|: polls it about once a second and sends it
// SIGKILL at the first poll after |timeout_seconds| have passed.
//   ZV_OK            the child ended (reaped; its status is not collected).
//   ZV_ERR_TIMEOUT   the deadline passed; the child was sent SIGKILL.
//   ZV_ERR_SYSTEM    waitpid failed (not a child, or already reaped); logged.
// A deadline that cannot be set, or a clock that cannot be read, counts as
// passed.
ZV_INTERNAL zv_status zv_util_await_child_timeout(pid_t pid, int32_t timeout_seconds);

// Reads at most |length| bytes of the command line of the process named by
// |pid_text| into a new zero-filled block of |length| + 1 bytes, stored in
// |*cmdline_out|; NULL when there is no such process or its command line is
// empty. ZV_ERR_SYSTEM when the entry exists but cannot be opened,
// ZV_ERR_NO_MEMORY when the block cannot be allocated; a failed formatting of
// the path is passed on with two frames.
ZV_INTERNAL zv_status map_pid_to_exe(const char *pid_text, char **cmdline_out, uint32_t length);

// Replaces the content of the PID file |path| with the caller's process ID.
// ZV_ERR_SYSTEM when the file cannot be opened, written, flushed or closed.
ZV_INTERNAL zv_status write_pid_file(const char *path);

// Opens /proc/<pid_text>/cmdline read-only into |fd|, which stays empty (errno
// set) when the open fails. The status of the path's formatting, whose
// failure the formatter has recorded in a frame.
ZV_INTERNAL zv_status open_cmdline(const char *pid_text, unique_fd &fd);

}  // namespace zv
