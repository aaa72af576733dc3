// Split then join: the input is a separator of one to four bytes (its first
// byte says how long) and a text. The fields are non-empty and hold no
// separator, together they are the text less its separators, and they join
// with the separator between each two.
#include "fuzz.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    const size_t k = size != 0 ? 1 + data[0] % 4u : 0;
    if (size < 1 + k || data[1] == 0)
        return 0;
    const auto *chars = reinterpret_cast<const char *>(data);
    const std::string separator = std::string(chars + 1, k).c_str();
    std::string text = std::string(chars + 1 + k, size - 1 - k).c_str(), together, joined;
    char **fields, *out;
    uint32_t count, out_size;
    // No field gives a NULL array, which the join refuses even to join none.
    CHECK(zv_util_split(text.c_str(), separator.c_str(), &fields, &count) == ZV_OK &&
          zv_util_join(count != 0 ? fields : &out, count, separator.c_str(), &out, &out_size) == 0);
    for (size_t at = 0; (at = text.find(separator, at)) != std::string::npos;)
        text.erase(at, separator.size());
    for (uint32_t i = 0; i < count; ++i) {
        CHECK(fields[i][0] != '\0' && std::strstr(fields[i], separator.c_str()) == nullptr);
        together += fields[i];
        joined += (i != 0 ? separator : std::string()) + fields[i];
        std::free(fields[i]);
    }
    CHECK(together == text && out == joined && out_size == joined.size() + 1);
    std::free(fields);
    std::free(out);
    return 0;
}
