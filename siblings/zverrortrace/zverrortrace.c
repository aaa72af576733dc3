#include "zverrortrace.h"

#include <errno.h>
#include <stddef.h>

#define ZV_TRACE_EXPORT __attribute__((visibility("default")))

/* Each thread keeps its own ring of its most recent frames, older ones
 * overwritten, so threads never share one. */
enum { TRACE_CAPACITY = 256 };

struct trace_ring {
    zv_trace_frame frames[TRACE_CAPACITY];
    uint32_t first; /* index of the oldest held frame */
    uint32_t count;
};

static _Thread_local struct trace_ring ring;

ZV_TRACE_EXPORT void zv_trace_save(const char *function, const char *file, int32_t line,
                                   uint32_t status)
{
    int saved = errno;
    uint32_t slot = (ring.first + ring.count) % TRACE_CAPACITY;
    if (ring.count == TRACE_CAPACITY)
        ring.first = (ring.first + 1) % TRACE_CAPACITY;
    else
        ring.count++;
    ring.frames[slot].function = function;
    ring.frames[slot].file = file;
    ring.frames[slot].line = line;
    ring.frames[slot].status = status;
    errno = saved;
}

ZV_TRACE_EXPORT uint32_t zv_trace_count(void)
{
    return ring.count;
}

ZV_TRACE_EXPORT int32_t zv_trace_get(uint32_t index, zv_trace_frame *out)
{
    if (out == NULL || index >= ring.count)
        return -1;
    *out = ring.frames[(ring.first + index) % TRACE_CAPACITY];
    return 0;
}

ZV_TRACE_EXPORT void zv_trace_clear(void)
{
    ring.first = 0;
    ring.count = 0;
}
