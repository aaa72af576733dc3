// The duration printer at every buffer size, each a heap block of exactly
// that size: every output is the whole text cut to the buffer, and the whole
// text is a number and a unit.
#include "fuzz.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    double seconds = 0;
    std::memcpy(&seconds, data, size < sizeof seconds ? size : sizeof seconds);
    char whole[400];
    zv_util_snprintf_human_time(whole, sizeof whole, seconds);
    const std::string text = whole, unit = text.substr(text.find(' ') + 1);
    const char *units = " second seconds minute minutes hour hours day days ";
    CHECK(std::strstr(units, (' ' + unit + ' ').c_str()) != nullptr);
    for (size_t k = 0; k <= text.size() + 1; ++k) {
        std::vector<char> buffer(k);
        zv_util_snprintf_human_time(buffer.data(), static_cast<int32_t>(k), seconds);
        CHECK(k == 0 || buffer.data() == text.substr(0, k - 1));
    }
    return 0;
}
