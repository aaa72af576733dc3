/* A C99 caller: every public header compiles as C, and a program linked with
 * the shared object, and no C++ runtime, runs. */
#include <zvutil/zvutil.h>

#include <zverrortrace.h>
#include <zvlog.h>

int main(void)
{
    char text[16];
    return zv_util_snprintf(text, sizeof text, "%s-%d", "zv", 42) == 5 ? 0 : 1;
}
