// A list of integers and strings: the keys that select an instance, or the instances of a node.
#ifndef KNVLIBS_PARAM_LIST_H_
#define KNVLIBS_PARAM_LIST_H_

#include <cstddef>
#include <cstdint>
#include <limits>
#include <memory>
#include <string_view>
#include <vector>

#include "knvlibs/catalogue.h"
#include "knvlibs/status.h"

// The type behind the opaque handle of the interface.
struct KSI_ParamList {
 public:
  static constexpr size_t kNoLimit = std::numeric_limits<size_t>::max();

  // Room for `capacity` entries, taken as they come.
  explicit KSI_ParamList(size_t capacity) : capacity_(capacity) {}

  // The same with `textRoom` bytes, taken at once, for the texts and their terminators.
  KSI_ParamList(size_t capacity, size_t textRoom);

  [[nodiscard]] ksi::Status AddNumber(uint64_t value);
  [[nodiscard]] ksi::Status AddText(std::string_view text);
  void RemoveLast();

  // Appends the entries of `other`; without room for all of them, none.
  [[nodiscard]] ksi::Status Append(const KSI_ParamList& other);

  // Prepares for `count` more entries.
  void Reserve(size_t count) { entries_.reserve(entries_.size() + count); }

  size_t Count() const { return entries_.size(); }

  // REQUIRES: index < Count(), and for Number and Text an entry of that kind.
  ksi::KeyKind Kind(size_t index) const { return entries_[index].kind; }
  uint64_t Number(size_t index) const { return entries_[index].number; }
  std::string_view Text(size_t index) const {
    return {entries_[index].text, entries_[index].length};
  }

 private:
  struct Entry {
    ksi::KeyKind kind;
    uint32_t length;  // of a text
    union {
      uint64_t number;
      const char* text;  // terminated, in the last block that was in use when it was added
    };
  };

  // Texts stand in blocks that never move, so that a text handed out lives as long as the list.
  // The last block is never empty unless it is the only one.
  struct Block {
    std::unique_ptr<char[]> text;
    size_t size;
    size_t used;
  };

  char* TakeText(size_t size);

  size_t capacity_;
  bool fixedTextRoom_ = false;
  std::vector<Entry> entries_;
  std::vector<Block> blocks_;
};

namespace ksi {

using ParamList = KSI_ParamList;

}  // namespace ksi

#endif  // KNVLIBS_PARAM_LIST_H_
