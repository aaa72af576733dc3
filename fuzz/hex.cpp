// Hex text: a text parses exactly when each pair is two hex digits (an odd
// last character ignored) and prints back in lower case; any bytes print to
// text that parses back to them.
#include <cctype>

#include "fuzz.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    zv::cpu::restrict((1u << size % 5) - 1);
    std::string lower(data, data + (size & ~size_t{1}));
    const bool valid = std::strspn(lower.c_str(), "0123456789abcdefABCDEF") == lower.size();
    for (char &c : lower)
        c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
    uint8_t *bytes;
    char *printed;
    zv_status status = zv_util_sscanf_bytes(reinterpret_cast<const char *>(data), size, &bytes);
    CHECK(status == (valid ? ZV_OK : ZV_ERR_BAD_VALUE));
    if (status == ZV_OK) {
        CHECK(zv_util_sprintf_bytes(bytes, size / 2, &printed) == ZV_OK && printed == lower);
        std::free(printed);
        std::free(bytes);
    }
    CHECK(zv_util_sprintf_bytes(data, size, &printed) == ZV_OK &&
          std::strlen(printed) == 2 * size &&
          zv_util_sscanf_bytes(printed, 2 * size, &bytes) == ZV_OK &&
          std::memcmp(bytes, data, size) == 0);
    std::free(printed);
    std::free(bytes);
    return 0;
}
