// Option table parser: matching rules, handlers and failure frames.
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <string>
#include <vector>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/getopt.h>

namespace {

// A parse over one table of flag, string and integer options.
struct Parse {
    int32_t verbose = 0;
    int32_t number = -1;
    char *output = nullptr;
    int32_t shadowed = 0;
    zv_util_option table[4] = {
        {'v', "verbose", zv_util_getopt_flag, &verbose, 0},
        {'o', "output", zv_util_getopt_string, &output, 1},
        {'n', "count", zv_util_getopt_int, &number, 1},
        {'v', "verbose", zv_util_getopt_flag, &shadowed, 0},  // first match wins
    };

    ~Parse() { std::free(output); }
    zv_status run(std::vector<const char *> args, int32_t start = 1)
    {
        return zv_util_getopt_from(static_cast<int32_t>(args.size()),
                                   const_cast<char *const *>(args.data()), table, 4, start);
    }
    std::string text() const { return output != nullptr ? output : "(null)"; }
};

TEST(Getopt, MatchesShortAndLongForms)
{
    struct Row {
        std::vector<const char *> args;
        int32_t verbose;
        const char *output;
        int32_t number;
    } rows[] = {
        {{"prog"}, 0, "(null)", -1},
        {{"prog", "-v"}, 1, "(null)", -1},
        {{"prog", "/v"}, 1, "(null)", -1},
        {{"prog", "--verbose", "-verbose", "/verbose"}, 1, "(null)", -1},
        {{"prog", "--Verbose", "--verb", "-vo", "-", "/", "v", "--"}, 0, "(null)", -1},
        {{"prog", "-z", "--zzz", "--output", "x"}, 0, "x", -1},
        {{"prog", "-o", "-v", "/count", "0"}, 0, "-v", 0},  // values are taken unchanged
        {{"prog", "-n", " -42"}, 0, "(null)", -42},
        {{"prog", "-n", "12abc", "-n", "+7"}, 0, "(null)", 7},
        {{"prog", "-n", "2147483647"}, 0, "(null)", INT32_MAX},
        {{"prog", "-n", "-2147483648"}, 0, "(null)", INT32_MIN},
    };
    for (const Row &row : rows) {
        Parse parse;
        EXPECT_STATUS(ZV_OK, parse.run(row.args)) << row.args.size();
        EXPECT_EQ(parse.verbose, row.verbose) << row.args[1];
        EXPECT_EQ(parse.text(), row.output) << row.args.size();
        EXPECT_EQ(parse.number, row.number) << row.args.size();
        EXPECT_EQ(parse.shadowed, 0);
    }
    EXPECT_NO_FRAMES();
}

TEST(Getopt, StartIndexDecidesWhetherTheProgramNameCounts)
{
    Parse from_zero, from_one;
    EXPECT_STATUS(ZV_OK, from_zero.run({"-v"}, 0));
    EXPECT_EQ(from_zero.verbose, 1);
    char arg0[] = "-v";
    char *argv[] = {arg0};
    EXPECT_STATUS(ZV_OK, zv_util_getopt(1, argv, from_one.table, 4));
    EXPECT_EQ(from_one.verbose, 0);
}

int32_t custom_calls;
zv_status count_value(const zv_util_option *, const char *value, uint32_t *consumed)
{
    custom_calls += value != nullptr;
    *consumed = 9;  // ignored: the record fixes the step
    return ZV_OK;
}

TEST(Getopt, StepComesFromTheRecordNotTheHandler)
{
    int32_t verbose = 0;
    const zv_util_option table[] = {{'c', "", count_value, nullptr, 1},
                                    {'v', "", zv_util_getopt_flag, &verbose, 0}};
    const char *args[] = {"prog", "-c", "x", "-v"};
    custom_calls = 0;
    EXPECT_STATUS(ZV_OK, zv_util_getopt(4, const_cast<char *const *>(args), table, 2));
    EXPECT_EQ(custom_calls, 1);
    EXPECT_EQ(verbose, 1);
}

TEST(Getopt, FailedOptionStopsTheParseWithFourFrames)
{
    struct Row {
        std::vector<const char *> args;
        zv_status status;
        const char *handler;  // nullptr: process_option detects it
        const char *output;
    } rows[] = {
        {{"prog", "-o", "a", "-o", "b"}, ZV_ERR_BAD_VALUE, "zv_util_getopt_string", "a"},
        {{"prog", "-n", "abc", "-o", "x"}, ZV_ERR_BAD_VALUE, "zv_util_getopt_int", "(null)"},
        {{"prog", "-n", "2147483648"}, ZV_ERR_BAD_VALUE, "zv_util_getopt_int", "(null)"},
        {{"prog", "-f", "x"}, ZV_ERR_BAD_VALUE, "zv_util_getopt_flag", "(null)"},
        {{"prog", "-d", "x"}, ZV_ERR_NULL_ARG, "zv_util_getopt_string", "(null)"},
        {{"prog", "-h"}, ZV_ERR_NULL_ARG, nullptr, "(null)"},
    };
    for (const Row &row : rows) {
        Parse parse;
        int32_t flag = 0;
        // -f: a flag record that wants a value; -d: no destination; -h: no handler.
        const zv_util_option table[] = {parse.table[1], parse.table[2],
                                        {'f', "", zv_util_getopt_flag, &flag, 1},
                                        {'d', "", zv_util_getopt_string, nullptr, 1},
                                        {'h', "", nullptr, &flag, 0}};
        zvt::clear_trace();
        zv_status status = zv_util_getopt(static_cast<int32_t>(row.args.size()),
                                          const_cast<char *const *>(row.args.data()), table, 5);
        EXPECT_STATUS(row.status, status) << row.args[1];
        if (row.handler != nullptr)
            EXPECT_FRAMES({row.handler, row.status}, {"process_option", row.status},
                          {"zv_util_getopt_from", row.status}, {"zv_util_getopt_from", row.status});
        else
            EXPECT_FRAMES({"process_option", row.status}, {"zv_util_getopt_from", row.status},
                          {"zv_util_getopt_from", row.status});
        EXPECT_EQ(parse.text(), row.output);
        EXPECT_EQ(flag, 0);
    }
}

TEST(Getopt, ValueOptionAsLastArgumentIsMissing)
{
    Parse parse;
    zvt::LogCapture log;
    EXPECT_STATUS(ZV_ERR_SYSTEM, parse.run({"prog", "-v", "--count"}));
    EXPECT_EQ(parse.verbose, 1);  // options before the failure are stored
    EXPECT_FRAMES({"process_option", ZV_ERR_SYSTEM}, {"zv_util_getopt_from", ZV_ERR_SYSTEM},
                  {"zv_util_getopt_from", ZV_ERR_SYSTEM});
    ASSERT_TRUE(zvt::LogIs(log, {{3, "Missing mandatory option"}}));
    EXPECT_EQ(log.lines()[0].frames_before, 0u);
}

TEST(Getopt, ArgumentChecks)
{
    Parse parse;
    char *argv[] = {nullptr};
    struct Row {
        zv_status status;
        zv_status expected;
        const char *function;
    } rows[] = {
        {zv_util_getopt(1, nullptr, parse.table, 4), ZV_ERR_NULL_ARG, "zv_util_getopt"},
        {zv_util_getopt(1, argv, nullptr, 4), ZV_ERR_NULL_ARG, "zv_util_getopt"},
        {zv_util_getopt(0, argv, parse.table, 4), ZV_ERR_BAD_VALUE, "zv_util_getopt"},
        {zv_util_getopt(1, argv, parse.table, 0), ZV_ERR_BAD_VALUE, "zv_util_getopt"},
        {zv_util_getopt_from(1, nullptr, parse.table, 4, 0), ZV_ERR_NULL_ARG, "zv_util_getopt_from"},
        {zv_util_getopt_from(1, argv, parse.table, 4, -1), ZV_ERR_BAD_VALUE, "zv_util_getopt_from"},
        {zv_util_getopt_from(1, argv, parse.table, -1, 0), ZV_ERR_BAD_VALUE, "zv_util_getopt_from"},
    };
    std::vector<zvt::Frame> frames = zvt::frames();
    ASSERT_EQ(frames.size(), std::size(rows));
    for (size_t k = 0; k < std::size(rows); ++k) {
        EXPECT_STATUS(rows[k].expected, rows[k].status) << k;
        EXPECT_EQ(frames[k].function, rows[k].function) << k;
        EXPECT_STATUS(rows[k].expected, frames[k].status) << k;
    }
}

TEST(GetoptString, LengthLimitIsThreeHundred)
{
    std::string longest(300, 'x'), too_long(301, 'x');
    Parse parse;
    uint32_t consumed = 0;
    EXPECT_STATUS(ZV_OK, zv_util_getopt_string(&parse.table[1], longest.c_str(), &consumed));
    EXPECT_EQ(parse.text(), longest);
    EXPECT_EQ(consumed, 2u);
    Parse again;
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_getopt_string(&again.table[1], too_long.c_str(), &consumed));
    EXPECT_EQ(again.output, nullptr);
    EXPECT_STATUS(ZV_ERR_BAD_VALUE, zv_util_getopt_int(&again.table[2], too_long.c_str(), &consumed));
    EXPECT_FRAMES({"zv_util_getopt_string", ZV_ERR_BAD_VALUE}, {"zv_util_getopt_int", ZV_ERR_BAD_VALUE});
}

TEST(GetoptString, AllocationFailureReachesTheParse)
{
    zvt::sweep_allocations(
        [] {
            Parse parse;
            return parse.run({"prog", "-o", "x"}) == ZV_OK;
        },
        [](unsigned) {
            EXPECT_FRAMES({"zv_util_getopt_string", ZV_ERR_NO_MEMORY},
                          {"process_option", ZV_ERR_NO_MEMORY},
                          {"zv_util_getopt_from", ZV_ERR_NO_MEMORY},
                          {"zv_util_getopt_from", ZV_ERR_NO_MEMORY});
        });
}

}  // namespace
