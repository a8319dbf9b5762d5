// The bytes of an input, taken from the front. When they are used up, zeros follow.
#ifndef TESTS_FUZZ_FEED_H_
#define TESTS_FUZZ_FEED_H_

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <span>
#include <string>

namespace fuzz {

class Feed {
 public:
  explicit Feed(std::span<const uint8_t> bytes) : rest_(bytes) {}

  bool Empty() const { return rest_.empty(); }

  uint8_t Byte() { return Number<uint8_t>(); }

  template <class T>
  T Number() {
    T number = 0;
    Fill({reinterpret_cast<uint8_t*>(&number), sizeof number});
    return number;
  }

  void Fill(std::span<uint8_t> out) {
    const size_t count = std::min(out.size(), rest_.size());
    if (count > 0) std::memcpy(out.data(), rest_.data(), count);
    std::ranges::fill(out.subspan(count), uint8_t{0});
    rest_ = rest_.subspan(count);
  }

  // As many characters, fewer at the end of the input.
  std::string Text(size_t length) {
    const auto taken = rest_.first(std::min(length, rest_.size()));
    rest_ = rest_.subspan(taken.size());
    return {taken.begin(), taken.end()};
  }

 private:
  std::span<const uint8_t> rest_;
};

}  // namespace fuzz

#endif  // TESTS_FUZZ_FEED_H_
