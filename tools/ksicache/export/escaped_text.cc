#include "tools/ksicache/export/escaped_text.h"

#include <algorithm>
#include <cstddef>
#include <span>

#include "knvlibs/characters.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {
namespace {

bool IsHex(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

// Whether the text begins with what an escaped byte looks like.
bool LooksEscaped(std::string_view text) {
  return text.size() > 2 && text[0] == '%' && IsHex(text[1]) && IsHex(text[2]);
}

// How many bytes of the text stand for themselves until one does not.
size_t SizeOfPlain(std::string_view text) {
  size_t size = 0;
  while (size < text.size() && !LooksEscaped(text.substr(size))) {
    const ksi::Character first = ksi::FirstOf(text.substr(size));
    if (!first.isValid) break;
    size += first.size;
  }
  return size;
}

}  // namespace

bool IsPlain(std::string_view text) {
  const bool isSimple =
      std::ranges::all_of(text, [](char c) { return c >= ' ' && c <= '~' && c != '%'; });
  return isSimple || SizeOfPlain(text) == text.size();
}

std::string Escaped(std::string_view text) {
  std::string escaped;
  for (;;) {
    const size_t size = SizeOfPlain(text);
    escaped += text.substr(0, size);
    if (size == text.size()) return escaped;
    escaped += '%' + ToHex(std::as_bytes(std::span(text.substr(size, 1))));
    text.remove_prefix(size + 1);
  }
}

}  // namespace ksicache
