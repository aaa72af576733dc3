/* libzvutil status codes and export annotations. */
#ifndef ZVUTIL_STATUS_H
#define ZVUTIL_STATUS_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

#define ZV_EXPORT __attribute__((visibility("default")))

#if defined(__GNUC__)
#define ZV_PRINTF_LIKE(fmt, args) __attribute__((format(printf, fmt, args)))
#else
#define ZV_PRINTF_LIKE(fmt, args)
#endif

/* zv_status is the result of nearly every function: 0 on success, otherwise
 * one of the codes below. Its width is fixed at 32 bits. */
typedef uint32_t zv_status;

/* X(name, value, meaning): the one list of status codes. */
#define ZV_STATUS_LIST(X)                                                     \
    X(ZV_OK, 0, "success")                                                    \
    X(ZV_ERR_NO_MEMORY, 2, "an allocation failed")                            \
    X(ZV_ERR_NULL_ARG, 3, "a required pointer argument is NULL")              \
    X(ZV_ERR_SYSTEM, 6, "a system or C-library operation failed")             \
    X(ZV_ERR_BAD_VALUE, 7, "an argument or input text is not acceptable")     \
    X(ZV_ERR_IO, 9, "reading a line from an opened file failed")              \
    X(ZV_ERR_TOO_SMALL, 16, "an output buffer is too small")                  \
    X(ZV_ERR_OPEN_FAILED, 32, "a file that must be read cannot be opened")    \
    X(ZV_ERR_OVERFLOW, 33, "a size, count or time would not fit its type")   \
    X(ZV_ERR_TIMEOUT, 36, "a deadline passed before the awaited event")       \
    X(ZV_ERR_NO_MORE, 37, "a scan has no further entries")                    \
    X(ZV_ERR_ACCESS, 39, "creating a file failed with EACCES")                \
    X(ZV_ERR_IN_USE, 52, "the PID file names a running instance")

#define ZV_STATUS_ENUMERATOR_(name, value, meaning) name = value,
enum zv_status_code { ZV_STATUS_LIST(ZV_STATUS_ENUMERATOR_) };
#undef ZV_STATUS_ENUMERATOR_

#ifdef __cplusplus
}
#endif

#endif
