#include "tools/ksicache/printable.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstdio>

namespace ksicache {
namespace {

struct Range {
  char32_t first;
  char32_t last;
};

constexpr Range kNotShown[] = {
    {0x0, 0x1f},         // controls
    {0x7f, 0x9f},        // more of them: U+009B begins a command like ESC [
    {0xad, 0xad},        // soft hyphen
    {0x61c, 0x61c},      // direction mark
    {0x180e, 0x180e},    // no width
    {0x200b, 0x200f},    // no width, direction marks
    {0x2028, 0x202e},    // ends of lines and paragraphs, directions
    {0x2060, 0x206f},    // no width, directions
    {0xfeff, 0xfeff},    // no width
    {0xfff9, 0xfffb},    // annotations
    {0xe0000, 0xe007f},  // tags
};

bool IsShown(char32_t code) {
  return std::ranges::none_of(
      kNotShown, [code](const Range& range) { return code >= range.first && code <= range.last; });
}

// The character at the start of a text.
struct Character {
  char32_t code;
  size_t size;  // in bytes
  bool valid;
};

constexpr Character kBadByte = {0, 1, false};

Character FirstOf(std::string_view text) {
  const auto lead = static_cast<unsigned char>(text[0]);
  if (lead < 0x80) return {lead, 1, true};
  const auto size = static_cast<size_t>(std::countl_one(lead));
  if (size < 2 || size > 4 || size > text.size()) return kBadByte;
  char32_t code = lead & (0x7fu >> size);
  for (size_t i = 1; i < size; ++i) {
    const auto byte = static_cast<unsigned char>(text[i]);
    if ((byte & 0xc0) != 0x80) return kBadByte;
    code = code << 6 | (byte & 0x3f);
  }
  constexpr std::array<char32_t, 5> kFirstOfSize = {0, 0, 0x80, 0x800, 0x10000};
  const bool surrogate = code >= 0xd800 && code <= 0xdfff;
  if (code < kFirstOfSize[size] || code > 0x10ffff || surrogate) return kBadByte;
  return {code, size, true};
}

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
  if (!character.valid) return std::string(bytes);
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
    const Character first = FirstOf(text);
    const std::string_view bytes = text.substr(0, first.size);
    if (first.valid && IsShown(first.code)) {
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
