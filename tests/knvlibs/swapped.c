/* Stands before the C library: once the file SWAPPED has been looked at, SWAPPED_FOR is in its
 * place. */
#undef _FORTIFY_SOURCE
#define _GNU_SOURCE
#include <fcntl.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>

static int Look(const char* path, void* to, int flags) {
  const int result = fstatat(AT_FDCWD, path, to, flags);
  const char* swapped = getenv("SWAPPED");
  const char* other = getenv("SWAPPED_FOR");
  if (swapped != NULL && other != NULL && strcmp(path, swapped) == 0) rename(other, swapped);
  return result;
}

__attribute__((visibility("default"))) int stat(const char* restrict path,
                                                struct stat* restrict to) {
  return Look(path, to, 0);
}

__attribute__((visibility("default"))) int lstat(const char* restrict path,
                                                 struct stat* restrict to) {
  return Look(path, to, AT_SYMLINK_NOFOLLOW);
}
