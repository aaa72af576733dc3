// Multibyte to wide conversion under the caller's LC_CTYPE locale.
#include <zvutil/convert.h>

#include <cwchar>

#include "internal.h"

extern "C" {

ZV_EXPORT zv_status zv_util_char_to_wchar(const char *text, uint32_t ignored, wchar_t **out,
                                          uint32_t *count_out)
{
    (void)ignored;
    if (text == nullptr || out == nullptr || count_out == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    std::mbstate_t state{};
    const char *source = text;
    size_t count = std::mbsrtowcs(nullptr, &source, 0, &state);
    *count_out = static_cast<uint32_t>(count);
    if (count == static_cast<size_t>(-1))
        return ZV_FAIL(ZV_ERR_BAD_VALUE);

    zv::unique_malloc<wchar_t> wide(static_cast<wchar_t *>(std::calloc(count + 1, sizeof(wchar_t))));
    *out = nullptr;
    if (!wide)
        return ZV_FAIL(ZV_ERR_NO_MEMORY);
    source = text;
    size_t converted = std::mbsrtowcs(wide.get(), &source, count + 1, &state);
    *count_out = static_cast<uint32_t>(converted);
    if (converted == static_cast<size_t>(-1))
        return ZV_FAIL(ZV_ERR_BAD_VALUE);
    // The source pointer becomes NULL once the terminator has been converted.
    if (source != nullptr)
        return ZV_FAIL(ZV_ERR_TOO_SMALL);
    *out = wide.release();
    return ZV_OK;
}

}  // extern "C"
