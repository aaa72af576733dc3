// Multibyte conversion. Besides failing outright ("mbsrtowcs"), a conversion
// into a buffer can be cut one wide character short ("mbsrtowcs_short"), the
// way a locale changed between measuring and converting would.
#include <cstddef>
#include <cwchar>

#include "support/fault.h"

extern "C" {

size_t __real_mbsrtowcs(wchar_t *dst, const char **src, size_t len, mbstate_t *ps);

size_t __wrap_mbsrtowcs(wchar_t *dst, const char **src, size_t len, mbstate_t *ps)
{
    if (zvt::fault_hit("mbsrtowcs"))
        return static_cast<size_t>(-1);
    if (dst != nullptr && len > 0 && zvt::fault_hit("mbsrtowcs_short"))
        return __real_mbsrtowcs(dst, src, len - 1, ps);
    return __real_mbsrtowcs(dst, src, len, ps);
}

}  // extern "C"
