#include "tools/ksicache/new_file.h"

#include <fcntl.h>
#include <signal.h>
#include <stdio.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <cstdint>
#include <cstdio>
#include <memory>
#include <optional>

#include "tools/ksicache/error.h"
#include "tools/ksicache/mapped_file.h"
#include "tools/ksicache/recording_lock.h"

namespace ksicache {
namespace {

// While a file stands under a name that is not its own, no signal ends the process.
class WithoutSignals {
 public:
  WithoutSignals() {
    sigset_t all;
    sigfillset(&all);
    sigprocmask(SIG_SETMASK, &all, &before_);
  }
  WithoutSignals(const WithoutSignals&) = delete;
  WithoutSignals& operator=(const WithoutSignals&) = delete;
  ~WithoutSignals() { sigprocmask(SIG_SETMASK, &before_, nullptr); }

 private:
  sigset_t before_ = {};
};

std::string RandomEntry() {
  uint64_t number = 0;
  // Any number will do: a name that is taken is refused.
  if (getrandom(&number, sizeof number, 0) < 0) number = static_cast<uint64_t>(getpid());
  return ".ksicache." + Hex(number).substr(2);
}

std::string DirectoryOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  return slash == std::string::npos ? "." : path.substr(0, slash + 1);
}

std::string EntryOf(const std::string& path) {
  const size_t slash = path.rfind('/');
  return slash == std::string::npos ? path : path.substr(slash + 1);
}

Error Exists(const std::string& name) {
  return Error{name + ": exists already (--force replaces it)"};
}

// A name of an open file in a directory, which goes with its owner unless it is another file's. It
// takes no memory, for want of which the name would stay.
class TemporaryEntry {
 public:
  // REQUIRES: the text of the name lives as long.
  TemporaryEntry(int directory, const std::string& name, int file)
      : directory_(directory), name_(name), file_(file) {}
  TemporaryEntry(const TemporaryEntry&) = delete;
  TemporaryEntry& operator=(const TemporaryEntry&) = delete;
  ~TemporaryEntry() {
    if (IsOwn().value_or(true)) unlinkat(directory_, name_.c_str(), 0);
  }

  // rename(2), but only where nothing stands if `replace` is false.
  int RenameTo(const std::string& target, bool replace) const {
    const std::optional<bool> own = IsOwn();
    if (own == false) errno = ESTALE;
    if (!own.value_or(false)) return -1;
    if (!replace) {
      const int result =
          renameat2(directory_, name_.c_str(), directory_, target.c_str(), RENAME_NOREPLACE);
      // Not every file system knows how; that nothing stood there was seen at the start.
      if (result == 0 || (errno != EINVAL && errno != ENOSYS)) return result;
    }
    return renameat(directory_, name_.c_str(), directory_, target.c_str());
  }

 private:
  // None if it cannot be told; errno says why.
  std::optional<bool> IsOwn() const {
    struct stat named = {};
    struct stat open = {};
    if (fstatat(directory_, name_.c_str(), &named, AT_SYMLINK_NOFOLLOW) != 0 ||
        fstat(file_, &open) != 0) {
      return std::nullopt;
    }
    return named.st_dev == open.st_dev && named.st_ino == open.st_ino;
  }

  int directory_;
  const std::string& name_;
  int file_;
};

}  // namespace

Descriptor::~Descriptor() { Reset(-1); }

void Descriptor::Reset(int fd) {
  if (fd_ >= 0) close(fd_);
  fd_ = fd;
}

mode_t ModeOf(const CommandLine& line) {
  const std::string* text = line.ValueOf(kMode);
  if (text == nullptr) return NewFile::kMode;
  unsigned mode = 0;
  const char* end = text->data() + text->size();
  const auto [rest, error] = std::from_chars(text->data(), end, mode, 8);
  if (error != std::errc() || rest != end || mode > 0777) {
    throw UsageError("--mode takes up to 0777, in octal digits, such as 0640");
  }
  return mode;
}

void CheckOptionsFor(const std::string& target, const CommandLine& line) {
  if (target != "-") return;
  for (const Option* option : {&kForce, &kMode}) {
    if (line.Has(*option)) {
      throw UsageError(std::string("--") + option->name + " is for a file, not standard output");
    }
  }
}

