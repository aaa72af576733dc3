#include "support/trace.h"

#include <zverrortrace.h>
#include <zvlog.h>

#include <cstdio>
#include <cstring>
#include <sstream>

#include "support/fault.h"

namespace zvt {

std::vector<Frame> frames()
{
    std::vector<Frame> result;
    for (uint32_t i = 0, n = zv_trace_count(); i < n; i++) {
        zv_trace_frame f;
        if (zv_trace_get(i, &f) == 0)
            result.push_back({f.function ? f.function : "", f.file ? f.file : "", f.line, f.status});
    }
    return result;
}

void clear_trace() { zv_trace_clear(); }

std::string status_name(zv_status status)
{
    switch (status) {
#define ZVT_STATUS_CASE(name, value, meaning) \
    case name:                                \
        return #name;
        ZV_STATUS_LIST(ZVT_STATUS_CASE)
#undef ZVT_STATUS_CASE
    }
    return "status " + std::to_string(static_cast<int32_t>(status));
}

static std::string describe(const std::vector<std::pair<std::string, zv_status>> &list)
{
    std::ostringstream out;
    out << "[";
    for (size_t i = 0; i < list.size(); i++)
        out << (i ? ", " : "") << list[i].first << ":" << status_name(list[i].second);
    out << "]";
    return out.str();
}

::testing::AssertionResult FramesAre(std::initializer_list<ExpectedFrame> expected)
{
    std::vector<std::pair<std::string, zv_status>> want, got;
    for (const auto &e : expected)
        want.emplace_back(e.first, e.second);
    for (const auto &f : frames())
        got.emplace_back(f.function, f.status);
    if (want == got)
        return ::testing::AssertionSuccess();
    return ::testing::AssertionFailure() << "frames " << describe(got) << ", expected "
                                         << describe(want);
}

LogCapture::LogCapture() { zv_log_set_sink(&LogCapture::sink, this); }
LogCapture::~LogCapture() { zv_log_set_sink(nullptr, nullptr); }

void LogCapture::sink(void *context, int32_t level, uint32_t mask, const char *function,
                      const char *, int32_t, const char *message)
{
    auto *self = static_cast<LogCapture *>(context);
    if (self->count_ == kSlots)
        return;
    Slot &slot = self->slots_[self->count_++];
    slot.level = level;
    slot.mask = mask;
    slot.frames_before = zv_trace_count();
    std::snprintf(slot.function, sizeof slot.function, "%s", function ? function : "");
    std::snprintf(slot.message, sizeof slot.message, "%s", message ? message : "");
}

std::vector<LogLine> LogCapture::lines() const
{
    std::vector<LogLine> result;
    for (unsigned i = 0; i < count_; i++) {
        const Slot &s = slots_[i];
        result.push_back({s.level, s.mask, s.function, s.message, s.frames_before});
    }
    return result;
}

void LogCapture::clear() { count_ = 0; }

::testing::AssertionResult LogIs(const LogCapture &capture,
                                 std::initializer_list<std::pair<int32_t, const char *>> expected)
{
    std::vector<LogLine> got = capture.lines();
    std::ostringstream why;
    bool same = got.size() == expected.size();
    size_t i = 0;
    for (const auto &e : expected) {
        if (i < got.size() &&
            (got[i].level != e.first || got[i].mask != 128 || got[i].message != e.second))
            same = false;
        i++;
    }
    if (same)
        return ::testing::AssertionSuccess();
    why << "log lines:";
    for (const auto &l : got)
        why << "\n  [" << l.level << "/" << l.mask << "] " << l.function << ": \"" << l.message
            << "\"";
    why << "\nexpected:";
    for (const auto &e : expected)
        why << "\n  [" << e.first << "/128] \"" << e.second << "\"";
    return ::testing::AssertionFailure() << why.str();
}

namespace {

// Every test starts with an empty trace, no armed faults and the default sink.
class ResetListener : public ::testing::EmptyTestEventListener {
    void OnTestStart(const ::testing::TestInfo &) override
    {
        fault_clear();
        zv_trace_clear();
    }
};

[[maybe_unused]] const bool registered = [] {
    ::testing::UnitTest::GetInstance()->listeners().Append(new ResetListener);
    return true;
}();

}  // namespace
}  // namespace zvt
