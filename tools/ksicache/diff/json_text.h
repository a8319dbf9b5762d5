#ifndef TOOLS_KSICACHE_DIFF_JSON_TEXT_H_
#define TOOLS_KSICACHE_DIFF_JSON_TEXT_H_

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "tools/ksicache/diff/moments.h"

namespace ksicache {

// JSON on its way to standard output. Whoever writes it sees to it that it is one value.
class JsonText {
 public:
  // '{' or '[', and '}' or ']'.
  void Begin(char bracket);
  void End(char bracket);

  // Of the member of an object that follows.
  void Name(std::string_view name);

  void PutNone() { Put("null"); }
  void PutFlag(bool flag) { Put(flag ? "true" : "false"); }
  void PutNumber(std::optional<int64_t> number);
  void PutUnsigned(uint64_t number) { Put(std::to_string(number)); }
  void PutReal(std::optional<double> number);
  void PutText(std::string_view text);

  // Begins another line.
  void NewLine() { isLineDue_ = true; }

  // Prints what there is. Fails with an OutputError.
  void Flush();

 private:
  void Put(std::string_view text);
  void Separate();

  std::string text_;
  bool isFirst_ = true;  // in its object or array
  bool isLineDue_ = false;
};

// Which moments are compared, as members of an object.
void PutSides(const Sides& sides, JsonText& json);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_JSON_TEXT_H_
