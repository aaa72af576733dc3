/* libzvutil environment and host name. */
#ifndef ZVUTIL_SYSTEM_H
#define ZVUTIL_SYSTEM_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* zv_util_getenv returns a new copy of the value of |name| (free it with
 * free() or zv_util_free()), or NULL when |name| is NULL, the variable is not
 * set, its value is longer than 299 characters, or the copy cannot be
 * allocated. No frame. */
ZV_EXPORT char *zv_util_getenv(const char *name);

/* zv_util_setenv sets |name| to |value|, replacing any existing value.
 *   ZV_ERR_NULL_ARG  |name| NULL.
 *   ZV_ERR_SYSTEM    setenv failed (an empty name, a name holding '=', no
 *                    memory); logged with the errno text.
 * One frame on each failure. */
ZV_EXPORT zv_status zv_util_setenv(const char *name, const char *value);

/* zv_util_unsetenv removes |name| from the environment; a variable that is not
 * set is no failure.
 *   ZV_ERR_NULL_ARG  |name| NULL.
 *   ZV_ERR_SYSTEM    unsetenv failed (an empty name, a name holding '=');
 *                    logged with the errno text.
 * One frame on each failure. */
ZV_EXPORT zv_status zv_util_unsetenv(const char *name);

/* zv_util_get_hostname returns the host name in a new string (free it with
 * free() or zv_util_free()), or NULL when the system gives no maximum length,
 * the buffer cannot be allocated or gethostname fails. No frame. */
ZV_EXPORT char *zv_util_get_hostname(void);

#ifdef __cplusplus
}
#endif

#endif
