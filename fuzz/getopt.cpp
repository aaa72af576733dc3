// The option parser over a fixed table and any argument vector (the input's
// NUL-separated pieces): a known status and the vector unchanged.
#include "fuzz.h"

static char *name;
static int32_t count, flag;
static const zv_util_option kTable[] = {
    {'n', "name", zv_util_getopt_string, &name, 1}, {'c', "count", zv_util_getopt_int, &count, 1},
    {'v', "verbose", zv_util_getopt_flag, &flag, 0}, {'w', "wrong", zv_util_getopt_flag, &flag, 1},
    {'z', "unhandled", nullptr, &flag, 0},
};

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    std::string text = std::string(reinterpret_cast<const char *>(data), size) + '\0';
    const std::string original = text;
    std::vector<char *> argv;
    for (size_t at = 0; at < text.size(); at += std::strlen(&text[at]) + 1)
        argv.push_back(&text[at]);
    zv_status status = zv_util_getopt(static_cast<int32_t>(argv.size()), argv.data(), kTable, 5);
    CHECK(text == original && (status == ZV_OK || status == ZV_ERR_BAD_VALUE ||
                               status == ZV_ERR_SYSTEM || status == ZV_ERR_NULL_ARG));
    zv_util_free(&name);
    return 0;
}
