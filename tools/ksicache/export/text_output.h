#ifndef TOOLS_KSICACHE_EXPORT_TEXT_OUTPUT_H_
#define TOOLS_KSICACHE_EXPORT_TEXT_OUTPUT_H_

#include <charconv>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <string>
#include <string_view>

#include "tools/ksicache/export/row_format.h"
#include "tools/ksicache/new_file.h"

namespace ksicache {

// Text on its way to standard output, or into a file that is not there until it is whole. It fails
// with an OutputError or an Error.
class TextOutput {
 public:
  // `file`: null for standard output.
  explicit TextOutput(NewFile* file);

  void Put(char c) { text_ += c; }
  void Put(std::string_view text) { text_ += text; }
  // In one piece.
  void PutAll(std::initializer_list<std::string_view> texts) {
    size_t size = text_.size();
    for (const std::string_view text : texts) size += text.size();
    if (size > text_.capacity()) text_.reserve(2 * size);
    for (const std::string_view text : texts) text_ += text;
  }
  // REQUIRES: the value is a number.
  void PutNumber(const Value& value) {
    value.type == ValueType::signedNumber ? PutInteger(static_cast<int64_t>(value.number))
                                          : PutInteger(value.number);
  }

  // The end of a row: what there is may go out.
  void EndRow() {
    if (text_.size() >= kBlock) Flush();
  }

  void Finish();

 private:
  static constexpr size_t kBlock = size_t{64} << 10;
  static constexpr size_t kLongestNumber = 20;

  template <class Number>
  void PutInteger(Number number) {
    char digits[kLongestNumber];
    const auto [end, error] = std::to_chars(digits, digits + kLongestNumber, number);
    text_.append(digits, end);
  }

  void Flush();

  NewFile* file_;
  bool isTerminal_;
  std::string text_;
};

// Whether a text can stand as it is wherever printable ASCII but `"` and `\` can.
bool IsSimple(std::string_view text);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_TEXT_OUTPUT_H_
