/* A small C program that uses libzvutil through its installed headers. */
#include <zvutil/zvutil.h>

#include <zverrortrace.h>

#include <stdio.h>
#include <stdlib.h>
#include <string.h>

static void show_trace(void)
{
    zv_trace_frame frame;
    for (uint32_t i = 0; zv_trace_get(i, &frame) == 0; i++)
        printf("   frame %u: %s status %u (%s:%d)\n", (unsigned)i, frame.function,
               (unsigned)frame.status, frame.file, (int)frame.line);
    zv_trace_clear();
}

int main(void)
{
    char *text = NULL;
    zv_status status = zv_util_asprintf(&text, NULL, "%s has %d exported functions", "libzvutil", 111);
    printf("zv_util_asprintf -> %u: \"%s\"\n", (unsigned)status, text);

    char **fields = NULL;
    uint32_t count = 0;
    status = zv_util_split(text, " ", &fields, &count);
    printf("zv_util_split(\" \") -> %u: %u fields\n", (unsigned)status, (unsigned)count);
    char *joined = NULL;
    uint32_t size = 0;
    status = zv_util_join((const char *const *)fields, count, "_", &joined, &size);
    printf("zv_util_join(\"_\") -> %u: \"%s\"\n", (unsigned)status, joined);
    for (uint32_t i = 0; i < count; i++)
        free(fields[i]);
    free(fields);
    zv_util_free(&joined);

    char *encoded = NULL;
    uint32_t encoded_length = 0;
    status = zv_util_base64_encode(text, (uint32_t)strlen(text), &encoded, &encoded_length);
    printf("zv_util_base64_encode -> %u: %.*s\n", (unsigned)status, (int)encoded_length, encoded);
    free(encoded);

    uint64_t hash = 0;
    zv_util_hash64(text, (uint32_t)strlen(text), &hash);
    printf("zv_util_hash64 -> %016llx\n", (unsigned long long)hash);

    const char *path = "build/demo/demo.txt";
    status = zv_util_write_named_file(path, 1, text, (uint32_t)strlen(text), NULL);
    printf("zv_util_write_named_file(%s) -> %u (file and directory synced)\n", path, (unsigned)status);
    char *back = NULL;
    status = zv_util_read_named_file(path, &back, &size, NULL);
    printf("zv_util_read_named_file -> %u: %u bytes, %s\n", (unsigned)status, (unsigned)size,
           back != NULL && strcmp(back, text) == 0 ? "identical" : "different");
    zv_util_free(&back);
    zv_util_free(&text);
    printf("zv_util_free -> pointer is %s\n", text == NULL ? "NULL" : "still set");

    char duration[32];
    zv_util_snprintf_human_time(duration, sizeof duration, 7200.0);
    printf("zv_util_snprintf_human_time(7200) -> \"%s\"\n", duration);

    /* A file that does not exist: the call is meant to fail, and its trace
     * shows where. */
    status = zv_util_read_named_file("build/demo/no-such-file", &back, &size, NULL);
    printf("zv_util_read_named_file(\"build/demo/no-such-file\") -> %u: %s;\n"
           "   its trace, deepest frame first:\n",
           (unsigned)status,
           status == ZV_ERR_SYSTEM ? "the expected failure, as the file does not exist"
                                   : "NOT the expected ZV_ERR_SYSTEM");
    show_trace();
    return 0;
}
