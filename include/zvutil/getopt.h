/* libzvutil option table parser. An argument vector is matched against a
 * caller-built table of option records; arguments that are not options and
 * options no record names are passed over. argv is neither reordered nor
 * modified. */
#ifndef ZVUTIL_GETOPT_H
#define ZVUTIL_GETOPT_H

#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

typedef struct zv_util_option zv_util_option;

/* An option handler stores |value| (NULL for an option without a value)
 * through record->destination and writes the number of arguments it consumed
 * (2 with a value, 1 without) to |*consumed|. */
typedef zv_status (*zv_util_option_handler)(const zv_util_option *record, const char *value,
                                            uint32_t *consumed);

/* One record of an option table. Tables have no terminating record; the first
 * matching record wins.
 *   short_name   matches an argument of exactly two characters, "-x" or "/x".
 *   long_name    at most 30 characters; matches "-name", "--name" or "/name"
 *                whole and case-sensitively.
 *   destination  for zv_util_getopt_string the address of a char pointer that
 *                must start out NULL; for the int and flag handlers the
 *                address of an int32_t.
 *   takes_value  nonzero: the next argument is the value, taken unchanged
 *                even when it begins with '-' or '/'. */
struct zv_util_option {
    char short_name;
    char long_name[31];
    zv_util_option_handler handler;
    void *destination;
    int32_t takes_value;
};

/* zv_util_getopt parses argv[1] .. argv[argc - 1] against |table| of |count|
 * records.
 *   ZV_ERR_NULL_ARG   argv or table NULL (one frame).
 *   ZV_ERR_BAD_VALUE  argc < 1 or count < 1 (one frame).
 * Otherwise it returns the status of zv_util_getopt_from with start 1 and
 * adds no frame of its own. */
ZV_EXPORT zv_status zv_util_getopt(int32_t argc, char *const argv[], const zv_util_option *table,
                                   int32_t count);

/* zv_util_getopt_from is zv_util_getopt starting at argv[start] (0 includes
 * the program name). start < 0 is ZV_ERR_BAD_VALUE as well.
 *   ZV_ERR_SYSTEM  an option that takes a value is the last argument; logs
 *                  "Missing mandatory option" (level 3). Frames: process_option,
 *                  then two of this function.
 *   (handler's)    a handler failed. Frames: the handler's, process_option's,
 *                  then two of this function. A record without a handler fails
 *                  this way with ZV_ERR_NULL_ARG, recorded by process_option.
 * Parsing stops at the first failure: options before it have been stored,
 * later ones have not. */
ZV_EXPORT zv_status zv_util_getopt_from(int32_t argc, char *const argv[],
                                        const zv_util_option *table, int32_t count,
                                        int32_t start);

/* zv_util_getopt_string stores a new copy of |value| (at most 300 characters)
 * in the char pointer at record->destination; the caller frees it.
 *   ZV_ERR_NULL_ARG   record, value, consumed or destination NULL.
 *   ZV_ERR_BAD_VALUE  the destination already holds a string (it stays), or
 *                     the value is longer than 300 characters.
 *   ZV_ERR_NO_MEMORY  the copy could not be allocated.
 * One frame on each failure; nothing is stored. */
ZV_EXPORT zv_status zv_util_getopt_string(const zv_util_option *record, const char *value,
                                          uint32_t *consumed);

/* zv_util_getopt_int converts |value| as "%d" does (leading white space and a
 * sign accepted, text after the number ignored) into the int32_t at
 * record->destination; a repeated option overwrites the earlier value.
 *   ZV_ERR_NULL_ARG   record, value, consumed or destination NULL.
 *   ZV_ERR_BAD_VALUE  value longer than 300 characters, no number at its
 *                     start, or a number outside the int32_t range.
 * One frame on each failure; the destination is then unchanged. */
ZV_EXPORT zv_status zv_util_getopt_int(const zv_util_option *record, const char *value,
                                       uint32_t *consumed);

/* zv_util_getopt_flag stores 1 in the int32_t at record->destination; the
 * value is not examined.
 *   ZV_ERR_NULL_ARG   record, consumed or destination NULL.
 *   ZV_ERR_BAD_VALUE  the record says it takes a value.
 * One frame on each failure. */
ZV_EXPORT zv_status zv_util_getopt_flag(const zv_util_option *record, const char *value,
                                        uint32_t *consumed);

#ifdef __cplusplus
}
#endif

#endif
