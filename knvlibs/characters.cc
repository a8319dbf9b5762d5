#include "knvlibs/characters.h"

#include <algorithm>
#include <array>
#include <bit>

namespace ksi {
namespace {

struct Range {
  char32_t first;
  char32_t last;
};

constexpr Range kNotShown[] = {
    {0x0, 0x1f},         // controls
    {0x7f, 0x9f},        // more of them: U+009B begins a command like ESC [
    {0xad, 0xad},        // soft hyphen
    {0x34f, 0x34f},      // no width
    {0x61c, 0x61c},      // direction mark
    {0x115f, 0x1160},    // fillers: nothing where a letter would be
    {0x17b4, 0x17b5},    // no width
    {0x180b, 0x180f},    // variations, no width
    {0x200b, 0x200f},    // no width, direction marks
    {0x2028, 0x202e},    // ends of lines and paragraphs, directions
    {0x2060, 0x206f},    // no width, directions
    {0x3164, 0x3164},    // filler
    {0xfdd0, 0xfdef},    // no characters
    {0xfe00, 0xfe0f},    // variations
    {0xfeff, 0xfeff},    // no width
    {0xffa0, 0xffa0},    // filler
    {0xfff9, 0xfffb},    // annotations
    {0xe0000, 0xe007f},  // tags
    {0xe0100, 0xe01ef},  // variations
};

// The last two of each 65536 codes are no characters.
bool IsLastOfPlane(char32_t code) { return (code & 0xfffe) == 0xfffe; }

constexpr Character kBadByte = {0, 1, false};

bool IsContinuation(char c) { return (static_cast<unsigned char>(c) & 0xc0) == 0x80; }

}  // namespace

Character FirstOf(std::string_view text) {
  const auto lead = static_cast<unsigned char>(text[0]);
  if (lead < 0x80) return {lead, 1, true};
  const auto size = static_cast<size_t>(std::countl_one(lead));
  if (size < 2 || size > 4 || size > text.size()) return kBadByte;
  char32_t code = lead & (0x7fu >> size);
  for (size_t i = 1; i < size; ++i) {
    if (!IsContinuation(text[i])) return kBadByte;
    code = code << 6 | (static_cast<unsigned char>(text[i]) & 0x3f);
  }
  constexpr std::array<char32_t, 5> kFirstOfSize = {0, 0, 0x80, 0x800, 0x10000};
  const bool isSurrogate = code >= 0xd800 && code <= 0xdfff;
  if (code < kFirstOfSize[size] || code > 0x10ffff || isSurrogate) return kBadByte;
  return {code, size, true};
}

bool IsShown(const Character& character) {
  return character.isValid && !IsLastOfPlane(character.code) &&
         std::ranges::none_of(kNotShown, [&](const Range& range) {
           return character.code >= range.first && character.code <= range.last;
         });
}

std::string_view CutAtCharacter(std::string_view text, size_t size) {
  if (text.size() <= size) return text;
  while (size > 0 && IsContinuation(text[size])) --size;
  return text.substr(0, size);
}

}  // namespace ksi
