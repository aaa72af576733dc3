// Splitting, joining and appending strings, and hexadecimal byte text.
#include <zvutil/hex.h>
#include <zvutil/string_ops.h>

#include <array>
#include <cstring>

#include "hex_pairs.h"
#include "internal.h"
#include "output_block.h"

namespace {

// The first field at or after |p|: whole separators are skipped, so runs of
// them collapse. NULL when only separators (or nothing) remain.
const char *next_field(const char *p, const char *end, const char *separator, size_t m)
{
    while (static_cast<size_t>(end - p) >= m && std::memcmp(p, separator, m) == 0)
        p += m;
    return p < end ? p : nullptr;
}

// Where the field starting at |field| ends: the next separator, or the end of
// the text. A field never starts with the separator, so the match lies after it.
const char *field_end(const char *field, const char *end, const char *separator)
{
    const char *next = std::strstr(field, separator);
    return next != nullptr ? next : end;
}

// Sums the lengths as the size check sees them: a separator after every
// string. ZV_ERR_OVERFLOW as soon as the total passes 32 bits.
zv_status measure_join(const char *const *strings, uint32_t count, size_t m, uint32_t *total)
{
    uint32_t sum = 0;
    for (uint32_t i = 0; i < count; i++) {
        size_t length = std::strlen(strings[i]);
        if (length > UINT32_MAX - sum)
            return ZV_ERR_OVERFLOW;
        sum += static_cast<uint32_t>(length);
        if (m > UINT32_MAX - sum)
            return ZV_ERR_OVERFLOW;
        sum += static_cast<uint32_t>(m);
    }
    *total = sum;
    return ZV_OK;
}

// Nibble value of each hexadecimal digit; kNotHex for every other character.
constexpr uint8_t kNotHex = 0x80;
constexpr auto kNibbles = zv::inverse_table("0123456789abcdef0123456789ABCDEF", 16, kNotHex);

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_split(const char *text, const char *separator, char ***fields_out,
                                  uint32_t *count_out)
{
    if (text == nullptr || separator == nullptr || fields_out == nullptr || count_out == nullptr)
        return ZV_LOG_FAIL(ZV_ERR_NULL_ARG, "NULL argument detected: %p %p %p %p\n",
                           static_cast<const void *>(text), static_cast<const void *>(separator),
                           static_cast<void *>(fields_out), static_cast<void *>(count_out));
    // An empty separator would match everywhere without advancing.
    if (*separator == '\0')
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    *count_out = 0;

    size_t m = std::strlen(separator);
    const char *end = text + std::strlen(text);
    uint32_t count = 0;
    const char *p = next_field(text, end, separator, m);
    for (; p != nullptr; p = next_field(field_end(p, end, separator), end, separator, m))
        count++;
    if (count == 0) {
        *fields_out = nullptr;
        return ZV_OK;
    }

    // On a 32-bit target a huge count would wrap the array size.
    size_t bytes;
    auto **fields = __builtin_mul_overflow(size_t{count}, sizeof(char *), &bytes)
                        ? nullptr
                        : static_cast<char **>(std::malloc(bytes));
    if (fields == nullptr) {
        *fields_out = nullptr;
        return ZV_LOG_FAIL(ZV_ERR_NO_MEMORY, "Memory allocation failed\n");
    }
    uint32_t made = 0;
    for (p = next_field(text, end, separator, m); p != nullptr;) {
        const char *stop = field_end(p, end, separator);
        char *field = zv::copy_text(p, static_cast<size_t>(stop - p));
        if (field == nullptr) {
            zv::free_array(fields, made);
            *fields_out = nullptr;
            return ZV_LOG_FAIL(ZV_ERR_NO_MEMORY, "Failed to allocate memory\n");
        }
        fields[made++] = field;
        p = next_field(stop, end, separator, m);
    }
    *fields_out = fields;
    *count_out = count;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_join(const char *const *strings, uint32_t count,
                                 const char *separator, char **out, uint32_t *size_out)
{
    if (strings == nullptr || separator == nullptr || out == nullptr || size_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    size_t m = std::strlen(separator);
    *size_out = 0;

    uint32_t size = 1;
    if (count > 0) {
        uint32_t total = 0;
        zv_status status = measure_join(strings, count, m, &total);
        if (status != ZV_OK)
            return ZV_FAIL(status);
        // Only an empty separator leaves no room here for the terminator.
        if (total - m == UINT32_MAX)
            return ZV_FAIL(ZV_ERR_OVERFLOW);
        size = static_cast<uint32_t>(total - m + 1);
    }
    *size_out = size;

    auto *joined = static_cast<char *>(std::calloc(1, size));
    *out = joined;
    if (joined == nullptr)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    if (count > 0) {
        char *at = stpcpy(joined, strings[0]);
        for (uint32_t i = 1; i < count; i++) {
            std::memcpy(at, separator, m);
            at = stpcpy(at + m, strings[i]);
        }
    }
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_append_string(char **buffer, uint32_t *length, const char *text,
                                          uint32_t n)
{
    if (buffer == nullptr || length == nullptr || text == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    // An existing string is never empty.
    if (n == 0 || (*buffer != nullptr && *length == 0))
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    uint32_t old_length = *buffer != nullptr ? *length : 0;
    // The new length and its terminator must fit 32 bits.
    if (uint64_t{old_length} + n > UINT32_MAX - 1u)
        return ZV_FAIL(ZV_ERR_OVERFLOW);

    // Always a new block of exactly the new size; exactly n bytes of text.
    uint32_t new_length = old_length + n;
    auto *grown = static_cast<char *>(std::malloc(new_length + 1));
    if (grown == nullptr)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    if (old_length > 0)
        std::memcpy(grown, *buffer, old_length);
    std::memcpy(grown + old_length, text, n);
    grown[new_length] = '\0';
    std::free(*buffer);
    *buffer = grown;
    *length = new_length;
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_sprintf_bytes(const void *bytes, uint32_t n, char **out)
{
    // From 2^31 bytes on, 2 * n + 1 does not fit 32 bits.
    auto *text = n < 0x80000000u ? static_cast<char *>(zv::malloc_output(2 * n + 1)) : nullptr;
    *out = text;
    if (text == nullptr)
        return ZV_LOG_FAIL(ZV_ERR_NO_MEMORY, "Allocation failed\n");
    zv::put_hex_pairs(text, static_cast<const uint8_t *>(bytes), n);
    text[2 * n] = '\0';
    return ZV_OK;
}

ZV_EXPORT zv_status zv_util_sscanf_bytes(const char *text, uint32_t length, uint8_t **out)
{
    uint32_t k = length / 2;
    zv::unique_malloc<uint8_t> bytes(static_cast<uint8_t *>(std::malloc(k)));
    *out = nullptr;
    if (!bytes)
        return ZV_LOG_FAIL(ZV_ERR_NO_MEMORY, "Allocation failed\n");
    const auto *digits = reinterpret_cast<const unsigned char *>(text);
    for (uint32_t i = 0; i < k; i++) {
        uint8_t high = kNibbles[digits[2 * i]], low = kNibbles[digits[2 * i + 1]];
        if (((high | low) & kNotHex) != 0)
            return ZV_FAIL(ZV_ERR_BAD_VALUE);
        bytes.get()[i] = static_cast<uint8_t>(high << 4 | low);
    }
    *out = bytes.release();
    return ZV_OK;
}

}  // extern "C"
