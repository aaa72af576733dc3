// Memory and bounded string primitives: thin, frame-free wrappers over glibc.
#include <zvutil/memory.h>

#include <cstdarg>
#include <cstring>

#include "internal.h"

extern "C" {

ZV_EXPORT void zv_util_free(void *pointer_address)
{
    if (pointer_address == nullptr)
        return;
    // memcpy keeps this well-defined for any pointer type the caller passes.
    void *block;
    std::memcpy(&block, pointer_address, sizeof block);
    std::free(block);
    block = nullptr;
    std::memcpy(pointer_address, &block, sizeof block);
}

ZV_EXPORT int32_t zv_util_getline(FILE *stream, char **line, uint32_t *capacity)
{
    size_t wide_capacity = *capacity;
    ssize_t n = getline(line, &wide_capacity, stream);
    *capacity = wide_capacity > UINT32_MAX ? UINT32_MAX : static_cast<uint32_t>(wide_capacity);
    return static_cast<int32_t>(n);
}

ZV_EXPORT int32_t zv_util_snprintf(char *buffer, int32_t size, const char *format, ...)
{
    if (size < 0)
        return -1;
    va_list args;
    va_start(args, format);
    int n = std::vsnprintf(buffer, static_cast<size_t>(size), format, args);
    va_end(args);
    // Negative n (a formatting error) also fails this test.
    return size > n ? n : -1;
}

ZV_EXPORT uint32_t zv_util_strnlen(const char *string, uint32_t maximum)
{
    return static_cast<uint32_t>(strnlen(string, maximum));
}

ZV_EXPORT char *zv_util_strndup(const char *string, uint32_t maximum)
{
    return strndup(string, maximum);
}

ZV_EXPORT char *zv_util_strncpy(char *destination, const char *source, uint32_t length)
{
    return std::strncpy(destination, source, length);
}

ZV_EXPORT void *zv_util_memmem(const void *haystack, uint32_t haystack_length,
                               const void *needle, uint32_t needle_length)
{
    return memmem(haystack, haystack_length, needle, needle_length);
}

ZV_EXPORT void *zv_util_memdup(const void *source, uint32_t size)
{
    if (source == nullptr)
        return nullptr;
    void *copy = std::calloc(1, size);
    if (copy != nullptr)
        std::memcpy(copy, source, size);
    return copy;
}

ZV_EXPORT void *zv_util_memdup0(const void *source, uint32_t size)
{
    // The terminator must fit in the 32-bit size as well.
    if (source == nullptr || size == UINT32_MAX)
        return nullptr;
    return zv::copy_text(static_cast<const char *>(source), size);
}

ZV_EXPORT int32_t zv_util_strcasecmp(const char *first, const char *second)
{
    return strcasecmp(first, second);
}

ZV_EXPORT zv_status zv_util_str_replace(char *string, uint32_t maximum, char find,
                                        char replacement)
{
    if (string == nullptr)
        return ZV_OK;
    // The walk is bounded by the original text: a NUL replacement shortens the
    // string but does not stop the walk.
    uint32_t length = static_cast<uint32_t>(strnlen(string, maximum));
    for (uint32_t i = 0; i < length; i++) {
        if (string[i] == find)
            string[i] = replacement;
    }
    return ZV_OK;
}

}  // extern "C"
