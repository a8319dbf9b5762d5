/* Fails one call on the system, for a program that is started with this library preloaded.
 *
 * FAIL=KIND:N fails the Nth call of a kind, FAIL=KIND:N+ that one and all later ones; the kinds are
 * those of kKinds below. FAIL_COUNTS=FILE writes how often each kind was called, "malloc 17", a
 * line each. Calls that are made before main are not counted.
 */
#undef _FORTIFY_SOURCE
#define _GNU_SOURCE
#include <dirent.h>
#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/syscall.h>
#include <sys/types.h>
#include <unistd.h>

/* In place of the system's, whatever the build hides. */
#pragma GCC visibility push(default)

enum Kind { kMalloc, kOpen, kRead, kWrite, kStat, kChmod, kSync, kRename, kKindCount };

static const struct {
  const char* name;
  int error;
} kKinds[kKindCount] = {{"malloc", ENOMEM}, {"open", EMFILE}, {"read", EIO},  {"write", ENOSPC},
                        {"stat", EIO},      {"chmod", EPERM}, {"fsync", EIO}, {"rename", EROFS}};

static unsigned long counts[kKindCount];
static int started;
static int failing = kKindCount;
static unsigned long first;
static unsigned long last;

__attribute__((constructor)) static void Start(void) {
  const char* fail = getenv("FAIL");
  for (int kind = 0; fail != NULL && kind < kKindCount; ++kind) {
    const size_t length = strlen(kKinds[kind].name);
    if (strncmp(fail, kKinds[kind].name, length) != 0 || fail[length] != ':') continue;
    char* end = NULL;
    failing = kind;
    first = strtoul(fail + length + 1, &end, 10);
    last = *end == '+' ? (unsigned long)-1 : first;
  }
}

static int (*program_main)(int, char**, char**);

static int Main(int argc, char** argv, char** environment) {
  started = 1;
  return program_main(argc, argv, environment);
}

/* By main the language's own libraries have what they need to tell of a failure. */
int __libc_start_main(int (*main)(int, char**, char**), int argc, char** argv, void (*init)(void),
                      void (*fini)(void), void (*loader_fini)(void), void* stack_end) {
  int (*behind)(int (*)(int, char**, char**), int, char**, void (*)(void), void (*)(void),
                void (*)(void), void*);
  *(void**)&behind = dlsym(RTLD_NEXT, "__libc_start_main");
  program_main = main;
  return behind(Main, argc, argv, init, fini, loader_fini, stack_end);
}

