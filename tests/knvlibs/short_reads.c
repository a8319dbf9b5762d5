/* Stands before the C library: a read at an offset gives no more than a few bytes at once. */
#undef _FORTIFY_SOURCE
#define _GNU_SOURCE
#include <sys/syscall.h>
#include <sys/types.h>
#include <unistd.h>

#pragma GCC visibility push(default)

ssize_t pread(int fd, void* to, size_t size, off_t at) {
  const size_t most = 1000;
  return syscall(SYS_pread64, fd, to, size < most ? size : most, at);
}
ssize_t pread64(int fd, void* to, size_t size, off64_t at) { return pread(fd, to, size, at); }

/* What these are called in a fortified program. */
ssize_t __pread_chk(int fd, void* to, size_t size, off_t at, size_t room);
ssize_t __pread64_chk(int fd, void* to, size_t size, off64_t at, size_t room);
ssize_t __pread_chk(int fd, void* to, size_t size, off_t at, size_t room) {
  (void)room;
  return pread(fd, to, size, at);
}
ssize_t __pread64_chk(int fd, void* to, size_t size, off64_t at, size_t room) {
  (void)room;
  return pread(fd, to, size, at);
}
