#ifndef FRAMEWORK_FIXED_TEXT_H_
#define FRAMEWORK_FIXED_TEXT_H_

#include <cstddef>
#include <cstring>
#include <string_view>

namespace tally {

// The text in a record's field: it ends at the first NUL, or with the field when there is none.
template <size_t kSize>
std::string_view FixedText(const char (&field)[kSize]) {
  return {field, strnlen(field, kSize)};
}

}  // namespace tally

#endif  // FRAMEWORK_FIXED_TEXT_H_
