/* A small C program that uses libzvutil through its installed headers. */
#include <zvutil/zvutil.h>

#include <zverrortrace.h>

#include <stdio.h>
#include <string.h>

static void show_trace(void)
{
    zv_trace_frame frame;
    for (uint32_t i = 0; zv_trace_get(i, &frame) == 0; i++)
        printf("   frame %u: %s status %u (%s:%d)\n", (unsigned)i, frame.function,
               (unsigned)frame.status, frame.file, (int)frame.line);
    zv_trace_clear();
}

int main(int argc, char **argv)
{
    if (argc > 1 && strcmp(argv[1], "--probe") == 0)
        return 0;

    char *text = NULL;
    zv_status status = zv_util_asprintf(&text, NULL, "%s has %d exported functions", "libzvutil", 111);
    printf("zv_util_asprintf -> %u: \"%s\"\n", (unsigned)status, text);

    zv_util_str_replace(text, 100, ' ', '_');
    printf("zv_util_str_replace(' ' -> '_') -> \"%s\"\n", text);
    zv_util_free(&text);
    printf("zv_util_free -> pointer is %s\n", text == NULL ? "NULL" : "still set");

    char small[8];
    printf("zv_util_snprintf into 8 bytes: %d (\"%s\")\n",
           (int)zv_util_snprintf(small, sizeof small, "%s", "truncated text"), small);

    status = zv_util_asprintf(NULL, NULL, "no destination");
    printf("zv_util_asprintf(NULL, ...) -> %u, trace:\n", (unsigned)status);
    show_trace();
    return 0;
}
