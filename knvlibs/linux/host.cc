#include "knvlibs/linux/host.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>

#include "knvlibs/include/knvlibs/ksi.h"

namespace ksi {
namespace {

// No file that is read whole is anywhere near this large.
constexpr size_t kLargestFile = size_t{64} << 20;

class FileDescriptor {
 public:
  explicit FileDescriptor(int fd) : fd_(fd) {}
  FileDescriptor(const FileDescriptor&) = delete;
  FileDescriptor& operator=(const FileDescriptor&) = delete;
  ~FileDescriptor() {
    if (fd_ >= 0) close(fd_);
  }
  int get() const { return fd_; }

 private:
  int fd_;
};

std::string WithoutLastSlash(std::string path) {
  while (!path.empty() && path.back() == '/') path.pop_back();
  return path;
}

}  // namespace

LinuxHost::LinuxHost(std::string root)
    : root_(WithoutLastSlash(std::move(root))),
      pageKB_(static_cast<uint64_t>(sysconf(_SC_PAGESIZE)) / 1024) {}

Status LinuxHost::Read(std::string_view file, std::string* content) const {
  std::string path = root_;
  path += file;
  // Without O_NONBLOCK a FIFO in a recorded tree would hold the program up.
  const FileDescriptor fd(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK));
  if (fd.get() < 0) return StatusOfErrno(errno);

  // Kernel files have no size to ask for: grow until a read comes back empty.
  size_t length = 0;
  content->resize(16384);
  for (;;) {
    const ssize_t count = read(fd.get(), content->data() + length, content->size() - length);
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return StatusOfErrno(errno);
    if (count == 0) break;
    length += static_cast<size_t>(count);
    if (length == content->size()) {
      if (length >= kLargestFile) return KSI_STATUS_READ_ERROR;
      content->resize(2 * length);
    }
  }
  content->resize(length);
  return kOk;
}

Status NotUnderstood(std::string_view file, size_t line) {
  Warning("%.*s: line %zu is not understood\n", static_cast<int>(file.size()), file.data(), line);
  return KSI_STATUS_INVALID_METADATA;
}

}  // namespace ksi
