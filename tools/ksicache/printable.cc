#include "tools/ksicache/printable.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdio>

#include "knvlibs/characters.h"

namespace ksicache {
namespace {

using ksi::Character;

std::string Formatted(const char* format, unsigned number) {
  std::array<char, 16> text;
  const int length = std::snprintf(text.data(), text.size(), format, number);
  return {text.data(), static_cast<size_t>(std::max(length, 0))};
}

std::string EscapedBytes(const Character&, std::string_view bytes) {
  std::string escaped;
  for (const char byte : bytes) {
    escaped += Formatted("\\x%02x", static_cast<unsigned char>(byte));
  }
  return escaped;
}

std::string EscapedJson(const Character& character, std::string_view bytes) {
  const auto code = static_cast<unsigned>(character.code);
  if (!character.isValid) return std::string(bytes);
  if (code < 0x10000) return Formatted("\\u%04x", code);
  const unsigned above = code - 0x10000;
  return Formatted("\\u%04x", 0xd800 + (above >> 10)) +
         Formatted("\\u%04x", 0xdc00 + (above & 0x3ff));
}

template <class Escape>
std::string Escaped(std::string_view text, Escape&& escape) {
  std::string result;
  result.reserve(text.size());
  while (!text.empty()) {
    const Character first = ksi::FirstOf(text);
    const std::string_view bytes = text.substr(0, first.size);
    if (ksi::IsShown(first)) {
      result += bytes;
    } else {
      result += escape(first, bytes);
    }
    text.remove_prefix(first.size);
  }
  return result;
}

}  // namespace

std::string Printable(std::string_view text) { return Escaped(text, EscapedBytes); }

std::string PrintableJson(std::string_view json) { return Escaped(json, EscapedJson); }

}  // namespace ksicache
