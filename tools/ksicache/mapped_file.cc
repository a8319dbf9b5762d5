#include "tools/ksicache/mapped_file.h"

#include <sys/mman.h>
#include <sys/stat.h>

#include <cerrno>

#include "tools/ksicache/error.h"

namespace ksicache {

MappedFile::MappedFile(int file) {
  struct stat info = {};
  if (fstat(file, &info) != 0) throw SystemError("a temporary file", errno);
  if (info.st_size == 0) return;  // which cannot be mapped
  const auto size = static_cast<size_t>(info.st_size);
  void* content = mmap(nullptr, size, PROT_READ, MAP_PRIVATE, file, 0);
  if (content == MAP_FAILED) throw SystemError("a temporary file", errno);
  content_ = {static_cast<std::byte*>(content), size};
}

MappedFile::~MappedFile() {
  if (!content_.empty()) munmap(content_.data(), content_.size());
}

}  // namespace ksicache
