/* Shows a program, with this library preloaded, the files of a recorded host in place of the
 * machine's: what it opens below /proc and /sys is opened below the directory HOST_ROOT. */
#undef _FORTIFY_SOURCE
#define _GNU_SOURCE
#include <dlfcn.h>
#include <fcntl.h>
#include <limits.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

/* In place of the system's, whatever the build hides. */
#pragma GCC visibility push(default)

static const char* Below(const char* path, char buffer[PATH_MAX]) {
  const char* root = getenv("HOST_ROOT");
  const int is_host = strncmp(path, "/proc/", 6) == 0 || strncmp(path, "/sys/", 5) == 0 ||
                      strcmp(path, "/proc") == 0;
  if (root == NULL || !is_host) return path;
  snprintf(buffer, PATH_MAX, "%s%s", root, path);
  return buffer;
}

#define SHOWING_OPEN(name)                                                         \
  int name(const char* path, int flags, ...) {                                     \
    static int (*behind)(const char*, int, ...);                                   \
    char buffer[PATH_MAX];                                                         \
    va_list rest;                                                                  \
    va_start(rest, flags);                                                         \
    const int mode = (flags & (O_CREAT | O_TMPFILE)) != 0 ? va_arg(rest, int) : 0; \
    va_end(rest);                                                                  \
    if (behind == NULL) *(void**)&behind = dlsym(RTLD_NEXT, #name);                \
    return behind(Below(path, buffer), flags, mode);                               \
  }

SHOWING_OPEN(open)
SHOWING_OPEN(open64)

/* What these are called in a fortified program. */
int __open_2(const char* path, int flags);
int __open64_2(const char* path, int flags);
int __open_2(const char* path, int flags) { return open(path, flags); }
int __open64_2(const char* path, int flags) { return open64(path, flags); }
