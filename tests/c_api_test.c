/* A C99 caller: every public header compiles as C, and a program linked with
 * the shared object, and no C++ runtime, runs. */
#include <zvutil/zvutil.h>

#include <zverrortrace.h>
#include <zvlog.h>

#include <stdio.h>

int main(void)
{
    char text[16];
    int32_t written = zv_util_snprintf(text, sizeof text, "%s-%d", "zv", 42);
    printf("zv_util_snprintf wrote %d characters: %s\n", (int)written, text);
    return written == 5 ? 0 : 1;
}
