/* libzvutil processes: spawn and wait, PID files, signals, the thread ID. */
#ifndef ZVUTIL_PROCESS_H
#define ZVUTIL_PROCESS_H

#include <stdint.h>
#include <sys/types.h>

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* A spawned child. zv_spawn allocates it; zv_wait (on success) or
 * zv_free_proc_handle releases it and sets the caller's variable to NULL.
 * Releasing a handle neither signals nor reaps the child. */
typedef struct zv_proc_handle {
    pid_t pid; /* the child's process ID */
} zv_proc_handle;

/* zv_spawn starts argv[0] (used as the path, no PATH search) with the argument
 * vector |argv| and the whole environment |envp|, both NULL-terminated, and
 * stores a new handle in |*handle_out|. None of the pointers is tested.
 *   ZV_ERR_NO_MEMORY  the handle or the child's stack cannot be allocated;
 *                     |*handle_out| is NULL.
 *   ZV_ERR_SYSTEM     the child process cannot be created; |*handle_out| is NULL.
 * One frame on each failure. A program that cannot be started is not seen
 * here: its child ends with exit status 1, which zv_wait reports. */
ZV_EXPORT zv_status zv_spawn(char *const argv[], char *const envp[],
                             zv_proc_handle **handle_out);

/* zv_wait blocks until the child of |*handle| ends and reaps it. On success
 * the handle is released, |*handle| set to NULL and |*exit_code| set to the
 * exit status (0..255), or -1 when a signal ended the child.
 *   ZV_ERR_NULL_ARG  |handle| or |*handle| NULL.
 *   ZV_ERR_SYSTEM    waitpid failed (an interrupting signal included, no
 *                    retry); the handle stays live and |*exit_code| is not
 *                    written.
 * One frame on each failure. */
ZV_EXPORT zv_status zv_wait(zv_proc_handle **handle, int32_t *exit_code);

/* zv_spawn_and_wait is zv_spawn followed by zv_wait on a handle of its own.
 * A failure of zv_spawn gets a second frame of this function; a failure of
 * zv_wait is passed on without one (the handle is released; the child is left
 * unreaped: after an interrupted wait, EINTR, use zv_spawn and zv_wait to wait
 * again). A thread cancelled in the wait releases the handle too.
 * |*exit_code| is written only on success. */
ZV_EXPORT zv_status zv_spawn_and_wait(char *const argv[], char *const envp[],
                                      int32_t *exit_code);

/* zv_free_proc_handle releases |*handle| and sets it to NULL without touching
 * the child. NULL, and a variable holding NULL, are accepted. */
ZV_EXPORT void zv_free_proc_handle(zv_proc_handle **handle);

/* zv_util_sleep is sleep(3): 0, or the seconds left when a signal cut the
 * sleep short. No frame. */
ZV_EXPORT unsigned int zv_util_sleep(unsigned int seconds);

/* zv_util_claim_pid_file claims the PID file |path| for the calling process,
 * whose program name (at most 100 characters) is |name|.
 *   ZV_OK            the file now holds the caller's process ID in decimal,
 *                    with no newline; a new file gets mode 0664 less umask.
 *   ZV_ERR_IN_USE    a live process whose command line begins with |name|
 *                    holds the file; its ID is stored in |*owner_pid| (the
 *                    only status on which it is written). File unchanged.
 *   ZV_ERR_NULL_ARG  an argument is NULL.
 *   ZV_ERR_ACCESS    creating the file failed with EACCES.
 *   ZV_ERR_SYSTEM    the file cannot be created or opened, another claimer
 *                    holds its lock, or it cannot be written.
 *   ZV_ERR_BAD_VALUE |name| is longer than 100 characters (checked only when
 *                    an existing, non-empty file has to be compared).
 *   other            the status of the file read or of the /proc lookup.
 * An empty file, or one whose content is not 1 to 10 decimal digits or names
 * a process that is gone or runs another program, is taken over. Claimers are
 * serialised by an exclusive flock held only during the call. The file is
 * never deleted here. */
ZV_EXPORT zv_status zv_util_claim_pid_file(const char *path, const char *name,
                                           uint32_t *owner_pid);

/* zv_util_ignore_signal sets |sig| to be ignored. SIGKILL, SIGTERM, SIGSTOP
 * and numbers outside 1..31 are left alone (ZV_OK). ZV_ERR_SYSTEM, without a
 * frame, when sigaction fails. */
ZV_EXPORT zv_status zv_util_ignore_signal(int sig);

/* zv_util_ignore_common_signals ignores every signal from 1 to 31 except
 * SIGKILL, SIGTERM and SIGSTOP (SIGCHLD included, so ended children are
 * reaped by the kernel). A failing sigaction does not stop the walk; the
 * result is then ZV_ERR_SYSTEM, without a frame. */
ZV_EXPORT zv_status zv_util_ignore_common_signals(void);

/* zv_util_reset_signal restores the default disposition of |sig|.
 *   ZV_ERR_BAD_VALUE  |sig| outside 1..31 (log line and frame).
 *   ZV_ERR_SYSTEM     sigaction failed (SIGKILL, SIGSTOP); no frame. */
ZV_EXPORT zv_status zv_util_reset_signal(int sig);

/* zv_util_tid returns the kernel's ID of the calling thread (gettid). */
ZV_EXPORT int32_t zv_util_tid(void);

#ifdef __cplusplus
}
#endif

#endif
