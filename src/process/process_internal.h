// Process operations the library keeps to itself.
#pragma once

#include <dirent.h>
#include <sys/types.h>

#include <cstdint>

#include "internal.h"

// Looks up the running processes whose command line matches |name| by
// scanning /proc. |match_mode| 1: the first word of the command line equals
// |name|; otherwise |name| occurs in it. |*count_out| gets the number of
// matches and, when |pids_out| is given, |*pids_out| a new array of their IDs
// in the text order of the /proc names (NULL when nothing qualifies).
//   ZV_ERR_SYSTEM     /proc cannot be scanned.
//   ZV_ERR_NO_MEMORY  the array cannot be allocated.
//   other             the status of a failed path formatting.
// On failure |*pids_out| and |*count_out| are not left holding anything.
ZV_INTERNAL zv_status zv_util_pid_of(const char *name, int match_mode, uint32_t **pids_out,
                                     uint32_t *count_out);

// The scandir filter of zv_util_pid_of: 1 for a directory entry with an
// all-digit name whose cmdline file can be opened, 0 otherwise.
ZV_INTERNAL int vet_possible_directory(const struct dirent *entry);
