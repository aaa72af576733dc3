// Any text decodes like a plain bit accumulator that skips every character
// outside the alphabet; any bytes encode to text that decodes back to them.
#include "fuzz.h"

static const char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    zv::cpu::restrict((1u << size % 5) - 1);
    std::string expected;
    uint32_t bits = 0, held = 0;
    for (size_t i = 0; i < size; ++i) {
        const auto *at = static_cast<const char *>(std::memchr(kAlphabet, data[i], 64));
        bits = at != nullptr ? bits << 6 | static_cast<uint32_t>(at - kAlphabet) : bits;
        if (at != nullptr && (held += 6) >= 8)
            expected += static_cast<char>(bits >> (held -= 8));
    }
    uint8_t *bytes;
    char *text;
    uint32_t n, length;
    CHECK(zv_util_base64_decode(reinterpret_cast<const char *>(data), size, &bytes, &n) == ZV_OK &&
          std::string(reinterpret_cast<char *>(bytes), n) == expected);
    std::free(bytes);
    CHECK(zv_util_base64_encode(data, size, &text, &length) == ZV_OK &&
          length == zv_util_to_base64_size(size) &&
          zv_util_base64_decode(text, length, &bytes, &n) == ZV_OK &&
          std::string(reinterpret_cast<char *>(bytes), n) == std::string(data, data + size));
    std::free(text);
    std::free(bytes);
    return 0;
}
