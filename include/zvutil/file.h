/* libzvutil file operations: descriptors, durable sync, named files.
 *
 * Sizes and offsets are 32-bit: a file of 2 GiB or more cannot be sized or
 * read where the platform's offsets are 32 bits (i386); such a status query
 * fails with errno EOVERFLOW. |errno_out| arguments are optional (NULL or the
 * address of an integer) and receive errno on the failure paths named below;
 * elsewhere they are left as they were. Blocks handed out through
 * out-parameters come from malloc; free them with free() or zv_util_free(). */
#ifndef ZVUTIL_FILE_H
#define ZVUTIL_FILE_H

#include <stdint.h>
#include <stdio.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* ---- Descriptors ------------------------------------------------------- */

/* zv_util_open opens the path formatted from |format| with open(path, flags,
 * mode); the descriptor stored in |*fd_out| belongs to the caller.
 *   ZV_ERR_NULL_ARG  fd_out or format NULL (frame).
 *   (formatting)     the status of zv_util_vasprintf, with its frame only;
 *                    |*fd_out| not written.
 *   ZV_ERR_SYSTEM    open failed (frame): |*fd_out| is -1, |*errno_out| errno.
 * After a successful formatting |*errno_out| holds 0. */
ZV_EXPORT zv_status zv_util_open(int32_t *fd_out, int32_t *errno_out, int32_t flags,
                                 uint32_t mode, const char *format, ...) ZV_PRINTF_LIKE(5, 6);

/* zv_util_whole_write writes all |len| bytes of |buf| to |fd|.
 *   ZV_ERR_NULL_ARG  buf NULL (frame).
 *   ZV_ERR_OVERFLOW  len negative (frame).
 *   ZV_ERR_SYSTEM    write failed (frame; |*errno_out| errno). No retry on EINTR.
 *   -11 (EAGAIN negated, 0xFFFFFFF5 as a status): five writes in a row took no
 *                    byte; no frame.
 * Bytes written before a failure stay written. */
ZV_EXPORT zv_status zv_util_whole_write(int32_t fd, const void *buf, int32_t len,
                                        int32_t *errno_out);

/* zv_util_whole_read reads exactly |len| bytes from |fd| into |buf|. Returns
 * |len|; -22 when buf is NULL or len negative; -1 when read fails (errno tells
 * why); -11 after five reads in a row that returned nothing (end of file).
 * Records no frame. Bytes read before a failure stay in |buf|. */
ZV_EXPORT int32_t zv_util_whole_read(int32_t fd, void *buf, int32_t len);

/* zv_util_read_file reads |fd|'s file from its current position into a new
 * NUL-terminated buffer of size + 1 bytes stored in |*buf_out|; |*size_out|
 * receives the file's size (the NUL is not counted; the file may hold NULs).
 *   ZV_ERR_NULL_ARG   buf_out or size_out NULL (frame).
 *   ZV_ERR_SYSTEM     the status query failed, or the size is 2 GiB or more
 *                     (frame; |*errno_out| errno, EOVERFLOW for the size).
 *   ZV_ERR_NO_MEMORY  no buffer (frame; |*errno_out| errno; |*buf_out| NULL).
 *   ZV_ERR_SYSTEM     fewer bytes than the size were read (frame; |*buf_out|
 *                     NULL; |*errno_out| untouched).
 * |*size_out| keeps the size on the failures after the query. */
ZV_EXPORT zv_status zv_util_read_file(int32_t fd, char **buf_out, uint32_t *size_out,
                                      int32_t *errno_out);

/* zv_util_count_lines counts the newline bytes of |fd|'s file, reading from
 * its start up to the size measured at the call; the position is restored.
 *   ZV_ERR_NULL_ARG   count_out NULL (frame).
 *   ZV_ERR_BAD_VALUE  fd negative (frame).
 *   ZV_ERR_SYSTEM     position query, status query, seek or read failed
 *                     (frame; |*errno_out| errno). After a failed read
 *                     |*count_out| holds the lines counted so far.
 * A file that shrinks while counted ends the count early with ZV_OK. */
ZV_EXPORT zv_status zv_util_count_lines(int32_t fd, uint32_t *count_out, int32_t *errno_out);

/* zv_util_get_file_size stores the size of the file at |path| in |*size_out|.
 * The file is opened read-only for the query, so a file that may not be read
 * has no size here.
 *   ZV_ERR_NULL_ARG  path or size_out NULL (frame).
 *   ZV_ERR_SYSTEM    open or status query failed (frame); |*size_out| not
 *                    written. */
ZV_EXPORT zv_status zv_util_get_file_size(const char *path, int64_t *size_out);

/* zv_util_truncate_file sets the length of the file at |path| (extending it
 * with zeros when |length| lies beyond the end).
 *   ZV_ERR_NULL_ARG  path NULL (frame).
 *   ZV_ERR_SYSTEM    truncate failed (frame; |*errno_out| errno). */
ZV_EXPORT zv_status zv_util_truncate_file(const char *path, int32_t length, int32_t *errno_out);

/* zv_util_delete_file removes the name |path| (not a directory).
 *   ZV_ERR_NULL_ARG  path NULL (frame).
 *   ZV_ERR_SYSTEM    unlink failed (frame; |*errno_out| errno). */
ZV_EXPORT zv_status zv_util_delete_file(const char *path, int32_t *errno_out);

/* zv_util_query_file_exists stores 1 in |*exists_out| when |path| (links
 * followed) exists, 0 when it does not (ENOENT; a dangling link reads as
 * missing).
 *   ZV_ERR_NULL_ARG  path or exists_out NULL (frame).
 *   ZV_ERR_SYSTEM    any other failure of the status query, a size of 2 GiB
 *                    or more included (frame); |*exists_out| not written. */
