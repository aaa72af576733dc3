// Option table parser: matching rules, handlers and failure frames.
#include <tuple>
#include <vector>

#include "support/scratch.h"
#include <zvutil/getopt.h>

namespace {

using Args = std::vector<const char *>;
// Values of 300 and 301 characters that would convert.
const std::string k300 = std::string(297, ' ') + "-42", k301 = " " + k300;
const std::string kUnterminated = "--" + std::string(31, 'L');
int32_t verbose, number, other;
char *output, state[400];

// Flag, string and integer options; -f is a flag that wants a value, -h a
// record without a handler; the last long name comes to fill its array.
zv_util_option table[] = {
    {'v', "verbose", zv_util_getopt_flag, &verbose, 0},
    {'o', "output", zv_util_getopt_string, &output, 1},
    {'n', "count", zv_util_getopt_int, &number, 1},
    {'v', "verbose", zv_util_getopt_flag, &other, 0},  // first match wins
    {'f', "", zv_util_getopt_flag, &other, 1},
    {'h', "", nullptr, &other, 0},
    {'\0', "LLLLLLLLLLLLLLLLLLLLLLLLLLLLLL", nullptr, &other, 0}};

// Parses |args| from |start| on fresh destinations, which |state| then shows.
zv_status parse(Args args, int32_t start = 1)
{
    verbose = other = 0, number = -1, output = nullptr, table[6].long_name[30] = 'L';
    auto *argv = const_cast<char *const *>(args.data());
    const auto argc = static_cast<int32_t>(args.size());
    zv_status status = start == 1 ? zv_util_getopt(argc, argv, table, 7)  // adds no frame
                                  : zv_util_getopt_from(argc, argv, table, 7, start);
    std::snprintf(state, sizeof state, "%d %d %s %d", verbose, number, output ?: "-", other);
    std::free(output);
    return status;
}

TEST(Getopt, MatchesShortAndLongForms)
{
    for (auto [args, start, expected] : std::initializer_list<std::tuple<Args, int, std::string>>{
             {{"-v"}, 1, "0 -1 - 0"},
             {{"/v"}, 0, "1 -1 - 0"},
             {{"prog", "--verbose", "-output", "a", "/count", "5"}, 1, "1 5 a 0"},
             {{"prog", "--Verbose", "--verb", "-vo", "-", "/", "xv", "-z", "--zzz",
               kUnterminated.c_str()}, 1, "0 -1 - 0"},
             {{"prog", "--output", k300.c_str(), "-n", k300.c_str()}, 1, "0 -42 " + k300 + " 0"},
             {{"prog", "-o", "-v", "-n", "2147483647", "-n", "-2147483648x"}, 1,
              "0 -2147483648 -v 0"}}) {
        EXPECT_EQ(parse(args, start), ZV_OK);
        EXPECT_EQ(state, expected);
    }
    EXPECT_NO_FRAMES();
}

TEST(Getopt, Failures)
{
    const std::string tail = ",process_option,zv_util_getopt_from,zv_util_getopt_from";
    const std::string str = "zv_util_getopt_string" + tail, num = "zv_util_getopt_int" + tail,
                      flag = "zv_util_getopt_flag" + tail;
    const zv_status bad = ZV_ERR_BAD_VALUE, null = ZV_ERR_NULL_ARG;
    char *argv[] = {table[0].long_name, nullptr}, *text = nullptr;
    uint32_t used = 0;
    const zv_util_option to_text{'s', "", zv_util_getopt_string, &text, 1},
        to_number{'i', "", zv_util_getopt_int, &number, 1}, set{'f', "", zv_util_getopt_flag, &number, 0};
    zvt::expect_failures({
        {str.c_str(), bad, ZVT_CALL(parse({"prog", "-o", "a", "-o", "b"}))},
        {str.c_str(), bad, ZVT_CALL(parse({"prog", "-o", k301.c_str()}))},
        {str.c_str(), ZV_ERR_NO_MEMORY, ZVT_CALL(parse({"prog", "-o", "a"})), "alloc"},
        {num.c_str(), bad, ZVT_CALL(parse({"prog", "-n", k301.c_str()}))},
        {num.c_str(), bad, ZVT_CALL(parse({"prog", "-n", "-2147483649"}))},
        {flag.c_str(), bad, ZVT_CALL(parse({"prog", "-f", "x"}))},
        {tail.c_str() + 1, null, ZVT_CALL(parse({"prog", "-h"}))},
        {tail.c_str() + 1, ZV_ERR_SYSTEM, ZVT_CALL(parse({"prog", "-o", "a", "--count"})), nullptr, 1,
         zvt::kUntouched, "Missing mandatory option"},
        {"zv_util_getopt", null, ZVT_CALL(zv_util_getopt(1, nullptr, table, 1))},
        {"zv_util_getopt", bad, ZVT_CALL(zv_util_getopt(0, argv, table, 1))},
        {"", ZV_OK, ZVT_CALL(zv_util_getopt(1, argv, table, 1))},
        {"zv_util_getopt_from", null, ZVT_CALL(zv_util_getopt_from(1, argv, nullptr, 1, 0))},
        {"zv_util_getopt_from", bad, ZVT_CALL(zv_util_getopt_from(1, argv, table, 0, 0))},
        {"", ZV_OK, ZVT_CALL(zv_util_getopt_from(1, argv, table, 1, 0))},
        // Handlers on their own: each NULL inside the checks is refused.
        {"zv_util_getopt_string", null, ZVT_CALL(zv_util_getopt_string(&to_text, nullptr, &used))},
        {"zv_util_getopt_string", null, ZVT_CALL(zv_util_getopt_string(&to_text, "7", nullptr))},
        {"zv_util_getopt_int", null, ZVT_CALL(zv_util_getopt_int(&to_number, nullptr, &used))},
        {"zv_util_getopt_int", null, ZVT_CALL(zv_util_getopt_int(&to_number, "7", nullptr))},
        {"zv_util_getopt_flag", null, ZVT_CALL(zv_util_getopt_flag(&set, nullptr, nullptr))},
    });
    // What each handler says it consumed.
    uint32_t consumed[3] = {};
    EXPECT_EQ(zv_util_getopt_string(&to_text, "7", &consumed[0]) |
                  zv_util_getopt_int(&to_number, "7", &consumed[1]) |
                  zv_util_getopt_flag(&set, nullptr, &consumed[2]), ZV_OK);
    EXPECT_EQ(std::vector(consumed, consumed + 3), (std::vector<uint32_t>{2, 2, 1}));
    std::free(text);
}

}  // namespace
