// ':'-separated lists of names: how they are read from the command line and written to the title.
#ifndef FRAMEWORK_NAME_LIST_H_
#define FRAMEWORK_NAME_LIST_H_

#include <array>
#include <cstddef>
#include <string_view>

namespace tally {

// The words of a list, one at a time; empty words are passed over.
class NameReader {
 public:
  explicit NameReader(std::string_view list) : rest_(list) {}

  // Puts the next word into `name`; false at the end of the list.
  bool Next(std::string_view& name);

 private:
  std::string_view rest_;
};

// Whether two words are the same but for the case of their letters.
bool SameName(std::string_view a, std::string_view b);

// Builds the list of the names that were taken from a table: "(all)" when every name was, "(none)"
// when none was, else the names joined by ':'.
class NameWriter {
 public:
  // The table's next name, and whether it was taken.
  void Put(std::string_view name, bool taken);

  // The list so far; it lives as long as this object.
  std::string_view text() const;

 private:
  // Twice the names of the largest column table. What does not fit is cut.
  std::array<char, 1024> buffer_;
  size_t size_ = 0;
  bool takenAll_ = true;
  bool takenAny_ = false;
};

}  // namespace tally

#endif  // FRAMEWORK_NAME_LIST_H_
