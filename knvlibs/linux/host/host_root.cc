#include "knvlibs/linux/host/host_root.h"

#include <fcntl.h>
#include <linux/openat2.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <vector>

namespace ksi {
namespace {

// As many as the kernel follows.
constexpr int kMostLinks = 40;

// A path that is followed from a directory that it does not leave.
class Walk {
 public:
  Walk(int root, std::string_view path) : root_(root) { Prepend(path); }

  FileDescriptor Open(int flags) {
    while (!ahead_.empty()) {
      const std::string name = std::move(ahead_.back());
      ahead_.pop_back();
      if (name == ".") continue;
      if (name == "..") {
        if (above_.empty()) leftRoot_ = true;
        if (!above_.empty()) above_.pop_back();
        continue;
      }
      FileDescriptor next(openat(Here(), name.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC));
      if (!next.IsOpen()) return next;
      const std::optional<std::string> target = TargetOf(next);
      const bool isEnd = ahead_.empty();
      if (isEnd && (!target || (flags & O_NOFOLLOW) != 0)) {
        return FileDescriptor(openat(Here(), name.c_str(), flags | O_NOFOLLOW));
      }
      if (!target) {
        above_.push_back(std::move(next));
      } else if (!Follow(*target)) {
        return FileDescriptor();
      }
    }
    return FileDescriptor(openat(Here(), ".", flags));
  }

  // Whether it came to a step that leads out of the root, and was taken as one from the root.
  bool LeftRoot() const { return leftRoot_; }

 private:
  int Here() const { return above_.empty() ? root_ : above_.back().Get(); }

  // Where a link leads; none if it is no link.
  static std::optional<std::string> TargetOf(const FileDescriptor& file) {
    std::array<char, PATH_MAX> text;
    const ssize_t length = readlinkat(file.Get(), "", text.data(), text.size());
    if (length < 0) return std::nullopt;
    return std::string(text.data(), static_cast<size_t>(length));
  }

  bool Follow(std::string_view target) {
    if (++links_ > kMostLinks) {
      errno = ELOOP;
      return false;
    }
    if (target.starts_with('/')) {
      above_.clear();
      leftRoot_ = true;
    }
    Prepend(target);
    return true;
  }

  // Goes by the steps of `path` before those that are ahead.
  void Prepend(std::string_view path) {
    const size_t behind = ahead_.size();
    while (!path.empty()) {
      const size_t end = std::min(path.find('/'), path.size());
      if (end != 0) ahead_.emplace_back(path.substr(0, end));
      path.remove_prefix(std::min(end + 1, path.size()));
    }
    std::reverse(ahead_.begin() + static_cast<ptrdiff_t>(behind), ahead_.end());
  }

  int root_;
  std::vector<FileDescriptor> above_;  // the directories from the root, which is none of them, on
  std::vector<std::string> ahead_;     // the next step is the last
  int links_ = 0;
  bool leftRoot_ = false;
};

FileDescriptor OpenByKernel(int root, const std::string& path, int flags) {
  open_how how = {};
  how.flags = static_cast<uint64_t>(flags);
  how.resolve = RESOLVE_IN_ROOT | RESOLVE_NO_MAGICLINKS;
  return FileDescriptor(
      static_cast<int>(syscall(SYS_openat2, root, path.c_str(), &how, sizeof how)));
}

}  // namespace

HostRoot::HostRoot(std::string_view directory)
    : isThisMachine_(directory.find_first_not_of('/') == std::string_view::npos) {
  if (isThisMachine_) return;
  root_ = FileDescriptor(open(std::string(directory).c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!root_.IsOpen()) error_ = errno;
}

FileDescriptor HostRoot::Open(std::string_view path, int flags) const {
  const std::string name(path);
  flags |= O_CLOEXEC;
  if (isThisMachine_) return FileDescriptor(open(name.c_str(), flags));
  if (!root_.IsOpen()) {
    errno = error_;
    return FileDescriptor();
  }
  FileDescriptor file = OpenByKernel(root_.Get(), name, flags);
  // EAGAIN: something was renamed meanwhile, and the kernel is not sure where it is.
  const bool isOffered = errno != ENOSYS && errno != EPERM && errno != EAGAIN;
  if (file.IsOpen() || isOffered) return file;
  return OpenBelow(root_.Get(), path, flags);
}

bool HostRoot::LeadsOut(std::string_view path) const {
  if (!root_.IsOpen()) return false;
  Walk walk(root_.Get(), path);
  return !walk.Open(O_PATH | O_CLOEXEC).IsOpen() && errno == ENOENT && walk.LeftRoot();
}

FileDescriptor OpenBelow(int root, std::string_view path, int flags) {
  return Walk(root, path).Open(flags | O_CLOEXEC);
}

}  // namespace ksi
