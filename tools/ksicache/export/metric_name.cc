#include "tools/ksicache/export/metric_name.h"

#include <cstddef>

namespace ksicache {
namespace {

bool IsCapital(char c) { return c >= 'A' && c <= 'Z'; }
bool IsDigit(char c) { return c >= '0' && c <= '9'; }
bool IsSmall(char c) { return c >= 'a' && c <= 'z'; }

char Lower(char c) { return IsCapital(c) ? static_cast<char>(c - 'A' + 'a') : c; }

// Whether a character is a capital, or one of the digits before one.
bool IsUpper(std::string_view name, size_t at) {
  while (at < name.size() && IsDigit(name[at])) ++at;
  return at < name.size() && IsCapital(name[at]);
}

// The length of the number with its unit that a name begins with, "4KB" of "4KBfree"; 0 for none.
size_t SizeOfQuantity(std::string_view name) {
  if (name.empty() || !IsDigit(name[0])) return 0;
  size_t size = 0;
  while (size < name.size() && IsUpper(name, size)) ++size;
  return size;
}

}  // namespace

std::string SnakeCase(std::string_view name) {
  const size_t quantity = SizeOfQuantity(name);
  std::string snake;
  size_t begun = 0;  // where the word at hand begins
  for (size_t i = 0; i < name.size(); ++i) {
    const bool isAfterSmall = i > 0 && IsUpper(name, i) && !IsUpper(name, i - 1);
    const bool isLastUpper = i > 0 && IsUpper(name, i) && IsUpper(name, i - 1) &&
                             i + 1 < name.size() && IsSmall(name[i + 1]);
    const bool isWord = i < quantity ? false : i == quantity || isAfterSmall || isLastUpper;
    if (isWord && i - begun > 1) {
      snake += '_';
      begun = i;
    }
    snake += name[i] == '-' ? '_' : Lower(name[i]);
  }
  return snake;
}

}  // namespace ksicache
