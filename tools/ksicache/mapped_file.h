#ifndef TOOLS_KSICACHE_MAPPED_FILE_H_
#define TOOLS_KSICACHE_MAPPED_FILE_H_

#include <cstddef>
#include <span>

namespace ksicache {

// The bytes of an open file that nobody changes meanwhile, without memory of their own.
class MappedFile {
 public:
  // Fails with an Error.
  explicit MappedFile(int file);
  MappedFile(const MappedFile&) = delete;
  MappedFile& operator=(const MappedFile&) = delete;
  ~MappedFile();

  std::span<const std::byte> Content() const { return content_; }

 private:
  std::span<std::byte> content_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MAPPED_FILE_H_
