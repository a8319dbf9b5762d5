#ifndef KNVLIBS_LINUX_HOST_FILE_DESCRIPTOR_H_
#define KNVLIBS_LINUX_HOST_FILE_DESCRIPTOR_H_

#include <unistd.h>

#include <cerrno>
#include <utility>

namespace ksi {

// Closed when its owner goes, which leaves errno as it is; -1 is none.
class FileDescriptor {
 public:
  explicit FileDescriptor(int fd = -1) : fd_(fd) {}
  FileDescriptor(FileDescriptor&& other) noexcept : fd_(other.Release()) {}
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    std::swap(fd_, other.fd_);
    return *this;
  }
  FileDescriptor(const FileDescriptor&) = delete;
  FileDescriptor& operator=(const FileDescriptor&) = delete;
  ~FileDescriptor() {
    const int error = errno;
    if (fd_ >= 0) close(fd_);
    errno = error;
  }

  int Get() const { return fd_; }
  bool IsOpen() const { return fd_ >= 0; }
  int Release() { return std::exchange(fd_, -1); }

 private:
  int fd_;
};

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_FILE_DESCRIPTOR_H_