/* Without the functions below and without memory. */
__attribute__((destructor)) static void WriteCounts(void) {
  started = 0;
  const char* file = getenv("FAIL_COUNTS");
  if (file == NULL) return;
  const long fd =
      syscall(SYS_openat, AT_FDCWD, file, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
  for (int kind = 0; kind < kKindCount; ++kind) {
    char line[64];
    const int length = snprintf(line, sizeof line, "%s %lu\n", kKinds[kind].name, counts[kind]);
    syscall(SYS_write, fd, line, (size_t)length);
  }
  syscall(SYS_close, fd);
}

static int Fails(enum Kind kind) {
  if (!started) return 0;
  const unsigned long number = __atomic_add_fetch(&counts[kind], 1, __ATOMIC_RELAXED);
  if ((int)kind != failing || number < first || number > last) return 0;
  errno = kKinds[kind].error;
  return 1;
}

void* __libc_malloc(size_t size);
void* __libc_calloc(size_t count, size_t size);
void* __libc_realloc(void* block, size_t size);

void* malloc(size_t size) { return Fails(kMalloc) ? NULL : __libc_malloc(size); }
void* calloc(size_t count, size_t size) {
  return Fails(kMalloc) ? NULL : __libc_calloc(count, size);
}
void* realloc(void* block, size_t size) {
  return Fails(kMalloc) ? NULL : __libc_realloc(block, size);
}

/* The function behind one of the same name here. */
static void* Next(const char* name) { return dlsym(RTLD_NEXT, name); }

/* TYPE NAME PARAMETERS: fails with FAILURE, or calls the function behind it with ARGUMENTS. */
#define FAILING_WITH(failure, kind, type, name, parameters, arguments) \
  type name parameters;                                                \
  type name parameters {                                               \
    static type(*behind) parameters;                                   \
    if (Fails(kind)) return failure;                                   \
    if (behind == NULL) *(void**)&behind = Next(#name);                \
    return behind arguments;                                           \
  }
#define FAILING(kind, type, name, parameters, arguments) \
  FAILING_WITH(-1, kind, type, name, parameters, arguments)

/* The same of a function that takes a mode when it makes a file. */
#define FAILING_OPEN(name, parameters, arguments)                                  \
  int name parameters {                                                            \
    static int(*behind) parameters;                                                \
    va_list rest;                                                                  \
    va_start(rest, flags);                                                         \
    const int mode = (flags & (O_CREAT | O_TMPFILE)) != 0 ? va_arg(rest, int) : 0; \
    va_end(rest);                                                                  \
    if (Fails(kOpen)) return -1;                                                   \
    if (behind == NULL) *(void**)&behind = Next(#name);                            \
    return behind arguments;                                                       \
  }

FAILING_OPEN(open, (const char* path, int flags, ...), (path, flags, mode))
FAILING_OPEN(open64, (const char* path, int flags, ...), (path, flags, mode))
FAILING_OPEN(openat, (int at, const char* path, int flags, ...), (at, path, flags, mode))
FAILING_OPEN(openat64, (int at, const char* path, int flags, ...), (at, path, flags, mode))
/* What these are called in a fortified program. */
FAILING(kOpen, int, __open_2, (const char* path, int flags), (path, flags))
FAILING(kOpen, int, __open64_2, (const char* path, int flags), (path, flags))
FAILING(kOpen, int, __openat_2, (int at, const char* path, int flags), (at, path, flags))
FAILING(kOpen, int, __openat64_2, (int at, const char* path, int flags), (at, path, flags))
FAILING_WITH(NULL, kOpen, FILE*, fopen, (const char* path, const char* mode), (path, mode))
FAILING_WITH(NULL, kOpen, FILE*, fopen64, (const char* path, const char* mode), (path, mode))

/* openat2 has no function of its own. */
long syscall(long number, ...) {
  static long (*behind)(long, ...);
  va_list rest;
  va_start(rest, number);
  long argument[6];
  for (int i = 0; i < 6; ++i) argument[i] = va_arg(rest, long);
  va_end(rest);
  if (number == SYS_openat2 && Fails(kOpen)) return -1;
  if (behind == NULL) *(void**)&behind = Next("syscall");
  return behind(number, argument[0], argument[1], argument[2], argument[3], argument[4],
                argument[5]);
}

FAILING(kRead, ssize_t, read, (int fd, void* to, size_t size), (fd, to, size))
FAILING(kRead, ssize_t, pread, (int fd, void* to, size_t size, off_t at), (fd, to, size, at))
FAILING(kRead, ssize_t, pread64, (int fd, void* to, size_t size, off64_t at), (fd, to, size, at))
FAILING(kRead, ssize_t, readlink, (const char* path, char* to, size_t size), (path, to, size))
FAILING(kRead, ssize_t, readlinkat, (int at, const char* path, char* to, size_t size),
        (at, path, to, size))
FAILING_WITH(NULL, kRead, struct dirent*, readdir, (DIR * directory), (directory))
FAILING_WITH(NULL, kRead, struct dirent64*, readdir64, (DIR * directory), (directory))

FAILING(kWrite, ssize_t, write, (int fd, const void* from, size_t size), (fd, from, size))
FAILING(kWrite, ssize_t, pwrite, (int fd, const void* from, size_t size, off_t at),
        (fd, from, size, at))
FAILING(kWrite, ssize_t, pwrite64, (int fd, const void* from, size_t size, off64_t at),
        (fd, from, size, at))

struct stat;
struct stat64;
FAILING(kStat, int, stat, (const char* path, struct stat* to), (path, to))
FAILING(kStat, int, stat64, (const char* path, struct stat64* to), (path, to))
FAILING(kStat, int, lstat, (const char* path, struct stat* to), (path, to))
FAILING(kStat, int, lstat64, (const char* path, struct stat64* to), (path, to))
FAILING(kStat, int, fstat, (int fd, struct stat* to), (fd, to))
FAILING(kStat, int, fstat64, (int fd, struct stat64* to), (fd, to))
FAILING(kStat, int, fstatat, (int at, const char* path, struct stat* to, int flags),
        (at, path, to, flags))
FAILING(kStat, int, fstatat64, (int at, const char* path, struct stat64* to, int flags),
        (at, path, to, flags))
FAILING(kStat, int, access, (const char* path, int mode), (path, mode))
FAILING(kStat, int, faccessat, (int at, const char* path, int mode, int flags),
        (at, path, mode, flags))

FAILING(kChmod, int, fchmod, (int fd, mode_t mode), (fd, mode))

FAILING(kSync, int, fsync, (int fd), (fd))
FAILING(kSync, int, fdatasync, (int fd), (fd))

FAILING(kRename, int, rename, (const char* from, const char* to), (from, to))
FAILING(kRename, int, renameat, (int at, const char* from, int to, const char* name),
        (at, from, to, name))
FAILING(kRename, int, linkat, (int at, const char* from, int to, const char* name, int flags),
        (at, from, to, name, flags))
FAILING(kRename, int, renameat2,
        (int at, const char* from, int to, const char* name, unsigned int flags),
        (at, from, to, name, flags))
