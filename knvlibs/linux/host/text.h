// Strict reading of the kernel's text files: a line at a time, a word at a time.
#ifndef KNVLIBS_LINUX_HOST_TEXT_H_
#define KNVLIBS_LINUX_HOST_TEXT_H_

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

namespace ksi {

// The lines of a file, in turn.
class Lines {
 public:
  explicit Lines(std::string_view text) : rest_(text) {}

  // The next line without its newline; false after the last.
  bool Next(std::string_view& line);

  // The number of the line that Next gave last; the first is 1.
  size_t Number() const { return number_; }

 private:
  std::string_view rest_;
  size_t number_ = 0;
};

// Takes the next word, up to blanks, off `text`; empty if there is none.
std::string_view TakeWord(std::string_view& text);

// Takes `prefix` off the start of `text`; false if it does not stand there.
bool TakePrefix(std::string_view& text, std::string_view prefix);

// The whole of `text` as a number; false if it is anything else or does not fit.
bool ParseNumber(std::string_view text, uint64_t& number);
bool ParseHex(std::string_view text, uint64_t& number);

// A name that somebody on the host chose, as it enters records and messages: with '?' for each
// character that is not to be shown and each byte that is not UTF-8.
std::string Printable(std::string_view name);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_TEXT_H_
