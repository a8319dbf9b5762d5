// Reading nodes from the files of a Linux host: a recorded one, one that a test makes up, or the
// machine itself.
#ifndef TESTS_KNVLIBS_HOST_TREE_H_
#define TESTS_KNVLIBS_HOST_TREE_H_

#include <initializer_list>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "knvlibs/linux/linux_source.h"
#include "knvlibs/status.h"

namespace ksi {

// A directory with the files that a test writes, removed when its owner goes.
class HostTree {
 public:
  HostTree();
  ~HostTree();
  HostTree(const HostTree&) = delete;
  HostTree& operator=(const HostTree&) = delete;

  const std::string& Root() const { return root_; }

  // Writes a file named from the root, and the directories above it.
  void Write(std::string_view file, std::string_view content) const;

  // Takes all rights to a file away.
  void Lock(std::string_view file) const;

 private:
  std::string root_;
};

// A recorded host below tests/knvlibs/hosts.
std::string RecordedHost(std::string_view name);

using KeyList = std::initializer_list<std::variant<int64_t, std::string>>;

// The value of the node at `path` into `record`.
Status GetValue(Source& source, std::string_view path, KeyList keys, std::span<std::byte> record);

template <class Record>
Status GetValue(Source& source, std::string_view path, KeyList keys, Record* record) {
  return GetValue(source, path, keys, std::as_writable_bytes(std::span(record, 1)));
}

// The texts that the node at `path` lists.
Status GetNames(Source& source, std::string_view path, KeyList keys,
                std::vector<std::string>* names);

// All that the source tells of the host as a whole, a line for each figure.
std::string HostText(Source& source);

// All that it tells of groups and their clients, as the walk meets them: a line for each record
// with the figures that are not 0.
std::string GroupsText(Source& source);

// The ids that the node at `path` lists; none, and a failed test, if it cannot be read.
std::vector<int64_t> GetIds(Source& source, std::string_view path, KeyList keys);

}  // namespace ksi

#endif  // TESTS_KNVLIBS_HOST_TREE_H_
