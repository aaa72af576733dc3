// The current local time as one line of text.
#include <zvutil/timeutil.h>

#include <cstring>
#include <ctime>

#include "internal.h"

namespace {

// ctime_r writes 24 characters, a newline and a NUL.
constexpr uint32_t kCtimeSize = 26;

}  // namespace

extern "C" {

ZV_EXPORT zv_status zv_util_now_str(char *text, uint32_t *text_length, int32_t *errno_out)
{
    if (text == nullptr || text_length == nullptr)
        return ZV_FAIL(ZV_ERR_NULL_ARG);
    if (*text_length < kCtimeSize)
        return ZV_FAIL(ZV_ERR_BAD_VALUE);

    time_t now = time(nullptr);
    if (now == static_cast<time_t>(-1))
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    // A failed rendering may leave anything in the buffer, even without a
    // terminator: hand back the empty string instead.
    if (ctime_r(&now, text) == nullptr) {
        text[0] = '\0';
        return ZV_ERRNO_FAIL(ZV_ERR_SYSTEM, errno_out);
    }

    uint32_t length = static_cast<uint32_t>(strnlen(text, kCtimeSize));
    if (length > 0 && text[length - 1] == '\n')
        text[--length] = '\0';
    *text_length = length;
    return ZV_OK;
}

}  // extern "C"
