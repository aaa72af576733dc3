// Helper processes with a known command line for the process tests.
#pragma once

#include <sys/types.h>

#include <string>

namespace zvt {

// Starts /bin/sleep 30 with |argv0| as its first argument and returns its ID
// once /proc shows that command line.
pid_t start_sleeper(const std::string &argv0);
// Sends SIGKILL to |pid| and reaps it.
void stop_child(pid_t pid);
// The first word of the command line /proc shows for |pid|.
std::string cmdline_of(pid_t pid);

}  // namespace zvt
