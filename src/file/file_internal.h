// Internals shared by the file family's sources.
#pragma once

#include <zvutil/format.h>

#include <cstdarg>
#include <cstdio>

#include "internal.h"

namespace zv {

// fopen(path, mode), nothing added: the one place where the file family opens
// streams (its own with "e" in |mode|). No frame, no log line; NULL with errno
// set on failure.
ZV_INTERNAL FILE *zv_util_open_stream(const char *path, const char *mode);

// The directory that the durable writes sync: a path directly under the root
// has empty directory text, which names no openable directory, so "/" stands
// in for it.
inline const char *sync_directory(const char *directory_text)
{
    return directory_text[0] == '\0' ? "/" : directory_text;
}

struct OpenedPath {
    zv_status status;
    bool formatted;  // false: |status| is the formatter's, its frame recorded
};

// Formats a path from |format| and |args| and calls |open| on it, which
// returns false with errno set when it fails: ZV_ERR_SYSTEM then, that errno
// stored through |errno_out|. Records no frame of its own.
template <class Open>
OpenedPath open_formatted(const char *format, va_list args, int32_t *errno_out, Open &&open)
{
    unique_malloc<char> path;
    zv_status status = zv_util_vasprintf(out_block(path), format, args, errno_out);
    if (status != ZV_OK)
        return {status, false};
    if (!open(path.get())) {
        set_errno_out(errno_out, errno);
        return {ZV_ERR_SYSTEM, true};
    }
    return {ZV_OK, true};
}

}  // namespace zv
