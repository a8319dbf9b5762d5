// A Linux host: its kernel's files, below a root directory.
#ifndef KNVLIBS_LINUX_HOST_HOST_H_
#define KNVLIBS_LINUX_HOST_HOST_H_

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <limits>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <string_view>
#include <typeindex>
#include <vector>

#include "knvlibs/source.h"
#include "knvlibs/status.h"

namespace ksi {

// What a figure is when the mechanism exists and its figure cannot be told.
constexpr uint64_t kNoValue = ~uint64_t{0};

// The same figure in a narrower field; one that does not fit cannot be told.
template <class Field>
constexpr Field FigureOf(uint64_t figure) {
  constexpr Field kNarrowNoValue = std::numeric_limits<Field>::max();
  return figure < kNarrowNoValue ? static_cast<Field>(figure) : kNarrowNoValue;
}

// Sum and difference; the latter is 0 at least. They cannot be told if a part cannot.
constexpr uint64_t SumOf(uint64_t a, uint64_t b) {
  return a == kNoValue || b == kNoValue ? kNoValue : a + b;
}
constexpr uint64_t DifferenceOf(uint64_t a, uint64_t b) {
  return a == kNoValue || b == kNoValue ? kNoValue : a - (a < b ? a : b);
}

class LinuxHost {
 public:
  // `root` is "/" for the machine itself, or the directory of a recorded tree.
  explicit LinuxHost(std::string root);

  // The whole of a file, named from the root ("/proc/meminfo").
  Status Read(std::string_view file, std::string* content) const;

  // A file that is one number.
  Status ReadNumber(std::string_view file, uint64_t* number) const;

  // The names of what lies in a directory, but for those that start with '.', in no order. Links
  // are no directories.
  enum class Entries { kAll, kDirectories };
  Status List(std::string_view directory, Entries wanted, std::vector<std::string>* names) const;

  // All that lies in a directory but for itself and the one above, in no order.
  struct Entry {
    std::string name;
    uint64_t inode = 0;
    bool isDirectory = false;
  };
  Status List(std::string_view directory, std::vector<Entry>* entries) const;

  // Whether it is the first time that `what` is asked for: what is wrong with many files alike is
  // told once.
  bool First(std::string_view what) const { return told_.emplace(what).second; }

  // NotUnderstood, told once for all files of a kind.
  Status NotUnderstoodOnce(std::string_view kind, std::string_view file, size_t line) const;

  // Whether this is the machine itself and not a recorded tree.
  bool IsThisMachine() const { return root_.empty(); }

  // Where a reader keeps what it need not read again; made on first use, one for each type.
  template <class T>
  T& Keep() const {
    std::shared_ptr<void>& kept = kept_[typeid(T)];
    if (kept == nullptr) kept = std::make_shared<T>();
    return *static_cast<T*>(kept.get());
  }

  // The size of a page in KB. Recorded trees are taken to come from a machine with pages of the
  // same size.
  uint64_t PageKB() const { return pageKB_; }

 private:
  std::string root_;  // without its last '/'
  uint64_t pageKB_;
  mutable std::map<std::type_index, std::shared_ptr<void>> kept_;
  mutable std::set<std::string, std::less<>> told_;
};

// Warns that a line of a file (the first is 1) is not understood; returns the status for it.
Status NotUnderstood(std::string_view file, size_t line);

// The same of what a directory has in it.
Status NameNotUnderstood(std::string_view directory, std::string_view name);

// Hands over a record as the bytes it is.
template <class Record>
Status Answer(Buffer buffer, const Record& record) {
  if (buffer.size() != sizeof record) return KSI_STATUS_LENGTH_MISMATCH;
  std::memcpy(buffer.data(), &record, sizeof record);
  return kOk;
}

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_HOST_H_
