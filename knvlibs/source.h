// Where the answers come from: a cache file, or the host that the library runs on.
#ifndef KNVLIBS_SOURCE_H_
#define KNVLIBS_SOURCE_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "knvlibs/catalogue.h"
#include "knvlibs/param_list.h"
#include "knvlibs/status.h"

namespace ksi {

// One key; `text` if its kind is kText, else `number`.
struct Key {
  KeyKind kind = KeyKind::kNumber;
  int64_t number = 0;
  std::string_view text;

  friend bool operator==(const Key&, const Key&) = default;
};

// The keys of a read, in path order.
struct Keys {
  Key at[kMaxKeys];
  size_t count = 0;

  const Key& operator[](size_t i) const { return at[i]; }
};

using Buffer = std::span<std::byte>;

// What tells whether two sets of definitions are the same, and when they were built.
struct Definitions {
  std::string_view signature;  // 32 hexadecimal digits
  std::string_view built;      // "Nov 21 2026 10:00:00"
};

// The library's own.
extern const Definitions kDefinitions;

class Source {
 public:
  Source() = default;
  Source(const Source&) = delete;
  Source& operator=(const Source&) = delete;
  virtual ~Source() = default;

  // The value of `node` for `keys` into `record`, which is zeroed.
  // REQUIRES: the node has a value of record.size() bytes, `keys` are of its kinds.
  [[nodiscard]] virtual Status Value(const Node& node, const Keys& keys, Buffer record) = 0;

  // The instances of `node` for `keys`, appended to `instances`, which may be changed on failure.
  // REQUIRES: the node has a list, `keys` are of its kinds.
  [[nodiscard]] virtual Status Instances(const Node& node, const Keys& keys,
                                         ParamList& instances) = 0;

  // Whose answers they are, and of when.
  struct Origin {
    std::string host;
    int64_t taken = 0;  // us since 1970
  };
  // None of a host that is read as it runs.
  virtual std::optional<Origin> GetOrigin() const { return std::nullopt; }

  // Goes on to the next moment, of what has several: KSI_STATUS_NOT_FOUND after the last, and where
  // there is but one.
  [[nodiscard]] virtual Status NextMoment() { return KSI_STATUS_NOT_FOUND; }

  // Forgets what was read: later answers are read anew.
  virtual void Refresh() {}

  // What every list of groups fails with until Refresh or another walk over the groups, if what is
  // walked over has shown to be no tree.
  [[nodiscard]] virtual Status WalkStatus() const { return kOk; }

  // The first reason for which something was left out of an answer, or has no value in it, other
  // than that it has gone or may not be read.
  [[nodiscard]] virtual Status LossStatus() const { return kOk; }

  // The definitions of the kernel that answers.
  virtual Definitions KernelDefinitions() const = 0;
};

}  // namespace ksi

#endif  // KNVLIBS_SOURCE_H_
