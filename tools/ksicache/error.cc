#include "tools/ksicache/error.h"

#include <array>
#include <charconv>
#include <cstring>
#include <iterator>

#include <knvlibs/ksi_status_text.h>
#include "knvlibs/characters.h"

namespace ksicache {

Error SystemError(const std::string& fileName, int error) {
  return Error{fileName + ": " + std::strerror(error)};
}

std::string Hex(uint64_t number) {
  std::array<char, 18> text = {'0', 'x'};
  const auto [end, error] = std::to_chars(text.data() + 2, text.data() + text.size(), number, 16);
  return {text.data(), end};
}

std::string StatusText(ksi::Status status) {
  static constexpr const char* kTexts[] = {
#define TEXT(row, text) text,
      KSI_STATUS_TEXTS(TEXT)
#undef TEXT
  };
  const size_t row = status - KSI_STATUS_BASE;
  return Hex(status) + (row < std::size(kTexts) ? std::string(" ") + kTexts[row] : "");
}

std::string NameOf(std::string_view path, const ksi::Keys& keys) {
  std::string name(path);
  for (size_t i = 0; i < keys.count; ++i) {
    const ksi::Key& key = keys[i];
    name += " [";
    name += key.kind == ksi::KeyKind::kNumber ? std::to_string(key.number) : std::string(key.text);
    name += ']';
  }
  return name;
}

std::string Cut(std::string_view text) {
  constexpr size_t kLongest = 100;
  return std::string(ksi::CutAtCharacter(text, kLongest)) + (text.size() > kLongest ? "..." : "");
}

}  // namespace ksicache
