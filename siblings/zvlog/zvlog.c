#define _GNU_SOURCE /* strerror_r returning the text */
#include "zvlog.h"

#include <errno.h>
#include <pthread.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#define ZV_LOG_EXPORT __attribute__((visibility("default")))

static void default_sink(void *context, int32_t level, uint32_t mask, const char *function,
                         const char *file, int32_t line, const char *message)
{
    (void)context;
    (void)mask;
    fprintf(stderr, "zvutil[%d] %s (%s:%d): %s\n", (int)level, function ? function : "?",
            file ? file : "?", (int)line, message);
}

/* The sink and its context change together: both are read and written under
 * one lock, which a delivery holds while the sink runs, so a sink that is
 * replaced finishes its message before the set returns. The lock is
 * recursive so that a sink may itself log or set a sink. */
static pthread_mutex_t binding_lock = PTHREAD_RECURSIVE_MUTEX_INITIALIZER_NP;
static zv_log_sink current_sink = default_sink;
static void *current_context;

ZV_LOG_EXPORT void zv_log_set_sink(zv_log_sink sink, void *context)
{
    pthread_mutex_lock(&binding_lock);
    current_sink = sink != NULL ? sink : default_sink;
    current_context = sink != NULL ? context : NULL;
    pthread_mutex_unlock(&binding_lock);
}

static void deliver(int32_t level, uint32_t mask, const char *function, const char *file,
                    int32_t line, char *message, size_t length)
{
    if (length > 0 && message[length - 1] == '\n')
        message[length - 1] = '\0';
    /* A thread cancelled inside the sink would leave the lock held. */
    int cancel_state;
    pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &cancel_state);
    pthread_mutex_lock(&binding_lock);
    current_sink(current_context, level, mask, function, file, line, message);
    pthread_mutex_unlock(&binding_lock);
    pthread_setcancelstate(cancel_state, NULL);
}

ZV_LOG_EXPORT void zv_util_log_internal(int32_t level, uint32_t mask, const char *function,
                                        const char *file, int32_t line, const char *format, ...)
{
    int saved = errno;
    char small[512];
    char *text = small;
    va_list args;

    va_start(args, format);
    int n = vsnprintf(small, sizeof small, format, args);
    va_end(args);
    if (n < 0) {
        small[0] = '\0';
        n = 0;
    } else if ((size_t)n >= sizeof small) {
        char *big = malloc((size_t)n + 1);
        if (big != NULL) {
            errno = saved; /* %m must see the caller's errno on the second pass too */
            va_start(args, format);
            vsnprintf(big, (size_t)n + 1, format, args);
            va_end(args);
            text = big;
        } else {
            n = (int)sizeof small - 1;
        }
    }
    deliver(level, mask, function, file, line, text, (size_t)n);
    if (text != small)
        free(text);
    errno = saved;
}

ZV_LOG_EXPORT void zv_util_log_internal_perror(int32_t errnum, int32_t level, uint32_t mask,
                                               const char *function, const char *file,
                                               int32_t line, const char *format)
{
    int saved = errno;
    char reason[256];
    char text[1024];
    const char *why = strerror_r(errnum, reason, sizeof reason);
    const char *body = format ? format : "";
    size_t length = strlen(body);
    if (length > 0 && body[length - 1] == '\n')
        length--;
    int n = snprintf(text, sizeof text, "%.*s: %s", (int)length, body, why);
    if (n < 0)
        n = 0;
    if ((size_t)n >= sizeof text)
        n = (int)sizeof text - 1;
    deliver(level, mask, function, file, line, text, 0);
    errno = saved;
}
