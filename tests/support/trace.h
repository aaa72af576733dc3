// Reading the error trace and capturing log lines in tests.
#pragma once

#include <gtest/gtest.h>
#include <zverrortrace.h>
#include <zvlog.h>

#include <cstdint>
#include <cstdio>
#include <initializer_list>
#include <string>
#include <utility>
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

inline void clear_trace() { zv_trace_clear(); }

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

using ExpectedFrame = std::pair<const char *, zv_status>;

// Exactly these (function, status) frames, in this order.
inline ::testing::AssertionResult FramesAre(std::initializer_list<ExpectedFrame> expected)
{
    std::string want, got;
    for (const auto &[function, status] : expected)
        want += std::string(" ") + function + ":" + status_name(status);
    for (const Frame &frame : frames())
        got += " " + frame.function + ":" + status_name(frame.status);
    return ::testing::AssertionResult(want == got) << "frames" << got << ", expected" << want;
}

struct LogLine {
    int32_t level;
    uint32_t mask;
    std::string function, message;
    uint32_t frames_before;  // trace frames already recorded when the line was written
};

// Routes log lines to a fixed in-memory store for its lifetime (no heap use
// while capturing, so allocation sweeps stay exact).
class LogCapture {
public:
    LogCapture() { zv_log_set_sink(sink, this); }
    ~LogCapture() { zv_log_set_sink(nullptr, nullptr); }
    LogCapture(const LogCapture &) = delete;
    LogCapture &operator=(const LogCapture &) = delete;

    std::vector<LogLine> lines() const
    {
        std::vector<LogLine> result;
        for (unsigned i = 0; i < count_; i++)
            result.push_back({slots_[i].level, slots_[i].mask, slots_[i].function,
                              slots_[i].message, slots_[i].frames_before});
        return result;
    }
    void clear() { count_ = 0; }

private:
    static void sink(void *context, int32_t level, uint32_t mask, const char *function,
                     const char *, int32_t, const char *message)
    {
        auto *self = static_cast<LogCapture *>(context);
        if (self->count_ == std::size(self->slots_))
            return;
        Slot &slot = self->slots_[self->count_++];
        slot = {level, mask, zv_trace_count(), {}, {}};
        std::snprintf(slot.function, sizeof slot.function, "%s", function ? function : "");
        std::snprintf(slot.message, sizeof slot.message, "%s", message ? message : "");
    }
    struct Slot {
        int32_t level;
        uint32_t mask, frames_before;
        char function[64], message[1024];
    } slots_[32];
    unsigned count_ = 0;
};

// Exactly these (level, message) lines, in order, all with mask 128.
inline ::testing::AssertionResult LogIs(
    const LogCapture &capture, std::initializer_list<std::pair<int32_t, const char *>> expected)
{
    std::string want, got;
    for (const auto &[level, message] : expected)
        want += "\n  [" + std::to_string(level) + "/128] " + message;
    for (const LogLine &l : capture.lines())
        got += "\n  [" + std::to_string(l.level) + "/" + std::to_string(l.mask) + "] " + l.message;
    return ::testing::AssertionResult(want == got) << "log lines:" << got << "\nexpected:" << want;
}

}  // namespace zvt

#define EXPECT_FRAMES(...) EXPECT_TRUE(::zvt::FramesAre({__VA_ARGS__}))
#define EXPECT_STATUS(expected, actual) \
    EXPECT_EQ(::zvt::status_name(expected), ::zvt::status_name(actual))
