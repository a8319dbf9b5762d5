#include "tests/ksicache/write_log.h"

#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <stdexcept>

namespace {

ksi::WriteLog* current = nullptr;

}  // namespace

// The linker puts these in the place of the calls that they have the names of.
extern "C" {

ssize_t __real_pwrite(int descriptor, const void* bytes, size_t size, off_t offset);
int __real_fdatasync(int descriptor);

ssize_t __wrap_pwrite(int descriptor, const void* bytes, size_t size, off_t offset) {
  const ssize_t done = __real_pwrite(descriptor, bytes, size, offset);
  if (current != nullptr && done > 0) {
    current->Add({offset, {static_cast<const char*>(bytes), static_cast<size_t>(done)}});
  }
  return done;
}

int __wrap_fdatasync(int descriptor) {
  if (current == nullptr) return __real_fdatasync(descriptor);
  current->Add({});
  return 0;
}

}  // extern "C"

namespace ksi {

WriteLog::WriteLog() { current = this; }

WriteLog::~WriteLog() { current = nullptr; }

void Apply(const WriteLog::Write& write, std::string& content) {
  const auto at = static_cast<size_t>(write.offset);
  content.resize(std::max(content.size(), at + write.bytes.size()));
  content.replace(at, write.bytes.size(), write.bytes);
}

Image::Image(const std::string& content) : descriptor_(memfd_create("image", MFD_CLOEXEC)) {
  if (descriptor_ < 0) throw std::runtime_error("no memory for an image");
  Apply({0, content});
}

Image::~Image() { close(descriptor_); }

void Image::Apply(const WriteLog::Write& write) const {
  if (write.IsSync()) return;
  if (__real_pwrite(descriptor_, write.bytes.data(), write.bytes.size(), write.offset) !=
      static_cast<ssize_t>(write.bytes.size())) {
    throw std::runtime_error("no room in an image");
  }
}

}  // namespace ksi
