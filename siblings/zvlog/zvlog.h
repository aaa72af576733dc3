/* zvlog: leveled log lines with a replaceable sink. */
#ifndef ZVLOG_H
#define ZVLOG_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_log_internal formats a message with glibc's printf (%m expands to the
 * errno current at the call), drops one trailing newline and hands it to the
 * sink. errno is preserved. */
void zv_util_log_internal(int32_t level, uint32_t mask, const char *function, const char *file,
                          int32_t line, const char *format, ...)
    __attribute__((format(printf, 6, 7)));

/* zv_util_log_internal_perror logs |format| as plain text (one trailing
 * newline dropped) followed by ": " and the text of |errnum|. */
void zv_util_log_internal_perror(int32_t errnum, int32_t level, uint32_t mask,
                                 const char *function, const char *file, int32_t line,
                                 const char *format);

typedef void (*zv_log_sink)(void *context, int32_t level, uint32_t mask, const char *function,
                            const char *file, int32_t line, const char *message);

/* zv_log_set_sink routes every later message to |sink|, called with |context|;
 * NULL restores the default sink, which writes one line per message to
 * standard error. When it returns, a sink it replaced has finished its
 * messages, except one that the calling thread is itself inside.
 *
 * A sink runs under the logger's lock, one message at a time, with
 * cancellation disabled. It may log and set a sink (the lock is recursive).
 * It must return normally: a sink left by longjmp or pthread_exit leaves the
 * lock held and every later message waits for ever. It must not wait for
 * another thread that logs, which would wait for the lock the sink holds.
 * After fork the child's logger is free whatever the parent's other threads
 * were doing: the child may log and set a sink at once. */
void zv_log_set_sink(zv_log_sink sink, void *context);

#ifdef __cplusplus
}
#endif

#endif
