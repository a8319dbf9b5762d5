#include "tools/ksicache/error.h"

#include <array>
#include <cstdio>
#include <cstring>

namespace ksicache {

Error SystemError(const std::string& fileName, int error) {
  return Error(fileName + ": " + std::strerror(error));
}

std::string Hex(ksi::Status status) {
  std::array<char, 16> text;
  std::snprintf(text.data(), text.size(), "%#x", status);
  return text.data();
}

std::string NameOf(std::string_view path, const ksi::Keys& keys) {
  std::string name(path);
  for (size_t i = 0; i < keys.count; ++i) {
    const ksi::Key& key = keys[i];
    name += " [";
    name += key.kind == ksi::KeyKind::kNumber ? std::to_string(key.number) : Printable(key.text);
    name += ']';
  }
  return name;
}

std::string Printable(std::string_view text) {
  std::string result;
  for (const char c : text) {
    if (static_cast<unsigned char>(c) < ' ' || c == '\x7f') {
      std::array<char, 8> code;
      std::snprintf(code.data(), code.size(), "\\x%02x", static_cast<unsigned char>(c));
      result += code.data();
    } else {
      result += c;
    }
  }
  return result;
}

}  // namespace ksicache
