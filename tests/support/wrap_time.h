// A pinned clock for the time family's tests.
#pragma once

#include <ctime>
#include <optional>

namespace zvt {

// While set, CLOCK_REALTIME, gettimeofday and time all read |now|.
void pin_clock(std::optional<timespec> now);

}  // namespace zvt
