// What is to say of many moments of a recording, in a few lines.
#ifndef TOOLS_KSICACHE_MOMENT_SUMMARY_H_
#define TOOLS_KSICACHE_MOMENT_SUMMARY_H_

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "knvlibs/recording/when.h"
#include "tools/ksicache/moment_walk.h"

namespace ksicache {

class MomentSummary {
 public:
  void Add(const WalkedMoment& moment);

  // Some could not be read, and are not among them.
  void Damage() { isDamaged_ = true; }

  // Prints it, a line for each of what there is to say.
  void Print() const;

 private:
  // Times that something happened before a moment: how often, how much, and where it was most.
  struct Happening {
    size_t count = 0;
    int64_t sum = 0;   // us, no more than a number holds
    int64_t most = 0;  // us
    int64_t at = 0;    // the moment after it

    void Add(int64_t amount, int64_t taken);
  };
  // Figures of those moments of which they were recorded, in us.
  struct Cost {
    size_t count = 0;
    double sum = 0;
    double most = 0;

    void Add(uint64_t amount);
    std::string Text() const;
  };

  void AddHost(const std::string& host);
  std::optional<int64_t> Stride() const;

  static constexpr size_t kMostHosts = 3;
  static constexpr size_t kMostStrides = 1024;

  std::vector<std::string> hosts_;  // the first few
  size_t count_ = 0;
  ksi::Span times_ = {};
  std::map<int64_t, size_t> strides_;  // how often moments were so far apart, tenths of a second
  Happening gaps_;
  Happening reboots_;
  Happening putForward_;
  Happening setBack_;
  uint64_t skipped_ = 0;
  size_t refused_ = 0;  // moments
  size_t failed_ = 0;
  size_t leftOut_ = 0;
  Cost duration_;
  Cost cpu_;
  double bytes_ = 0;
  bool isDamaged_ = false;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_MOMENT_SUMMARY_H_
