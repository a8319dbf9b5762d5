/* Stands before the C library and refuses files without a name: those of O_TMPFILE if REFUSED is
 * "openat", giving them names if it is "linkat". */
#define _GNU_SOURCE
#include <errno.h>
#include <fcntl.h>
#include <stdarg.h>
#include <stdlib.h>
#include <string.h>
#include <sys/syscall.h>
#include <unistd.h>

static int IsRefused(const char* call) {
  const char* refused = getenv("REFUSED");
  return refused != NULL && strcmp(refused, call) == 0;
}

__attribute__((visibility("default"))) int openat(int directory, const char* path, int flags, ...) {
  va_list arguments;
  va_start(arguments, flags);
  const mode_t mode = (flags & (O_CREAT | O_TMPFILE)) != 0 ? va_arg(arguments, mode_t) : 0;
  va_end(arguments);
  if ((flags & O_TMPFILE) == O_TMPFILE && IsRefused("openat")) {
    errno = EOPNOTSUPP;
    return -1;
  }
  return (int)syscall(SYS_openat, directory, path, flags, mode);
}

__attribute__((visibility("default"))) int linkat(int from, const char* file, int to,
                                                  const char* path, int flags) {
  if (IsRefused("linkat")) {
    errno = ENOENT;
    return -1;
  }
  return (int)syscall(SYS_linkat, from, file, to, path, flags);
}
