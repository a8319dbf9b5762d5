// The characters of text from outside, and which of them may be shown: those by which nothing
// reaches a terminal as a command, turns the direction of what is around it, or hides.
#ifndef KNVLIBS_CHARACTERS_H_
#define KNVLIBS_CHARACTERS_H_

#include <cstddef>
#include <string_view>

namespace ksi {

struct Character {
  char32_t code;
  size_t size;   // in bytes
  bool isValid;  // else it is a byte that is not UTF-8
};

// The character at the start of a text.
// REQUIRES: the text is not empty.
Character FirstOf(std::string_view text);

// Whether it may be shown as it is.
bool IsShown(const Character& character);

// As many whole characters of `text`, which is UTF-8, as have room in `size` bytes.
std::string_view CutAtCharacter(std::string_view text, size_t size);

}  // namespace ksi

#endif  // KNVLIBS_CHARACTERS_H_
