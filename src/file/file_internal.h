// Internals shared by the file family's sources.
#pragma once

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

}  // namespace zv
