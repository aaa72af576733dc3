/* zverrortrace: per-thread trace of failure frames. */
#ifndef ZVERRORTRACE_H
#define ZVERRORTRACE_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct zv_trace_frame {
    const char *function; /* name of the recording function */
    const char *file;     /* source-file constant */
    int32_t line;
    uint32_t status;
} zv_trace_frame;

/* zv_trace_save records one frame for the calling thread. The strings are kept
 * by address, so they must outlive the frame (string constants do). errno is
 * preserved. */
void zv_trace_save(const char *function, const char *file, int32_t line, uint32_t status);

/* zv_trace_count returns the number of frames held for the calling thread. */
uint32_t zv_trace_count(void);

/* zv_trace_get copies frame |index| (0 = oldest held) to |out|; returns 0, or
 * -1 when |index| is out of range or |out| is NULL. */
int32_t zv_trace_get(uint32_t index, zv_trace_frame *out);

/* zv_trace_clear forgets the calling thread's frames. */
void zv_trace_clear(void);

#ifdef __cplusplus
}
#endif

#endif
