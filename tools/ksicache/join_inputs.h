// The moments of some captures and recordings of one host, one after the other.
//
// Those of a recording stay in the order in which they were recorded, for clocks are set. Moments
// of different files are put in order by the clock that nobody sets, if they are of one boot of the
// host; boots by the order that they have in a file which has both; all else by the clock on the
// wall.
#ifndef TOOLS_KSICACHE_JOIN_INPUTS_H_
#define TOOLS_KSICACHE_JOIN_INPUTS_H_

#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "knvlibs/recording/moment.h"

namespace ksicache {

// When a moment was taken, by all clocks that there are.
struct Stamp {
  int64_t taken = 0;   // us since 1970, by the clock on the wall
  int64_t uptime = 0;  // us since the host started; 0: not known
  std::string boot;    // empty: not known

  friend bool operator==(const Stamp&, const Stamp&) = default;
};

// Moments that stay in their order.
class MomentSequence {
 public:
  virtual ~MomentSequence() = default;

  // The next one; null after the last. Good until it is taken.
  virtual const Stamp* Next() = 0;

  // Takes it; none if it cannot be read, which is said.
  virtual std::optional<ksi::Moment> Take() = 0;

  // The file of the moment that was taken last.
  virtual const std::string& Name() const = 0;

  // The boots of its moments in their order, each once.
  virtual std::vector<std::string> Boots() = 0;
};

class JoinInputs {
 public:
  // Opens the files. Fails with an Error that names the one.
  explicit JoinInputs(const std::vector<std::string>& names);

  // How many moments there are to take.
  size_t Count() const { return count_; }

  // The next one that can be read, with its readings in the order of SortReadings; none after the
  // last. Fails with an Error if it is of another host.
  std::optional<ksi::Moment> Take();

  // Whether something could not be read, which has been said.
  bool IsDamaged() const { return isDamaged_; }

 private:
  bool IsHeldBack(const Stamp& stamp);
  MomentSequence* Choose();

  std::vector<std::unique_ptr<MomentSequence>> sequences_;
  std::vector<std::map<std::string, size_t>> bootOrders_;  // of each that has any
  size_t count_ = 0;
  std::optional<Stamp> last_;
  std::string host_;
  bool isDamaged_ = false;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_JOIN_INPUTS_H_