ZV_EXPORT zv_status zv_util_query_file_exists(const char *path, uint32_t *exists_out);

/* ---- Durable sync and path components --------------------------------- */

/* zv_util_sync flushes |stream|, fsyncs its descriptor and then, when
 * |dir_path| is not NULL, opens that directory read-only and fsyncs it. The
 * stream is neither closed nor moved.
 *   ZV_ERR_NULL_ARG  stream NULL (frame).
 *   ZV_ERR_SYSTEM    flush, descriptor lookup or file fsync failed (frame;
 *                    the directory is not touched), or the directory open or
 *                    fsync failed (frame). */
ZV_EXPORT zv_status zv_util_sync(FILE *stream, const char *dir_path);

/* zv_util_sync_file fsyncs the existing file at |path| (opened read-write)
 * and then its directory (the path up to its last slash; "/" for a file
 * directly under the root; the file itself again for a bare name).
 *   ZV_ERR_NULL_ARG   path NULL (frame).
 *   ZV_ERR_BAD_VALUE  path of 1000 bytes or more (frame).
 *   ZV_ERR_NO_MEMORY  no directory text (frames: zv_util_get_directory_component,
 *                     this one; then "Failed to get directory component").
 *   ZV_ERR_SYSTEM     "Failed to open file", "Failed to open directory",
 *                     "Failed to sync file" or "Failed to sync directory file"
 *                     logged at level 3, then a frame.
 * Every descriptor it opened is closed on every path. */
ZV_EXPORT zv_status zv_util_sync_file(const char *path);

/* zv_util_get_directory_component stores in |*dir_out| a new copy of |path|
 * up to (not including) its last slash: "a/b/c" gives "a/b", "a//b" gives
 * "a/", "/x" gives "". A path without a slash is copied whole. Both pointers
 * are required.
 *   ZV_ERR_NO_MEMORY  no copy (frame); |*dir_out| NULL. */
ZV_EXPORT zv_status zv_util_get_directory_component(const char *path, char **dir_out);

/* zv_util_abs_path stores in |*abs_out| a new absolute, canonical form of the
 * existing |path| (realpath). Both pointers are required.
 *   ZV_ERR_SYSTEM  realpath failed (frame); |*abs_out| NULL. */
ZV_EXPORT zv_status zv_util_abs_path(const char *path, char **abs_out);

/* ---- Named files ------------------------------------------------------- */

/* zv_util_fopen opens a stream with |mode| on the path formatted from
 * |format|; the stream stored in |*stream_out| belongs to the caller.
 *   ZV_ERR_NULL_ARG  stream_out, mode or format NULL (frame).
 *   (formatting)     the status of zv_util_vasprintf (its frame, then this
 *                    one's); |*stream_out| not written.
 *   ZV_ERR_SYSTEM    the stream was not opened (frame; |*errno_out| errno);
 *                    |*stream_out| not written.
 * After a successful formatting |*errno_out| holds 0. */
ZV_EXPORT zv_status zv_util_fopen(FILE **stream_out, int32_t *errno_out, const char *mode,
                                  const char *format, ...) ZV_PRINTF_LIKE(4, 5);

/* zv_util_read_named_file reads the file at |path| whole into a new buffer of
 * size + 1 bytes (the file's bytes and a NUL) stored in |*buf_out|;
 * |*size_out| receives the size. |errno_out| is never written.
 *   ZV_ERR_NULL_ARG   path, buf_out or size_out NULL (frame).
 *   ZV_ERR_SYSTEM     the size query failed: missing, unreadable, 2 GiB or
 *                     more on i386 (frames: zv_util_get_file_size, this one).
 *   ZV_ERR_OVERFLOW   size of 4 GiB or more (frame).
 *   ZV_ERR_SYSTEM     the stream was not opened (frame; |*buf_out| untouched).
 *   ZV_ERR_NO_MEMORY  no buffer (frame; |*buf_out| NULL).
 *   ZV_ERR_SYSTEM     a read error, or the file ended before its measured
 *                     size (frame; |*buf_out| NULL).
 * |*size_out| holds the measured size from the first open on. */
ZV_EXPORT zv_status zv_util_read_named_file(const char *path, char **buf_out, uint32_t *size_out,
                                            int32_t *errno_out);

/* zv_util_write_named_file writes |len| bytes of |data| to the file at |path|
 * (created when missing; emptied first when |truncate| is non-zero, appended
 * to otherwise), then flushes and fsyncs the file and its directory. The
 * write is in place, not atomic. |errno_out| is never written.
 *   ZV_ERR_NULL_ARG   path or data NULL, even for len 0 (frame).
 *   ZV_ERR_NO_MEMORY  no directory text (frames: the callee's, this one).
 *   ZV_ERR_SYSTEM     the stream was not opened, or a write error (frame).
 *   ZV_ERR_SYSTEM     the sync failed (frames: zv_util_sync, this one); the
 *                     data are written but not known to be durable. */
ZV_EXPORT zv_status zv_util_write_named_file(const char *path, int32_t truncate, const void *data,
                                             uint32_t len, int32_t *errno_out);

/* zv_util_copy_file copies the file at |src_path| to |dst_path| (created or
 * replaced, then synced) through memory; copying a file onto itself leaves it
 * unchanged. Permissions, owner and times are not copied.
 *   ZV_ERR_NULL_ARG  src_path or dst_path NULL (frame).
 *   Otherwise the status of zv_util_read_named_file or
 *   zv_util_write_named_file, with their frames only. */
ZV_EXPORT zv_status zv_util_copy_file(const char *src_path, const char *dst_path);

#ifdef __cplusplus
}
#endif

#endif
