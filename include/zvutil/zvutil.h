/* libzvutil: every public header. */
#ifndef ZVUTIL_ZVUTIL_H
#define ZVUTIL_ZVUTIL_H

#include <zvutil/status.h>
#include <zvutil/memory.h>
#include <zvutil/format.h>
#include <zvutil/base64.h>
#include <zvutil/string_ops.h>
#include <zvutil/hex.h>
#include <zvutil/convert.h>
#include <zvutil/file.h>
#include <zvutil/directory.h>
#include <zvutil/permissions.h>
#include <zvutil/getopt.h>
#include <zvutil/hash.h>
#include <zvutil/random.h>
#include <zvutil/overflow.h>
#include <zvutil/sum.h>
#include <zvutil/timeutil.h>
#include <zvutil/process.h>
#include <zvutil/system.h>

#endif
