// Numbers and texts one after the other, as short as they are.
//
// An unsigned number takes 7 bits of a byte, the lowest first, and the 8th says that more follow. A
// signed one is written as an unsigned one that is small where its amount is: 0, -1, 1, -2 ... as
// 0, 1, 2, 3. A text is its size and its bytes.
#ifndef KNVLIBS_RECORDING_BYTES_H_
#define KNVLIBS_RECORDING_BYTES_H_

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

namespace ksi {

using Bytes = std::vector<std::byte>;
using ByteView = std::span<const std::byte>;

class ByteWriter {
 public:
  void Unsigned(uint64_t number) {
    for (; number >= 0x80; number >>= 7) Byte(static_cast<uint8_t>(number | 0x80));
    Byte(static_cast<uint8_t>(number));
  }
  void Signed(int64_t number) { Unsigned(Folded(number)); }
  // The bytes after the first one go elsewhere.
  void Signed(int64_t number, ByteWriter& more) {
    const uint64_t folded = Folded(number);
    Byte(static_cast<uint8_t>(folded < 0x80 ? folded : folded | 0x80));
    if (folded >= 0x80) more.Unsigned(folded >> 7);
  }
  void Byte(uint8_t byte) { bytes_.push_back(std::byte{byte}); }
  void Raw(ByteView bytes) { bytes_.insert(bytes_.end(), bytes.begin(), bytes.end()); }
  void Text(std::string_view text) {
    Unsigned(text.size());
    Raw(std::as_bytes(std::span(text)));
  }

  const Bytes& All() const { return bytes_; }

 private:
  static uint64_t Folded(int64_t number) {
    return static_cast<uint64_t>(number) << 1 ^ static_cast<uint64_t>(number >> 63);
  }

  Bytes bytes_;
};

// Reads what may be damaged: past the end, or with more bits than a number has, all that is read is
// 0 or empty, and IsGood tells it.
class ByteReader {
 public:
  ByteReader() = default;
  explicit ByteReader(ByteView bytes) : bytes_(bytes) {}

  uint64_t Unsigned() {
    // Most numbers are one byte.
    if (at_ < bytes_.size() && bytes_[at_] < std::byte{0x80}) {
      return static_cast<uint8_t>(bytes_[at_++]);
    }
    uint64_t number = 0;
    for (unsigned shift = 0; at_ < bytes_.size(); shift += 7) {
      const auto byte = static_cast<uint8_t>(bytes_[at_++]);
      number |= uint64_t{byte & 0x7fu} << shift;
      if (byte < 0x80) return number;
      if (shift == 63) break;
    }
    return Fail();
  }
  int64_t Signed() { return Unfolded(Unsigned()); }
  int64_t Signed(ByteReader& more) {
    const uint8_t first = Byte();
    return Unfolded(first < 0x80 ? first : more.Unsigned() << 7 | (first & 0x7fu));
  }
  // An unsigned number that is at most `most`.
  uint64_t Bounded(uint64_t most) {
    const uint64_t number = Unsigned();
    return number <= most ? number : Fail();
  }
  uint8_t Byte() {
    if (at_ == bytes_.size()) return static_cast<uint8_t>(Fail());
    return static_cast<uint8_t>(bytes_[at_++]);
  }
  ByteView Raw(size_t size) {
    if (size > Left()) {
      Fail();
      return {};
    }
    at_ += size;
    return bytes_.subspan(at_ - size, size);
  }
  std::string_view Text() {
    const ByteView raw = Raw(Unsigned());
    return {reinterpret_cast<const char*>(raw.data()), raw.size()};
  }

  size_t Left() const { return bytes_.size() - at_; }
  bool IsGood() const { return good_; }
  bool IsAtEnd() const { return good_ && Left() == 0; }

 private:
  static int64_t Unfolded(uint64_t number) {
    return static_cast<int64_t>(number >> 1 ^ (~(number & 1) + 1));
  }

  uint64_t Fail() {
    good_ = false;
    at_ = bytes_.size();
    return 0;
  }

  ByteView bytes_;
  size_t at_ = 0;
  bool good_ = true;
};

}  // namespace ksi

#endif  // KNVLIBS_RECORDING_BYTES_H_
