// Hosts whose figures go up and down as they do, and of which one leaks or none does.
#ifndef TESTS_KSICACHE_LEAK_HOST_H_
#define TESTS_KSICACHE_LEAK_HOST_H_

#include <cstddef>
#include <cstdint>
#include <random>
#include <string>
#include <vector>

#include "knvlibs/recording/moment.h"
#include "tests/harness/made_host.h"
#include "tools/ksicache/moment_builder.h"

namespace ksi {

// What a figure does besides its noise.
enum class Course : uint8_t { level, sawTooth, dailyWave, step, walk };

// A figure in KB over the moments of a recording.
class Figure {
 public:
  Figure() = default;
  Figure(double base, double noise, Course course, std::mt19937_64& random);

  // Lets it grow, or shrink, by so much from the first moment to the last.
  void Leak(double growth) { growth_ = growth; }
  double Noise() const { return noise_; }

  // At a moment of `count`, `days` after the first; to be asked for one after the other.
  uint64_t At(size_t moment, size_t count, double days, std::mt19937_64& random);

 private:
  double base_ = 0;
  double noise_ = 0;
  Course course_ = Course::level;
  double swing_ = 0;
  double period_ = 1;  // of the time
  double phase_ = 0;
  double growth_ = 0;
  double walked_ = 0;
};

class LeakHost {
 public:
  // What leaks.
  enum class Kind : uint8_t { heap, machine, process, pageTables, largePages, sharing };
  static constexpr size_t kKinds = 6;

  // A recording of so many moments over two days.
  LeakHost(uint32_t seed, size_t count);
  LeakHost(const LeakHost&) = delete;
  LeakHost& operator=(const LeakHost&) = delete;

  // Lets something leak, by some times its noise.
  void Leak(Kind kind);

  // How diff calls what leaks: what it is, and its name.
  const std::string& GuiltyWhat() const { return what_; }
  const std::string& GuiltyName() const { return name_; }

  // The readings of the next moment.
  std::vector<MomentReading> Next();
  int64_t Every() const { return kDays * 86400 / static_cast<int64_t>(count_); }

 private:
  static constexpr int64_t kDays = 2;
  static constexpr size_t kMachines = 4;
  static constexpr size_t kProcesses = 8;
  static constexpr size_t kHeaps = 6;
  static constexpr size_t kPools = 2;

  Figure MakeFigure(double base);
  uint64_t Now(Figure& figure);
  void AddGroup(int64_t id, const std::string& name, int64_t parent, uint32_t flags,
                uint64_t consumed, uint64_t overhead, const std::vector<int64_t>& children);
  void AddMachines();
  void AddProcesses();
  void AddHost();

  std::mt19937_64 random_;
  size_t count_;
  size_t moment_ = 0;
  std::string what_;
  std::string name_;
  Figure mapped_[kMachines];
  Figure saved_[kMachines];
  Figure overhead_[kMachines];
  Figure resident_[kProcesses];
  Figure tables_[kProcesses];
  Figure heaps_[kHeaps];
  Figure pools_[kPools];
  Figure kernel_;
  Figure caches_;
  uint64_t consumed_ = 0;  // of the moment at hand, by all
  ksicache::MomentBuilder builder_;
  tally::testing::MadeHost made_{builder_};
};

}  // namespace ksi

#endif  // TESTS_KSICACHE_LEAK_HOST_H_
