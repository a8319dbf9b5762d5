#include "knvlibs/linux/host/text.h"

#include <algorithm>
#include <charconv>

#include "knvlibs/characters.h"

namespace ksi {
namespace {

bool Parse(std::string_view text, int base, uint64_t& number) {
  const char* end = text.data() + text.size();
  uint64_t value = 0;
  const auto [stop, error] = std::from_chars(text.data(), end, value, base);
  if (error != std::errc() || stop != end) return false;
  number = value;
  return true;
}

}  // namespace

bool Lines::Next(std::string_view& line) {
  if (rest_.empty()) return false;
  const size_t end = std::min(rest_.find('\n'), rest_.size());
  line = rest_.substr(0, end);
  rest_.remove_prefix(std::min(end + 1, rest_.size()));
  ++number_;
  return true;
}

std::string_view TakeWord(std::string_view& text) {
  constexpr auto kIsBlank = [](char c) { return c == ' ' || c == '\t'; };
  const auto* const start = std::ranges::find_if_not(text, kIsBlank);
  const auto* const end = std::find_if(start, text.end(), kIsBlank);
  const std::string_view word(start, end);
  text = std::string_view(end, text.end());
  return word;
}

bool TakePrefix(std::string_view& text, std::string_view prefix) {
  if (!text.starts_with(prefix)) return false;
  text.remove_prefix(prefix.size());
  return true;
}

bool ParseNumber(std::string_view text, uint64_t& number) { return Parse(text, 10, number); }

bool ParseHex(std::string_view text, uint64_t& number) { return Parse(text, 16, number); }

std::string Printable(std::string_view name) {
  std::string printable;
  printable.reserve(name.size());
  while (!name.empty()) {
    const Character first = FirstOf(name);
    printable += IsShown(first) ? name.substr(0, first.size) : "?";
    name.remove_prefix(first.size);
  }
  return printable;
}

}  // namespace ksi