NewFile::NewFile(std::string target, bool replace, mode_t mode)
    : name_(std::move(target)), replace_(replace), mode_(mode), standardOutput_(name_ == "-") {
  if (standardOutput_) {
    name_ = "standard output";
    if (isatty(STDOUT_FILENO) == 1) throw Error(name_ + ": is a terminal");
    return;
  }
  if (name_.empty()) throw UsageError("a file to make needs a name");
  entry_ = EntryOf(name_);
  directory_.Reset(open(DirectoryOf(name_).c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!directory_) throw SystemError(name_, errno);
  OpenListing();
  CheckTarget();
  OpenUnnamed();
}

// Now, because nothing may fail for want of a descriptor once the file has its name.
void NewFile::OpenListing() {
  listing_.Reset(openat(directory_.Get(), ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  // Who may make files in it may not always list them.
  if (!listing_ && errno != EACCES) throw SystemError(name_, errno);
}

void NewFile::CheckTarget() const {
  if (entry_.empty()) throw SystemError(name_, EISDIR);
  struct stat info = {};
  if (fstatat(directory_.Get(), entry_.c_str(), &info, AT_SYMLINK_NOFOLLOW) != 0) return;
  if (S_ISDIR(info.st_mode)) throw SystemError(name_, EISDIR);
  if (!replace_) throw Exists(name_);
  // A device is more than its name.
  if (!S_ISREG(info.st_mode) && !S_ISLNK(info.st_mode)) {
    throw Error(name_ + ": is not a file, and not replaced");
  }
  RequireNotRecorded();
}

// Else it would be recorded into a file that has no name.
void NewFile::RequireNotRecorded() const {
  if (!replace_) return;
  const Descriptor file(openat(directory_.Get(), entry_.c_str(),
                               O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_NOCTTY | O_CLOEXEC));
  if (!file) {
    // A file that is not there, is a link or may not be read is nobody's recording that is known
    // of.
    if (errno == ENOENT || errno == ELOOP || errno == EACCES) return;
    throw SystemError(name_, errno);
  }
  const std::string recorder = RecorderOf(file.Get());
  if (!recorder.empty()) throw Error(name_ + ": is being recorded by " + recorder);
}

void NewFile::RefuseInput(const std::string& fileName) const {
  if (standardOutput_) return;
  struct stat target = {};
  struct stat input = {};
  if (fstatat(directory_.Get(), entry_.c_str(), &target, AT_SYMLINK_NOFOLLOW) != 0 ||
      stat(fileName.c_str(), &input) != 0) {
    return;
  }
  if (target.st_dev == input.st_dev && target.st_ino == input.st_ino) {
    throw Error(name_ + ": is read, too, and not replaced");
  }
}

void NewFile::OpenUnnamed() {
  unnamed_.Reset(openat(directory_.Get(), ".", O_TMPFILE | O_RDWR | O_CLOEXEC, kMode));
  if (unnamed_) return;
  const bool unknown = errno == EOPNOTSUPP || errno == EISDIR || errno == EINVAL;
  if (!unknown || faccessat(directory_.Get(), ".", W_OK | X_OK, AT_EACCESS) != 0) {
    throw SystemError(name_, errno);
  }
}

void NewFile::OpenElsewhere() {
  const std::unique_ptr<std::FILE, int (*)(std::FILE*)> file(std::tmpfile(), std::fclose);
  if (file != nullptr) unnamed_.Reset(dup(fileno(file.get())));
  if (!unnamed_) throw SystemError("a temporary file", errno);
  isElsewhere_ = true;
}

void NewFile::WriteTo(int fd, std::span<const std::byte> content) const {
  while (!content.empty()) {
    const ssize_t written = write(fd, content.data(), content.size());
    if (written < 0 && errno != EINTR) throw SystemError(name_ + ": cannot write", errno);
    if (written > 0) content = content.subspan(static_cast<size_t>(written));
  }
}

// Gives a file its rights, and brings it to the disk.
void NewFile::Settle(int fd) const {
  if (fchmod(fd, mode_) != 0 || fsync(fd) != 0) throw SystemError(name_ + ": cannot write", errno);
}

void NewFile::Write(std::span<const std::byte> content) {
  if (!standardOutput_ && !unnamed_) OpenElsewhere();
  WriteTo(standardOutput_ ? STDOUT_FILENO : unnamed_.Get(), content);
}

void NewFile::Commit(std::span<const std::byte> content) {
  if (standardOutput_ || unnamed_) {
    Write(content);
    return CommitWritten();
  }
  RequireNotRecorded();
  CommitNamed(content);
  SyncDirectory();
}

void NewFile::CommitWritten() {
  if (standardOutput_) return;
  RequireNotRecorded();
  if (isElsewhere_ || !CommitUnnamed()) CommitNamed(MappedFile(unnamed_.Get()).Content());
  SyncDirectory();
}

// Whether the unnamed file has got a name; errno says why not.
bool NewFile::LinkUnnamed(const std::string& entry) const {
  const std::string file = "/proc/self/fd/" + std::to_string(unnamed_.Get());
  return linkat(AT_FDCWD, file.c_str(), directory_.Get(), entry.c_str(), AT_SYMLINK_FOLLOW) == 0;
}

// False if unnamed files get no names here: there is no /proc, or the file system refuses.
bool NewFile::CommitUnnamed() const {
  Settle(unnamed_.Get());
  if (LinkUnnamed(entry_)) return true;
  if (errno != EEXIST) return false;
  if (!replace_) throw Exists(name_);
  // No call links a file in the place of another, but one renames it there.
  const WithoutSignals here;
  const std::string entry = RandomEntry();
  if (!LinkUnnamed(entry)) return false;
  Rename(entry, unnamed_.Get());
  return true;
}

void NewFile::CommitNamed(std::span<const std::byte> content) const {
  const WithoutSignals here;
  const std::string entry = RandomEntry();
  const Descriptor file(openat(directory_.Get(), entry.c_str(),
                               O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, kMode));
  if (!file) throw SystemError(name_, errno);
  const TemporaryEntry temporary(directory_.Get(), entry, file.Get());
  WriteTo(file.Get(), content);
  Settle(file.Get());
  Rename(entry, file.Get());
}

// Gives the file its own name for this one, which goes in any case.
void NewFile::Rename(const std::string& entry, int fd) const {
  const TemporaryEntry temporary(directory_.Get(), entry, fd);
  if (temporary.RenameTo(entry_, replace_) == 0) return;
  if (errno == EEXIST) throw Exists(name_);
  throw SystemError(name_, errno);
}

// The name is on the disk when its directory is.
void NewFile::SyncDirectory() const {
  if (!listing_ || fsync(listing_.Get()) == 0) return;
  // Some file systems cannot sync a directory.
  if (errno != EINVAL) throw SystemError(name_ + ": is whole, but may not outlast a crash", errno);
}

}  // namespace ksicache
