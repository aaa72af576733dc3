/* A C99 caller: every public header compiles as C and the shared object links
 * and runs without the C++ runtime. */
#include <zvutil/zvutil.h>

#include <zverrortrace.h>
#include <zvlog.h>

#include <stdio.h>
#include <string.h>

static int failures;

static void check(int ok, const char *what)
{
    if (!ok) {
        fprintf(stderr, "FAILED: %s\n", what);
        failures++;
    }
}

int main(void)
{
    char *text = NULL;
    int32_t err = -1;
    char buffer[8];
    check(zv_util_asprintf(&text, &err, "%s-%d", "zv", 42) == ZV_OK, "asprintf status");
    check(text != NULL && strcmp(text, "zv-42") == 0 && err == 0, "asprintf text and errno_out");
    zv_util_free(&text);
    check(text == NULL, "zv_util_free clears the pointer");
    zv_trace_clear();
    check(zv_util_asprintf(NULL, NULL, "x") == ZV_ERR_NULL_ARG, "NULL out");
    check(zv_trace_count() == 1, "one frame for a NULL argument");
    check(zv_util_snprintf(buffer, sizeof buffer, "%s", "1234567") == 7, "snprintf fits");
    check(zv_util_snprintf(buffer, sizeof buffer, "%s", "12345678") == -1, "snprintf truncates");
    return failures != 0;
}
