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

/* Deliveries and sink changes take turns under one lock, which a delivery
 * holds while the sink runs, so a sink that is replaced finishes its message
 * before the set returns. The lock is recursive so that a sink may itself log
 * or set a sink. The sink and its context are published together: a set fills
 * the slot not in use, then makes it current, so a fork at any moment leaves
 * the child a whole binding. */
struct binding {
    zv_log_sink sink;
    void *context;
};
static struct binding slots[2] = {{default_sink, NULL}, {default_sink, NULL}};
static struct binding *current = &slots[0];
static pthread_mutex_t binding_lock = PTHREAD_RECURSIVE_MUTEX_INITIALIZER_NP;

/* In a child of fork the lock may be held by a thread that does not exist
 * there: the child starts with a free lock. */
static void reset_lock_in_child(void)
{
    pthread_mutexattr_t recursive;
    pthread_mutexattr_init(&recursive);
    pthread_mutexattr_settype(&recursive, PTHREAD_MUTEX_RECURSIVE);
    pthread_mutex_init(&binding_lock, &recursive);
    pthread_mutexattr_destroy(&recursive);
}

__attribute__((constructor)) static void register_fork_handler(void)
{
    pthread_atfork(NULL, NULL, reset_lock_in_child);
}

ZV_LOG_EXPORT void zv_log_set_sink(zv_log_sink sink, void *context)
{
    pthread_mutex_lock(&binding_lock);
    struct binding *next = current == &slots[0] ? &slots[1] : &slots[0];
    next->sink = sink != NULL ? sink : default_sink;
    next->context = sink != NULL ? context : NULL;
    __atomic_store_n(&current, next, __ATOMIC_RELEASE);
    pthread_mutex_unlock(&binding_lock);
}

/* Hands |message| to the current sink. A thread cancelled inside the sink
 * would leave the lock held, so cancellation waits until it returns. */
static void dispatch(int32_t level, uint32_t mask, const char *function, const char *file,
                     int32_t line, const char *message)
{
    int cancel_state;
    pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &cancel_state);
    pthread_mutex_lock(&binding_lock);
    current->sink(current->context, level, mask, function, file, line, message);
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
    if (n > 0 && text[n - 1] == '\n')
        text[n - 1] = '\0';
    dispatch(level, mask, function, file, line, text);
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
    snprintf(text, sizeof text, "%.*s: %s", (int)length, body, why);
    dispatch(level, mask, function, file, line, text);
    errno = saved;
}
