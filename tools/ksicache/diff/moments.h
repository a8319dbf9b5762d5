#ifndef TOOLS_KSICACHE_DIFF_MOMENTS_H_
#define TOOLS_KSICACHE_DIFF_MOMENTS_H_

#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "tools/ksicache/report_run.h"

namespace ksicache {

// Two moments by their names; an empty one is the host itself, now.
struct MomentNames {
  std::string before;
  std::string after;
};

// What is meant by the arguments, of which there are one or two. A recording alone is its first and
// its last moment, a moment of one that and the last, FILE@FROM..TO those two; a capture alone is
// compared with the host.
MomentNames NamesOf(const std::vector<std::string>& arguments);

// What is said of two moments of which the one does not have the numbers of the other.
inline constexpr const char* kOtherNumbers =
    "Another boot or host: groups and processes are matched by their names.";

// Which moments are compared.
struct Sides {
  MomentNames names;
  Origin before;
  Origin after;
  bool isRebooted = false;  // the host was started anew in between, as far as recordings tell
  // Whether the one was recorded before the other; none if they are not of one recording.
  std::optional<bool> isInOrder = std::nullopt;
  // By how much longer the host ran at the moment after, in us; none if recordings do not tell.
  std::optional<int64_t> ran = std::nullopt;

  // Whether the kernel's numbers name the same groups and processes in both.
  bool HaveSameNumbers() const { return !isRebooted && before.host == after.host; }
  // How long after the one the other is, whatever the clock was set to; none if only a clock tells
  // that was set meanwhile.
  std::optional<double> Seconds() const;
  // Whether the one that is named first is the later one.
  bool IsBackward() const;
  // "a17, 2026-11-21T10:00:00Z to 2026-11-21T10:05:00Z: 5m 0s"
  std::string Title() const;
};

// `mayDiffer`: they may be of two hosts. This and the next fail with an Error that names the file.
Sides SidesOf(const MomentNames& names, bool mayDiffer);

// Calls `read` with the one moment and with the other while the library answers from it, in either
// order.
void ReadBoth(const Sides& sides, const std::function<void(const Origin&, bool isAfter)>& read);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_MOMENTS_H_
