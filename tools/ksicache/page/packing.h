// How a page carries its data: numbers as bytes, deflated, in base64.
#ifndef TOOLS_KSICACHE_PAGE_PACKING_H_
#define TOOLS_KSICACHE_PAGE_PACKING_H_

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>

struct z_stream_s;

namespace ksicache {

// Seven bits a byte, the lowest first; all bytes but the last have the top bit.
void PutNumber(std::string& bytes, uint64_t number);

// 0, -1, 1, -2, ... as 0, 1, 2, 3, ..., so that small differences are small numbers.
constexpr uint64_t Folded(int64_t number) {
  return (static_cast<uint64_t>(number) << 1) ^ static_cast<uint64_t>(number >> 63);
}

// Deflates what it is given, in zlib's format.
class Packer {
 public:
  Packer();
  Packer(const Packer&) = delete;
  Packer& operator=(const Packer&) = delete;
  ~Packer();

  void Put(std::string_view bytes) { Run(bytes, false); }

  // How much has come out so far.
  size_t Size() const { return packed_.size(); }

  // All of it; nothing may be put any more.
  std::string Finish();

 private:
  void Run(std::string_view bytes, bool isLast);

  std::unique_ptr<z_stream_s> stream_;
  std::string packed_;
};

std::string Packed(std::string_view bytes);

std::string Base64(std::string_view bytes);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_PACKING_H_
