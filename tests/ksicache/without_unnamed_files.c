/* Stands before the C library and refuses files without a name: those of O_TMPFILE if REFUSED is
 * "openat", giving them names if it is "linkat". The terminal hangs up when the call has
 * succeeded that HANGUP_AFTER names, "fsync" or "linkat". */
#define _GNU_SOURCE
#include <errno.h>
#include <fcntl.h>
#include <signal.h>
#include <stdarg.h>
#include <stdlib.h>
#include <string.h>
#include <sys/syscall.h>
#include <unistd.h>

static int IsRefused(const char* call) {
  const char* refused = getenv("REFUSED");
  return refused != NULL && strcmp(refused, call) == 0;
}

/* The result of a call, which may be the last that succeeds. */
static int HangUpAfter(const char* call, long result) {
  const char* last = getenv("HANGUP_AFTER");
  if (result == 0 && last != NULL && strcmp(last, call) == 0) raise(SIGHUP);
  return (int)result;
}

__attribute__((visibility("default"))) int fsync(int fd) {
  return HangUpAfter("fsync", syscall(SYS_fsync, fd));
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
  return HangUpAfter("linkat", syscall(SYS_linkat, from, file, to, path, flags));
}
