#include "tools/ksicache/temporary_file.h"

#include <fcntl.h>
#include <signal.h>
#include <stdio.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <cstring>

#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// The name for the signal handler; empty: nothing to remove.
char toRemove[PATH_MAX];

constexpr int kSignals[] = {SIGHUP, SIGINT, SIGTERM};

void RemoveAndDie(int signal) {
  unlink(toRemove);
  static_cast<void>(raise(signal));  // with its default action, which SA_RESETHAND brought back
}

void SetHandlers(void (*handler)(int)) {
  struct sigaction action = {};
  action.sa_handler = handler;
  action.sa_flags = static_cast<int>(SA_RESETHAND) | SA_NODEFER;
  for (const int signal : kSignals) {
    struct sigaction before = {};
    sigaction(signal, nullptr, &before);
    // What nohup ignores stays ignored.
    if (before.sa_handler != SIG_IGN) sigaction(signal, &action, nullptr);
  }
}

std::string DirectoryOf(const std::string& fileName) {
  const size_t slash = fileName.rfind('/');
  return slash == std::string::npos ? "." : slash == 0 ? "/" : fileName.substr(0, slash);
}

mode_t Umask() {
  const mode_t mask = umask(0);
  umask(mask);
  return mask;
}

Error Exists(const std::string& target) {
  return Error{target + ": exists already (--force replaces it)"};
}

// rename(2), but only where nothing stands if `replace` is false.
int Rename(const std::string& from, const std::string& to, bool replace) {
  if (!replace) {
    const int result = renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), RENAME_NOREPLACE);
    // Not every file system knows how; that nothing stood there was seen at the start.
    if (result == 0 || (errno != EINVAL && errno != ENOSYS)) return result;
  }
  return rename(from.c_str(), to.c_str());
}

}  // namespace

TemporaryFile::TemporaryFile(std::string target, bool replace)
    : target_(std::move(target)), replace_(replace) {
  struct stat info;
  if (lstat(target_.c_str(), &info) == 0) {
    if (S_ISDIR(info.st_mode)) throw SystemError(target_, EISDIR);
    if (!replace_) throw Exists(target_);
  }
  name_ = target_ + ".XXXXXX";
  if (name_.size() >= sizeof toRemove) throw SystemError(target_, ENAMETOOLONG);

  // A signal in between would leave the file.
  sigset_t all;
  sigset_t before;
  sigfillset(&all);
  sigprocmask(SIG_SETMASK, &all, &before);
  fd_ = mkstemp(name_.data());
  const int error = errno;
  if (fd_ >= 0) {
    std::memcpy(toRemove, name_.c_str(), name_.size() + 1);
    SetHandlers(RemoveAndDie);
  }
  sigprocmask(SIG_SETMASK, &before, nullptr);
  if (fd_ < 0) throw SystemError(target_, error);
  fchmod(fd_, 0666 & ~Umask());
}

TemporaryFile::~TemporaryFile() {
  if (fd_ < 0) return;
  unlink(name_.c_str());
  close(fd_);
  SetHandlers(SIG_DFL);
}

void TemporaryFile::Commit() {
  if (fsync(fd_) != 0) throw SystemError(target_, errno);
  if (Rename(name_, target_, replace_) != 0) {
    if (errno == EEXIST) throw Exists(target_);
    throw SystemError(target_, errno);
  }
  SetHandlers(SIG_DFL);
  close(fd_);
  fd_ = -1;

  // The name is on the disk when its directory is.
  const int directory = open(DirectoryOf(target_).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  const bool synced = directory >= 0 && fsync(directory) == 0;
  const int error = errno;
  if (directory >= 0) close(directory);
  // Some file systems cannot sync a directory.
  if (!synced && error != EINVAL && error != EACCES) throw SystemError(target_, error);
}

}  // namespace ksicache
