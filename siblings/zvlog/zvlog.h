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

/* zv_log_set_sink routes every later message to |sink|; NULL restores the
 * default sink, which writes one line per message to standard error. */
void zv_log_set_sink(zv_log_sink sink, void *context);

#ifdef __cplusplus
}
#endif

#endif
