// Descriptor, stream, directory and group calls of the file family.
#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <dirent.h>
#include <fcntl.h>
#include <grp.h>
#include <sys/stat.h>
#include <unistd.h>

#include "support/fault.h"

namespace {

// A failed stdio transfer sets the stream's error indicator, as glibc does.
size_t fail_stream(FILE *stream)
{
    stream->_flags |= _IO_ERR_SEEN;
    return 0;
}

}  // namespace

extern "C" {

int __real_open(const char *path, int flags, ...);
ssize_t __real_read(int fd, void *buf, size_t count);
ssize_t __real_write(int fd, const void *buf, size_t count);
int __real_fsync(int fd);
int __real_fstat64(int fd, struct stat64 *st);
int __real_stat64(const char *path, struct stat64 *st);
off_t __real_lseek(int fd, off_t offset, int whence);
FILE *__real_fopen(const char *path, const char *mode);
size_t __real_fwrite(const void *data, size_t size, size_t count, FILE *stream);
size_t __real_fread(void *data, size_t size, size_t count, FILE *stream);
int __real_fflush(FILE *stream);
int __real_ferror(FILE *stream);
int __real_fileno(FILE *stream);
DIR *__real_opendir(const char *path);
int __real_scandir64(const char *path, struct dirent64 ***list,
                     int (*filter)(const struct dirent64 *),
                     int (*compare)(const struct dirent64 **, const struct dirent64 **));
int __real_getgrnam_r(const char *name, struct group *record, char *buffer, size_t size,
                      struct group **result);
int __real_setegid(gid_t gid);
long __real_sysconf(int name);

int __wrap_open(const char *path, int flags, ...)
{
    mode_t mode = 0;
    if ((flags & O_CREAT) != 0 || (flags & O_TMPFILE) == O_TMPFILE) {
        va_list args;
        va_start(args, flags);
        mode = static_cast<mode_t>(va_arg(args, unsigned));
        va_end(args);
    }
    return zvt::fault_hit("open") ? -1 : __real_open(path, flags, mode);
}

// "read_idle" and "write_idle" make a call return 0 without moving a byte.
ssize_t __wrap_read(int fd, void *buf, size_t count)
{
    if (zvt::fault_hit("read"))
        return -1;
    return zvt::fault_hit("read_idle") ? 0 : __real_read(fd, buf, count);
}

ssize_t __wrap_write(int fd, const void *buf, size_t count)
{
    if (zvt::fault_hit("write"))
        return -1;
    return zvt::fault_hit("write_idle") ? 0 : __real_write(fd, buf, count);
}

int __wrap_fsync(int fd) { return zvt::fault_hit("fsync") ? -1 : __real_fsync(fd); }

// "fstat_grown" reports the file 100 bytes larger than it is, as if it had
// shrunk since it was measured.
int __wrap_fstat64(int fd, struct stat64 *st)
{
    if (zvt::fault_hit("fstat"))
        return -1;
    int result = __real_fstat64(fd, st);
    if (result == 0 && zvt::fault_hit("fstat_grown"))
        st->st_size += 100;
    return result;
}

// "stat_wide_inode" reports an inode number beyond 32 bits, as XFS, btrfs and
// overlay file systems do.
int __wrap_stat64(const char *path, struct stat64 *st)
{
    if (zvt::fault_hit("stat"))
        return -1;
    int result = __real_stat64(path, st);
    if (result == 0 && zvt::fault_hit("stat_wide_inode"))
        st->st_ino |= 1ull << 40;
    return result;
}

off_t __wrap_lseek(int fd, off_t offset, int whence)
{
    return zvt::fault_hit("lseek") ? -1 : __real_lseek(fd, offset, whence);
}

FILE *__wrap_fopen(const char *path, const char *mode)
{
    return zvt::fault_hit("fopen") ? nullptr : __real_fopen(path, mode);
}

size_t __wrap_fwrite(const void *data, size_t size, size_t count, FILE *stream)
{
    return zvt::fault_hit("fwrite") ? fail_stream(stream)
                                    : __real_fwrite(data, size, count, stream);
}

size_t __wrap_fread(void *data, size_t size, size_t count, FILE *stream)
{
    return zvt::fault_hit("fread") ? fail_stream(stream) : __real_fread(data, size, count, stream);
}

int __wrap_fflush(FILE *stream) { return zvt::fault_hit("fflush") ? EOF : __real_fflush(stream); }

// An armed "ferror" reports the error indicator set.
int __wrap_ferror(FILE *stream) { return zvt::fault_hit("ferror") ? 1 : __real_ferror(stream); }

int __wrap_fileno(FILE *stream) { return zvt::fault_hit("fileno") ? -1 : __real_fileno(stream); }

DIR *__wrap_opendir(const char *path)
{
    return zvt::fault_hit("opendir") ? nullptr : __real_opendir(path);
}

int __wrap_scandir64(const char *path, struct dirent64 ***list,
                     int (*filter)(const struct dirent64 *),
                     int (*compare)(const struct dirent64 **, const struct dirent64 **))
{
    return zvt::fault_hit("scandir") ? -1 : __real_scandir64(path, list, filter, compare);
}

int __wrap_getgrnam_r(const char *name, struct group *record, char *buffer, size_t size,
                      struct group **result)
{
    if (zvt::fault_hit("getgrnam_r")) {
        *result = nullptr;
        return errno;
    }
    return __real_getgrnam_r(name, record, buffer, size, result);
}

int __wrap_setegid(gid_t gid) { return zvt::fault_hit("setegid") ? -1 : __real_setegid(gid); }

long __wrap_sysconf(int name) { return zvt::fault_hit("sysconf") ? -1 : __real_sysconf(name); }

}  // extern "C"
