// Reading the error trace and capturing log lines in tests.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <initializer_list>
#include <string>
#include <utility>
#include <vector>

#include <zvutil/status.h>

namespace zvt {

struct Frame {
    std::string function;
    std::string file;
    int32_t line;
    zv_status status;
};

// The calling thread's frames, oldest first.
std::vector<Frame> frames();
void clear_trace();

// "ZV_ERR_NO_MEMORY" for 2; the number for anything outside the table.
std::string status_name(zv_status status);

using ExpectedFrame = std::pair<const char *, zv_status>;

// Exactly these (function, status) frames, in this order.
::testing::AssertionResult FramesAre(std::initializer_list<ExpectedFrame> expected);

struct LogLine {
    int32_t level;
    uint32_t mask;
    std::string function;
    std::string message;
    uint32_t frames_before;  // trace frames already recorded when the line was written
};

// Routes log lines to a fixed in-memory store for its lifetime (no heap use
// while capturing, so allocation sweeps stay exact).
class LogCapture {
public:
    LogCapture();
    ~LogCapture();
    LogCapture(const LogCapture &) = delete;
    LogCapture &operator=(const LogCapture &) = delete;

    std::vector<LogLine> lines() const;
    void clear();

private:
    static void sink(void *context, int32_t level, uint32_t mask, const char *function,
                     const char *file, int32_t line, const char *message);
    struct Slot {
        int32_t level;
        uint32_t mask;
        uint32_t frames_before;
        char function[64];
        char message[1024];
    };
    static constexpr unsigned kSlots = 32;
    Slot slots_[kSlots];
    unsigned count_ = 0;
};

// Exactly these (level, message) lines, in order, all with mask 128.
::testing::AssertionResult LogIs(const LogCapture &capture,
                                 std::initializer_list<std::pair<int32_t, const char *>> expected);

}  // namespace zvt

#define EXPECT_FRAMES(...) EXPECT_TRUE(::zvt::FramesAre({__VA_ARGS__}))
#define EXPECT_NO_FRAMES() EXPECT_TRUE(::zvt::FramesAre({}))
#define EXPECT_STATUS(expected, actual) \
    EXPECT_EQ(::zvt::status_name(expected), ::zvt::status_name(actual))
