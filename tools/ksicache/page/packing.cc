#include "tools/ksicache/page/packing.h"

#define ZLIB_CONST  // it does not write to what it reads
#include <zlib.h>

#include <algorithm>
#include <array>
#include <limits>
#include <new>

namespace ksicache {

void PutNumber(std::string& bytes, uint64_t number) {
  for (; number >= 0x80; number >>= 7) bytes += static_cast<char>(number | 0x80);
  bytes += static_cast<char>(number);
}

Packer::Packer() : stream_(std::make_unique<z_stream>()) {
  if (deflateInit(stream_.get(), Z_BEST_COMPRESSION) != Z_OK) throw std::bad_alloc();
}

Packer::~Packer() { deflateEnd(stream_.get()); }

void Packer::Run(std::string_view bytes, bool isLast) {
  // The library counts in 32 bits.
  constexpr size_t kMost = std::numeric_limits<uInt>::max();
  do {
    const std::string_view piece = bytes.substr(0, kMost);
    bytes.remove_prefix(piece.size());
    stream_->next_in = reinterpret_cast<const Bytef*>(piece.data());
    stream_->avail_in = static_cast<uInt>(piece.size());
    std::array<char, 65536> room;
    do {
      stream_->next_out = reinterpret_cast<Bytef*>(room.data());
      stream_->avail_out = static_cast<uInt>(room.size());
      deflate(stream_.get(), isLast && bytes.empty() ? Z_FINISH : Z_NO_FLUSH);
      packed_.append(room.data(), room.size() - stream_->avail_out);
    } while (stream_->avail_out == 0);
  } while (!bytes.empty());
}

std::string Packer::Finish() {
  Run({}, true);
  return std::move(packed_);
}

std::string Packed(std::string_view bytes) {
  Packer packer;
  packer.Put(bytes);
  return packer.Finish();
}

std::string Base64(std::string_view bytes) {
  constexpr std::string_view kDigits =
      "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
  std::string text;
  text.reserve((bytes.size() + 2) / 3 * 4);
  for (size_t at = 0; at < bytes.size(); at += 3) {
    const size_t count = std::min<size_t>(3, bytes.size() - at);
    uint32_t bits = 0;
    for (size_t i = 0; i < 3; ++i) {
      bits = bits << 8 | (i < count ? static_cast<uint8_t>(bytes[at + i]) : 0);
    }
    for (size_t i = 0; i < 4; ++i) {
      text += i <= count ? kDigits[bits >> (18 - 6 * i) & 63] : '=';
    }
  }
  return text;
}

}  // namespace ksicache
