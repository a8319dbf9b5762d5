#include "tools/ksicache/recording_lock.h"

#include <fcntl.h>
#include <unistd.h>

namespace ksicache {
namespace {

// Where the locks lie, beyond all that a file can hold.
constexpr off_t kLockAt = off_t{1} << 61;
constexpr off_t kTellingLockAt = kLockAt + 1;

struct flock LockAt(off_t place) {
  struct flock lock = {};
  lock.l_type = F_WRLCK;
  lock.l_whence = SEEK_SET;
  lock.l_start = place;
  lock.l_len = 1;
  return lock;
}

}  // namespace

bool LockRecording(int file) {
  struct flock lock = LockAt(kLockAt);
  return fcntl(file, F_OFD_SETLK, &lock) == 0;
}

void TellRecorder(int file) {
  struct flock lock = LockAt(kTellingLockAt);
  static_cast<void>(fcntl(file, F_SETLK, &lock));
}

std::string RecorderOf(int file) {
  struct flock lock = LockAt(kLockAt);
  if (fcntl(file, F_OFD_GETLK, &lock) != 0 || lock.l_type == F_UNLCK) return "";
  lock = LockAt(kTellingLockAt);
  const bool isTold = fcntl(file, F_GETLK, &lock) == 0 && lock.l_type != F_UNLCK;
  return isTold && lock.l_pid > 0 ? "process " + std::to_string(lock.l_pid) : "another process";
}

}  // namespace ksicache
