// Reading the error trace and capturing log lines in tests.
#pragma once

#include <gtest/gtest.h>
#include <zverrortrace.h>
#include <zvlog.h>

#include <cstdint>
#include <cstdio>
#include <string>
#include <vector>

#include <zvutil/status.h>

namespace zvt {

struct Frame {
    std::string function, file;
    int32_t line;
    zv_status status;
};

// The calling thread's frames, oldest first.
inline std::vector<Frame> frames()
{
    std::vector<Frame> result;
    zv_trace_frame f;
    for (uint32_t i = 0, n = zv_trace_count(); i < n && zv_trace_get(i, &f) == 0; i++)
        result.push_back({f.function ? f.function : "", f.file ? f.file : "", f.line, f.status});
    return result;
}

// "ZV_ERR_NO_MEMORY" for 2; the number for anything outside the table.
inline std::string status_name(zv_status status)
{
#define ZVT_STATUS_NAME(name, value, meaning) \
    if (status == name)                       \
        return #name;
    ZV_STATUS_LIST(ZVT_STATUS_NAME)
#undef ZVT_STATUS_NAME
    return "status " + std::to_string(static_cast<int32_t>(status));
}

// The frames as "function:STATUS", oldest first, space-separated.
inline std::string trace_text()
{
    std::string text;
    for (const Frame &frame : frames())
        text += (text.empty() ? "" : " ") + frame.function + ":" + status_name(frame.status);
    return text;
}

// Routes log lines to a fixed in-memory store for its lifetime (no heap use
// while capturing, so allocation sweeps stay exact).
class LogCapture {
public:
    LogCapture() { zv_log_set_sink(sink, this); }
    ~LogCapture() { zv_log_set_sink(nullptr, nullptr); }
    LogCapture(const LogCapture &) = delete;

    // "level/mask/frames message" per line, where frames counts the trace
    // frames already recorded when the line was written.
    std::string text() const
    {
        std::string all;
        for (unsigned i = 0; i < count_; i++)
            all += slots_[i];
        return all;
    }

private:
    static void sink(void *context, int32_t level, uint32_t mask, const char *, const char *,
                     int32_t, const char *message)
    {
        auto *self = static_cast<LogCapture *>(context);
        if (self->count_ < std::size(self->slots_))
            std::snprintf(self->slots_[self->count_++], sizeof self->slots_[0], "%d/%u/%u %s\n",
                          level, mask, zv_trace_count(), message ? message : "");
    }
    char slots_[32][1100];
    unsigned count_ = 0;
};

}  // namespace zvt

#define EXPECT_STATUS(expected, actual) \
    EXPECT_EQ(::zvt::status_name(expected), ::zvt::status_name(actual))
