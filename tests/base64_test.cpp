// Base64 text.
#include <gtest/gtest.h>

#include <cctype>
#include <cerrno>
#include <cstdlib>
#include <string>

#include "support/fault.h"
#include "support/trace.h"
#include <zvutil/base64.h>
#include <zvutil/memory.h>

namespace {

std::string encode(const std::string &bytes)
{
    char *text = nullptr;
    uint32_t length = 0;
    EXPECT_EQ(zv_util_base64_encode(bytes.data(), bytes.size(), &text, &length), ZV_OK);
    std::string result(text, length);
    std::free(text);
    return result;
}

std::string decode(const std::string &text)
{
    uint8_t *bytes = nullptr;
    uint32_t length = 0;
    EXPECT_EQ(zv_util_base64_decode(text.data(), text.size(), &bytes, &length), ZV_OK);
    std::string result(reinterpret_cast<char *>(bytes), length);
    std::free(bytes);
    return result;
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
