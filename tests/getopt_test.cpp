// Option table parser: matching rules, handlers and failure frames.
#include "support/zvt.h"

namespace {

// Values of 300 and 301 characters that would convert.
const std::string k300 = std::string(297, ' ') + "-42", k301 = " " + k300;
const std::string kLong = "--" + std::string(31, 'L');
int32_t verbose, number;
char *output;

// Flag, string and integer options; -f is a flag that wants a value; the last
// long name comes to fill its array without a terminator, and is followed by
// the zero bytes of a NULL handler.
zv_util_option table[] = {
    {'v', "verbose", zv_util_getopt_flag, &verbose, 0},
    {'o', "output", zv_util_getopt_string, &output, 1},
    {'n', "count", zv_util_getopt_int, &number, 1},
    {'f', "", zv_util_getopt_flag, &verbose, 1},
    {'\0', "LLLLLLLLLLLLLLLLLLLLLLLLLLLLLL", nullptr, &number, 0}};

// Parses |args| with the first |count| records on fresh destinations: the
// status, then the destinations as "verbose number output".
using Parsed = std::pair<zv_status, std::string>;
Parsed parse(std::vector<const char *> args, int32_t count = 5)
{
    verbose = 0, number = -1, output = nullptr, table[4].long_name[30] = 'L';
    auto *argv = const_cast<char *const *>(args.data());
    Parsed result{
        zv_util_getopt(static_cast<int32_t>(args.size()), argv, table, count),
        std::to_string(verbose) + " " + std::to_string(number) + " " + (output ?: "-")};
    zv_util_free(&output);
    return result;
}

TEST(Getopt, FormsHandlersAndFailures)
{
    for (auto [args, expected] :
         std::initializer_list<std::pair<std::vector<const char *>, std::string>>{
             {{"-v"}, "0 -1 -"},  // the program's name is not parsed
             {{"prog", "/v", "--output", k300.c_str(), "-count", k300.c_str()}, "1 -42 " + k300},
             {{"prog", nullptr, "-v"}, "1 -1 -"},  // a NULL entry is passed over
             {{"prog", "--verbose", "/output", "-v", "/n", "2147483647", "-n", "-2147483648x"},
              "1 -2147483648 -v"},  // values taken unchanged
             {{"prog", "--Verbose", "--verb", "-vo", "-", "/", "xv", "-z", "--zzz", kLong.c_str()},
              "0 -1 -"}})
        EXPECT_EQ(parse(args), Parsed(ZV_OK, expected));

    const std::string tail = ",process_option,zv_util_getopt_from,zv_util_getopt_from";
    const std::string str = "zv_util_getopt_string" + tail, num = "zv_util_getopt_int" + tail;
    const zv_status bad = ZV_ERR_BAD_VALUE, null = ZV_ERR_NULL_ARG;
    char flag[] = "-v", *argv[] = {flag, nullptr};
    uint32_t used, consumed[3];
    const zv_util_option no_handler{'v', "", nullptr, &number, 0};
    zvt::expect_failures({
        {str.c_str(), bad, ZVT_CALL(parse({"prog", "-o", k301.c_str()}).first)},
        {str.c_str(), bad, ZVT_CALL(parse({"prog", "-o", "a", "/o", "b"}).first)},  // given twice
        {num.c_str(), bad, ZVT_CALL(parse({"prog", "-n", k301.c_str()}).first)},
        {num.c_str(), bad, ZVT_CALL(parse({"prog", "-n", "-2147483649"}).first)},
        {("zv_util_getopt_flag" + tail).c_str(), bad, ZVT_CALL(parse({"prog", "-f", "x"}).first)},
        {tail.c_str() + 1, ZV_ERR_SYSTEM, ZVT_CALL(parse({"prog", "-o", "a", "--count"}).first),
         nullptr, 1, zvt::kUntouched, "Missing mandatory option"},
        ROW(null, getopt, (1, nullptr, table, 1)), ROW(bad, getopt, (0, argv, table, 1)),
        ROW(null, getopt_from, (1, argv, nullptr, 1, 0)),
        ROW(bad, getopt_from, (1, argv, table, 0, 0)),
        ROW(bad, getopt_from, (0, argv, table, 1, 0)),
        {"", ZV_OK, ZVT_CALL(zv_util_getopt_from(1, argv, table, 1, 0))},
        {tail.c_str() + 1, null, ZVT_CALL(zv_util_getopt_from(1, argv, &no_handler, 1, 0))},
        // Handlers on their own refuse a NULL inside their checks.
        ROW(null, getopt_string, (&table[1], nullptr, &used)),
        ROW(null, getopt_int, (&table[2], nullptr, &used)),
        ROW(null, getopt_flag, (&table[0], nullptr, nullptr))});
    zvt::sweep_allocations(ZVT_CALL(parse({"prog", "-o", "a"}).first), {{str.c_str()}});
    EXPECT_OK(zv_util_getopt_string(&table[1], "7", &consumed[0]),
              zv_util_getopt_int(&table[2], "7", &consumed[1]),
              zv_util_getopt_flag(&table[0], nullptr, &consumed[2]));
    // The arguments each handler consumed.
    EXPECT_EQ(std::vector(consumed, consumed + 3), (std::vector{2u, 2u, 1u}));
    std::free(output);
    // Records past the count are never looked at.
    EXPECT_EQ(parse({"prog", "--output", "x", "-o", "x"}, 1), Parsed(ZV_OK, "0 -1 -"));
}

}  // namespace
