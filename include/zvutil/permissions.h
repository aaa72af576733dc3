/* libzvutil effective group. */
#ifndef ZVUTIL_PERMISSIONS_H
#define ZVUTIL_PERMISSIONS_H

#include <zvutil/status.h>

#ifdef __cplusplus
extern "C" {
#endif

/* ensure_egid makes the group named |group_name| (at most 32 bytes) the
 * process's effective group; the real and saved groups and the supplementary
 * groups are untouched. The effective group is process-wide. Log lines are
 * level 3 and come before the frame.
 *   ZV_ERR_NULL_ARG   group_name NULL (frame).
 *   ZV_ERR_BAD_VALUE  name of 33 bytes or more (frame; nothing looked up).
 *   ZV_ERR_SYSTEM     "Failed to query size" with errno text (frame).
 *   ZV_ERR_NO_MEMORY  "Failed to allocate %ld byte buffer" (frame).
 *   ZV_ERR_SYSTEM     "Failed to query group data": the lookup failed (with
 *                     errno text) or no such group exists (frame).
 *   ZV_ERR_SYSTEM     "Failed to update effective gid" with errno text, for
 *                     example EPERM for a group the process may not choose
 *                     (frame).
 * On every failure the effective group is unchanged. */
ZV_EXPORT zv_status ensure_egid(const char *group_name);

#ifdef __cplusplus
}
#endif

#endif
