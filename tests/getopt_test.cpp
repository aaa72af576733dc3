// Option table parser: matching rules, handlers and failure frames.
#include <gtest/gtest.h>

#include <cerrno>
#include <string>
#include <vector>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/getopt.h>

namespace {

const std::string k300(300, 'x'), k301(301, 'x');

// Flag, string and integer options; -f is a flag that wants a value, -h a
// record without a handler.
struct Parse {
    int32_t verbose = 0, number = -1, shadowed = 0;
    char *output = nullptr;
    const zv_util_option table[6] = {
        {'v', "verbose", zv_util_getopt_flag, &verbose, 0},
        {'o', "output", zv_util_getopt_string, &output, 1},
        {'n', "count", zv_util_getopt_int, &number, 1},
        {'v', "verbose", zv_util_getopt_flag, &shadowed, 0},  // first match wins
        {'f', "", zv_util_getopt_flag, &shadowed, 1},
        {'h', "", nullptr, &shadowed, 0},
    };
    ~Parse() { std::free(output); }
    zv_status run(const std::vector<const char *> &args, int32_t start = 1)
    {
        auto *argv = const_cast<char *const *>(args.data());
        const auto argc = static_cast<int32_t>(args.size());
        return start == 1 ? zv_util_getopt(argc, argv, table, 6)  // adds no frame of its own
                          : zv_util_getopt_from(argc, argv, table, 6, start);
    }
    std::string text() const { return output != nullptr ? output : "-"; }
};

TEST(Getopt, MatchesShortAndLongForms)
{
    const struct {
        std::vector<const char *> args;
        int32_t start, verbose, number;
        std::string output;
    } rows[] = {
        {{"-v"}, 1, 0, -1, "-"},
        {{"-v"}, 0, 1, -1, "-"},
        {{"prog", "/v"}, 1, 1, -1, "-"},
        {{"prog", "--verbose", "-verbose", "/verbose"}, 1, 1, -1, "-"},
        {{"prog", "--Verbose", "--verb", "-vo", "-", "/", "v", "-z", "--zzz"}, 1, 0, -1, "-"},
        {{"prog", "--output", k300.c_str(), "-n", " -42"}, 1, 0, -42, k300},
        {{"prog", "-o", "-v", "/count", "12abc"}, 1, 0, 12, "-v"},  // values taken unchanged
        {{"prog", "-n", "2147483647", "-n", "-2147483648"}, 1, 0, INT32_MIN, "-"},
    };
    for (const auto &row : rows) {
        Parse parse;
        EXPECT_EQ(parse.run(row.args, row.start), ZV_OK);
        EXPECT_EQ(parse.verbose, row.verbose) << row.args.back();
        EXPECT_EQ(parse.number, row.number) << row.args.back();
        EXPECT_EQ(parse.text(), row.output);
        EXPECT_EQ(parse.shadowed, 0);
    }
    EXPECT_NO_FRAMES();
}

TEST(Getopt, FailedOptionStopsTheParse)
{
    const struct {
        std::vector<const char *> args;
        zv_status status;
        const char *handler;  // nullptr: process_option found the fault
        std::string output;
    } rows[] = {
        {{"prog", "-o", "a", "-o", "b"}, ZV_ERR_BAD_VALUE, "zv_util_getopt_string", "a"},
        {{"prog", "-o", k301.c_str()}, ZV_ERR_BAD_VALUE, "zv_util_getopt_string", "-"},
        {{"prog", "-o", "a"}, ZV_ERR_NO_MEMORY, "zv_util_getopt_string", "-"},
        {{"prog", "-n", "abc", "-o", "x"}, ZV_ERR_BAD_VALUE, "zv_util_getopt_int", "-"},
        {{"prog", "-n", "2147483648"}, ZV_ERR_BAD_VALUE, "zv_util_getopt_int", "-"},
        {{"prog", "-f", "x"}, ZV_ERR_BAD_VALUE, "zv_util_getopt_flag", "-"},
        {{"prog", "-h"}, ZV_ERR_NULL_ARG, nullptr, "-"},
        {{"prog", "-o", "a", "--count"}, ZV_ERR_SYSTEM, nullptr, "a"},
    };
    for (const auto &row : rows) {
        Parse parse;
        zvt::clear_trace();
        zvt::LogCapture log;
        if (row.status == ZV_ERR_NO_MEMORY)
            zvt::fault_arm("alloc", 1, ENOMEM);
        EXPECT_EQ(parse.run(row.args), row.status) << row.args[1];
        zvt::fault_clear();
        std::vector<std::string> expected = {"process_option", "zv_util_getopt_from",
                                             "zv_util_getopt_from"}, functions;
        if (row.handler != nullptr)
            expected.insert(expected.begin(), row.handler);
        for (const zvt::Frame &frame : zvt::frames()) {
            functions.push_back(frame.function);
            EXPECT_EQ(frame.status, row.status);
        }
        EXPECT_EQ(functions, expected);
        EXPECT_EQ(parse.text(), row.output);
        EXPECT_EQ(parse.number + parse.shadowed, -1);
        const bool missing = row.status == ZV_ERR_SYSTEM;  // logged before the first frame
        EXPECT_EQ(static_cast<bool>(zvt::LogIs(log, {{3, "Missing mandatory option"}})), missing);
        EXPECT_TRUE(!missing || log.lines().at(0).frames_before == 0);
    }
}

TEST(Getopt, ArgumentChecks)
{
    Parse parse;
    char *argv[] = {nullptr};
    EXPECT_EQ(zv_util_getopt(1, nullptr, parse.table, 1), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_getopt(0, argv, parse.table, 1), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(zv_util_getopt(1, argv, parse.table, 0), ZV_ERR_BAD_VALUE);
    EXPECT_EQ(zv_util_getopt_from(1, argv, nullptr, 1, 0), ZV_ERR_NULL_ARG);
    EXPECT_EQ(zv_util_getopt_from(1, argv, parse.table, 1, -1), ZV_ERR_BAD_VALUE);
    EXPECT_FRAMES({"zv_util_getopt", ZV_ERR_NULL_ARG}, {"zv_util_getopt", ZV_ERR_BAD_VALUE},
                  {"zv_util_getopt", ZV_ERR_BAD_VALUE}, {"zv_util_getopt_from", ZV_ERR_NULL_ARG},
                  {"zv_util_getopt_from", ZV_ERR_BAD_VALUE});
}

}  // namespace
