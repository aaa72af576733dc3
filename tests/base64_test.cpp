// Base64 text.
#include <gtest/gtest.h>

#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include "support/fault.h"
#include "support/feature_paths.h"
#include "support/trace.h"
#include <zvutil/base64.h>
#include <zvutil/memory.h>

namespace {

// The input |offset| bytes into an allocation that ends where it ends, so a
// read past it is caught by the sanitizer.
template <typename Call>
std::string at_offset(const std::string &input, size_t offset, Call call)
{
    std::unique_ptr<char[]> block(new char[offset + input.size()]);
    std::memcpy(block.get() + offset, input.data(), input.size());
    return call(block.get() + offset, static_cast<uint32_t>(input.size()));
}

std::string encode(const std::string &bytes, size_t offset = 0)
{
    return at_offset(bytes, offset, [](const char *in, uint32_t n) {
        char *text = nullptr;
        uint32_t length = 0;
        EXPECT_EQ(zv_util_base64_encode(in, n, &text, &length), ZV_OK);
        std::string result(text, length);
        std::free(text);
        return result;
    });
}

std::string decode(const std::string &text, size_t offset = 0)
{
    return at_offset(text, offset, [](const char *in, uint32_t n) {
        uint8_t *bytes = nullptr;
        uint32_t length = 0;
        EXPECT_EQ(zv_util_base64_decode(in, n, &bytes, &length), ZV_OK);
        std::string result(reinterpret_cast<char *>(bytes), length);
        std::free(bytes);
        return result;
    });
}

TEST(Base64, Vectors)
{
    // RFC 4648 section 10, then both ends of the alphabet.
    const std::pair<std::string, std::string> rows[] = {
        {"", ""},         {"f", "Zg=="},         {"fo", "Zm8="},         {"foo", "Zm9v"},
        {"foob", "Zm9vYg=="}, {"fooba", "Zm9vYmE="}, {"foobar", "Zm9vYmFy"}, {"\xfb\xff", "+/8="}};
    for (const auto &[bytes, text] : rows) {
        EXPECT_EQ(encode(bytes), text);
        EXPECT_EQ(zv_util_to_base64_size(bytes.size()), text.size());
        EXPECT_EQ(decode(text), bytes);
        EXPECT_EQ(decode(text.substr(0, text.find('='))), bytes) << "unpadded " << text;
    }
    EXPECT_EQ(zv_util_to_base64_size(3221225469u), 4294967292u);
    EXPECT_EQ(zv_util_to_base64_size(3221225470u), 0u);
}

TEST(Base64, DecodingSkipsLineBreaksAndJunk)
{
    std::string bytes, junk, wrapped, salted;
    for (int c = 0; c < 256; c++) {
        bytes += static_cast<char>(c);
        if (!std::isalnum(c) && c != '+' && c != '/')
            junk += static_cast<char>(c);  // '=' and NUL among them
    }
    std::string text = encode(bytes);
    for (size_t i = 0; i < text.size(); i += 76)
        wrapped += text.substr(i, 76) + "\r\n";
    for (size_t i = 0; i < text.size(); i++)
        salted += junk.substr(i % junk.size(), i % 5) + text[i];
    EXPECT_EQ(decode(wrapped), bytes);
    EXPECT_EQ(decode(salted + junk), bytes);
    EXPECT_EQ(decode("Zm9vY"), "foo") << "a lone final value carries no byte";
    EXPECT_EQ(decode("Zh=="), "f") << "unused low bits are dropped";
}

constexpr char kAlphabet[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";

// Both directions written plainly, one byte or character at a time.
std::string plain_encode(const std::string &bytes)
{
    std::string text;
    for (size_t i = 0; i < bytes.size(); i += 3) {
        uint32_t group = 0;
        for (size_t k = 0; k < 3; k++)
            group = group << 8 | (i + k < bytes.size() ? static_cast<uint8_t>(bytes[i + k]) : 0);
        for (size_t k = 0; k < 4; k++)
            text += k <= bytes.size() - i ? kAlphabet[group >> (18 - 6 * k) & 63] : '=';
    }
    return text;
}

std::string plain_decode(const std::string &text)
{
    std::string bytes;
    uint32_t group = 0, held = 0;
    for (char c : text) {
        const char *at = c != '\0' ? std::strchr(kAlphabet, c) : nullptr;
        if (at == nullptr)
            continue;
        group = group << 6 | static_cast<uint32_t>(at - kAlphabet);
        if (++held == 4) {
            bytes += {static_cast<char>(group >> 16), static_cast<char>(group >> 8), static_cast<char>(group)};
            group = held = 0;
        }
    }
    if (held == 3)
        bytes += {static_cast<char>(group >> 10), static_cast<char>(group >> 2)};
    if (held == 2)
        bytes += static_cast<char>(group >> 4);
    return bytes;
}

std::vector<size_t> lengths()
{
    std::vector<size_t> all;
    for (size_t n = 0; n < 200; n++)
        all.push_back(n);
    for (size_t n : {255, 256, 1000, 1023, 1024, 4097})
        all.push_back(n);
    return all;
}

TEST(Base64, EveryPathEncodesAsThePlainCoder)
{
    std::mt19937 random(1);
    std::string bytes(4097, '\0');
    for (char &b : bytes)
        b = static_cast<char>(random());
    zvt::for_each_feature_path([&](uint32_t path) {
        for (size_t n : lengths()) {
            std::string part = bytes.substr(n % 7, n);
            for (size_t offset : {0, 1, 3})
                ASSERT_EQ(encode(part, offset), plain_encode(part)) << path << " " << n;
        }
    });
}

TEST(Base64, EveryPathDecodesAsThePlainDecoder)
{
    // Alphabet characters mixed with junk at several densities: '=' and line
    // breaks most often, any byte value (NUL and >= 0x80 included) besides.
    std::mt19937 random(2);
    auto text_of = [&](size_t n, unsigned junk_percent) {
        std::string text;
        while (text.size() < n) {
            unsigned roll = random() % 100, kind = random() % 4;
            if (roll >= junk_percent)
                text += kAlphabet[random() % 64];
            else
                text += kind == 0 ? '=' : kind == 1 ? '\n' : kind == 2 ? '\r' : static_cast<char>(random());
        }
        return text;
    };
    std::vector<std::string> texts;
    for (size_t n : lengths())
        for (unsigned junk : {0, 1, 10, 50, 100})
            texts.push_back(text_of(n, junk));
    // Each byte value at the start, middle and end of a vector block.
    for (int c = 0; c < 256; c++)
        for (size_t at : {0, 15, 16, 31, 47})
            texts.push_back(text_of(64, 0).replace(at, 1, 1, static_cast<char>(c)));
    zvt::for_each_feature_path([&](uint32_t path) {
        for (size_t k = 0; k < texts.size(); k++)
            ASSERT_EQ(decode(texts[k], k % 4), plain_decode(texts[k])) << path << " " << texts[k];
    });
}

TEST(Base64, FailuresAreSilent)
{
    char *text = reinterpret_cast<char *>(1);
    uint32_t length = 7;
    zvt::fault_arm("alloc", 1, ENOMEM);
    EXPECT_STATUS(ZV_ERR_NO_MEMORY, zv_util_base64_encode("", 3221225470u, &text, &length));
    EXPECT_EQ(zvt::fault_calls("alloc"), 0u) << "text beyond 32 bits: refused before allocating";
    zvt::fault_clear();
    EXPECT_EQ(text, reinterpret_cast<char *>(1));
    EXPECT_EQ(length, 7u);

    zv_status status;
    for (bool encoding : {true, false})
        zvt::sweep_allocations(
            [&] {
                text = reinterpret_cast<char *>(1);
                status = encoding ? zv_util_base64_encode("f", 1, &text, &length)
                                  : zv_util_base64_decode("Zg", 2, reinterpret_cast<uint8_t **>(&text),
                                                          &length);
                zv_util_free(status == ZV_OK ? &text : nullptr);
                return status == ZV_OK;
            },
            [&](unsigned) {
                EXPECT_STATUS(ZV_ERR_NO_MEMORY, status);
                EXPECT_EQ(text, nullptr);
                EXPECT_NO_FRAMES();
            });
}

}  // namespace
