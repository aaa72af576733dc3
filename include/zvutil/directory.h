/* libzvutil directories: creation, existence, sorted scans. */
#ifndef ZVUTIL_DIRECTORY_H
#define ZVUTIL_DIRECTORY_H

#include <stdint.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* A directory listing read at zv_util_dirscan_begin, sorted by name without
 * regard to letter case, with a current entry. Opaque; released by
 * zv_util_dirscan_end. */
typedef struct zv_util_dirscan_state zv_util_dirscan_state;

/* zv_util_mkdir creates the directory |path| with mode 0700 (less the umask);
 * parents are not created.
 *   ZV_ERR_NULL_ARG  path NULL (frame).
 *   ZV_ERR_SYSTEM    mkdir failed, an existing entry included (frame). */
ZV_EXPORT zv_status zv_util_mkdir(const char *path);

/* zv_util_mkdir_read_only is zv_util_mkdir with mode 0500. */
ZV_EXPORT zv_status zv_util_mkdir_read_only(const char *path);

/* zv_util_dirscan_begin reads the whole listing of |path|, "." and ".." and
 * hidden names included, into a new scan positioned before its first entry.
 * Returns NULL (no frame) when path is NULL, memory is short or the listing
 * cannot be read (errno as scandir left it). */
ZV_EXPORT zv_util_dirscan_state *zv_util_dirscan_begin(const char *path);

/* zv_util_dirscan advances to the next entry, skipping "." and "..".
 *   ZV_OK            a current entry was reached.
 *   ZV_ERR_NULL_ARG  scan NULL (frame).
 *   ZV_ERR_NO_MORE   the listing is exhausted (frame, on this and every later
 *                    call): the normal end of a scan leaves a frame. */
ZV_EXPORT zv_status zv_util_dirscan(zv_util_dirscan_state *scan);

/* zv_dirscan_file_name returns a new copy of the current entry's name (the
 * caller frees it), or NULL, without a frame, when scan is NULL, there is no
 * current entry (before the first advance, after the end) or memory is
 * short. */
ZV_EXPORT char *zv_dirscan_file_name(zv_util_dirscan_state *scan);

/* zv_util_dirscan_end releases |scan| and everything it holds; NULL is
 * allowed. */
ZV_EXPORT void zv_util_dirscan_end(zv_util_dirscan_state *scan);

/* zv_util_query_dir_exists stores 1 in |*exists_out| when this process can
 * open |path| as a directory, else 0, and returns ZV_OK. |exists_out| is
 * required. A NULL path returns ZV_ERR_NULL_ARG without a frame. */
ZV_EXPORT zv_status zv_util_query_dir_exists(const char *path, uint32_t *exists_out);

#ifdef __cplusplus
}
#endif

#endif
