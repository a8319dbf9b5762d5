// Records made of bytes at offsets, not through their structs: for tests of where fields lie.
#ifndef TESTS_HARNESS_RAW_RECORD_H_
#define TESTS_HARNESS_RAW_RECORD_H_

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>

namespace harness {

inline constexpr uint64_t kAllOnes = UINT64_MAX;

// `megabytes` MB in KB and nearly one more, so that each display unit drops something: n MB are
// 1024 n + 1023 KB and 256 n + 255 pages.
constexpr uint64_t Kb(uint64_t megabytes) { return 1024 * megabytes + 1023; }

class RawRecord {
 public:
  // Bytes that no field is put into stand out.
  explicit RawRecord(size_t size) : bytes_(size, '\xa5') {}

  RawRecord& U8(size_t offset, uint8_t value) { return Put(offset, value); }
  RawRecord& U32(size_t offset, uint32_t value) { return Put(offset, value); }
  RawRecord& U64(size_t offset, uint64_t value) { return Put(offset, value); }

  // The same value at each of these offsets.
  RawRecord& U32(std::initializer_list<size_t> offsets, uint32_t value) {
    for (const size_t offset : offsets) U32(offset, value);
    return *this;
  }
  RawRecord& U64(std::initializer_list<size_t> offsets, uint64_t value) {
    for (const size_t offset : offsets) U64(offset, value);
    return *this;
  }

  // The bytes of `text` and no NUL.
  RawRecord& Text(size_t offset, std::string_view text) {
    bytes_.replace(offset, text.size(), text);
    return *this;
  }

  // 64-bit fields at these offsets: Kb(first), Kb(first + 1) and so on.
  RawRecord& Amounts(uint64_t first, std::initializer_list<size_t> offsets) {
    for (const size_t offset : offsets) U64(offset, Kb(first++));
    return *this;
  }

  operator std::string_view() const { return bytes_; }  // NOLINT: implicit

 private:
  template <std::unsigned_integral Field>
  RawRecord& Put(size_t offset, Field value) {
    for (size_t i = 0; i < sizeof value; ++i) {
      bytes_.at(offset + i) = static_cast<char>(uint64_t{value} >> (8 * i));
    }
    return *this;
  }

  std::string bytes_;
};

}  // namespace harness

#endif  // TESTS_HARNESS_RAW_RECORD_H_
