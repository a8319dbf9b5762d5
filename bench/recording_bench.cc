// recording_bench FILE [MOMENTS]: records a model host, and measures what that takes.
//
// The model: 500 groups, 50 machines and 200 heaps, with all their records, every 5 s. Of ten
// figures four never change, such as limits, shares and what the host does not have; each of the
// others changes from one moment to the next with a chance of one in six, whatever happened before,
// so that one in ten of all does. Half of them are counters, which only grow. Of a hundred changes
// eighty are of up to 8 pages of 4 KB, eighteen of some hundred, two of up to a gigabyte.
//
// Prints a line for each figure: its name, the figure and the unit.

#include <sys/resource.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <iterator>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include <knvlibs/ksi_records.h>
#include "knvlibs/node_table.h"
#include "knvlibs/open_cache.h"
#include "knvlibs/recording/moment.h"
#include "knvlibs/times.h"
#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/moment_builder.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/recorder.h"

namespace {

constexpr int kGroups = 500;
constexpr int kMachines = 50;
constexpr int kHeaps = 200;
constexpr int64_t kEvery = 5'000'000;
constexpr double kMomentsADay = 86400.0 / 5;

class Model {
 public:
  Model() {
    for (uint32_t i = 0; i < nodes_.size(); ++i) AddNode(i);
    ksi::SortReadings(readings_);
  }

  const std::vector<ksi::MomentReading>& Readings() const { return readings_; }
  size_t Figures() const { return figures_; }

  // The next moment; gives the number of figures that changed.
  size_t Step() {
    size_t changes = 0;
    for (ksi::MomentReading& reading : readings_) {
      if (IsSettled(reading)) continue;
      size_t place = 0;
      for (const ksi::RecordCell& cell : nodes_[reading.question.node].cells) {
        if (!cell.isFigure) continue;
        const bool isCounter = ++place % 2 == 0;
        if (place % 5 < 2 || random_() % 6 != 0) continue;
        ++changes;
        std::byte* at = reading.answer.record.data() + cell.offset;
        uint64_t figure = 0;
        std::memcpy(&figure, at, cell.width);
        figure += isCounter || random_() % 2 == 0 ? Change() : -Change();
        std::memcpy(at, &figure, cell.width);
      }
    }
    return changes;
  }

 private:
  static bool IsSettled(const ksi::MomentReading& reading) {
    const uint16_t node =
        ksi::IdOf(*ksi::FindNode(ksi::RecordedNodes()[reading.question.node].path));
    return node == ksi::node::sched_groups_groupFlags ||
           node == ksi::node::sched_groups_parentGroupID ||
           node == ksi::node::sched_groups_groupLeaderID ||
           node == ksi::node::worldGroups_vmmLeaderID || node == ksi::node::memory_memInfo;
  }

  // In KB.
  uint64_t Change() {
    const uint64_t kind = random_() % 100;
    const uint64_t most = kind < 80 ? 8 : kind < 98 ? 400 : 1 << 18;
    return 4 * (1 + random_() % most);
  }

  // How many of what has a key there are. Each machine has three remap types.
  static int CountOf(const ksi::Keying& keying) {
    switch (keying.at[0]) {
      case ksi::Instance::kState:
        return static_cast<int>(std::size(ksi::kMemoryStates));
      case ksi::Instance::kNone:
        return 1;
      case ksi::Instance::kGroup:
        return kGroups;
      case ksi::Instance::kClient:
        return keying.at[1] == ksi::Instance::kNone ? kMachines : 3 * kMachines;
      case ksi::Instance::kHeap:
        return kHeaps;
      default:
        return 2;
    }
  }

  void AddNode(uint32_t place) {
    const ksi::RecordedNode& recorded = nodes_[place];
    const ksi::Node& node = *ksi::FindNode(recorded.path);
    const ksi::Keying& keying = recorded.kind == ksi::Kind::kValue ? node.valueKeys : node.listKeys;
    for (int i = 0; i < CountOf(keying); ++i) {
      ksi::MomentReading& reading = readings_.emplace_back();
      reading.question.node = place;
      for (size_t k = 0; k < keying.Count(); ++k) {
        const int number = k == 1 ? i % 3 : keying.Count() == 2 ? i / 3 : i;
        reading.question.keys[k] = NameOf(keying.at[k], number);
      }
      reading.answer.record.resize(recorded.recordSize);
      Fill(recorded, reading.answer.record);
      FillList(node, recorded.kind, i, reading.answer.entries);
      Settle(ksi::IdOf(node), i, reading.answer.record);
    }
  }

  // The root has all other groups but those of the machines' monitors, which the first groups have,
  // with a machine each.
  static void FillList(const ksi::Node& node, ksi::Kind kind, int number,
                       std::vector<ksi::OwnKey>& entries) {
    if (kind != ksi::Kind::kList) return;
    const auto add = [&](int first, int end) {
      for (int i = first; i < end; ++i) entries.push_back(NameOf(node.entries, i));
    };
    if (node.entries == ksi::Instance::kGroup && number == 0) {
      add(1, kMachines);
      add(2 * kMachines, kGroups);
    }
    if (node.entries == ksi::Instance::kGroup && IsMachine(number)) {
      add(kMachines + number, kMachines + number + 1);
    }
    if (node.entries == ksi::Instance::kClient && IsMachine(number)) add(number, number + 1);
    if (node.entries == ksi::Instance::kHeap) add(0, kHeaps);
    if (node.entries == ksi::Instance::kRemapType) add(0, 3);
  }

  static bool IsMachine(int group) { return group > 0 && group < kMachines; }
  static bool IsMonitor(int group) { return IsMachine(group - kMachines); }

  static uint32_t FlagsOf(int group) {
    if (IsMachine(group)) return KSI_GROUP_VM;
    return IsMonitor(group) ? KSI_GROUP_VMM_SUB_CONTAINER : KSI_GROUP_USER_CREATED;
  }

  static ksi::OwnKey NameOf(ksi::Instance instance, int number) {
    if (ksi::KindOf(instance) == ksi::KeyKind::kNumber) return int64_t{number};
    if (instance == ksi::Instance::kState) {
      return std::string(ksi::kMemoryStates[static_cast<size_t>(number)]);
    }
    return "name" + std::to_string(number);
  }

  // What reports go by is no figure.
  static void Settle(uint16_t node, int number, ksi::Bytes& record) {
    const auto put = [&record](const auto& value) {
      std::memcpy(record.data(), &value, sizeof value);
    };
    switch (node) {
      case ksi::node::sched_groups_groupFlags:
        put(FlagsOf(number));
        break;
      case ksi::node::sched_groups_parentGroupID:
        put(int64_t{IsMonitor(number) ? number - kMachines : number == 0 ? -1 : 0});
        break;
      case ksi::node::sched_groups_groupLeaderID:
      case ksi::node::worldGroups_vmmLeaderID:
        put(int32_t{number});
        break;
      case ksi::node::memory_memInfo: {
        KSI_MemInfo info = {};
        info.numNodes = 2;
        put(info);
        break;
      }
      default:
        break;
    }
  }

  // Figures of any size up to 64 GB; those that never change are 0, all ones or a common one.
  void Fill(const ksi::RecordedNode& node, ksi::Bytes& record) {
    size_t place = 0;
    std::uniform_real_distribution<double> size(0, 24);
    for (const ksi::RecordCell& cell : node.cells) {
      if (!cell.isFigure) continue;
      ++figures_;
      const bool isConstant = ++place % 5 < 2;
      const uint64_t figure = isConstant ? random_() % 3 * UINT64_MAX / 2
                                         : 4 * static_cast<uint64_t>(std::exp2(size(random_)));
      std::memcpy(record.data() + cell.offset, &figure, cell.width);
    }
  }

  const std::vector<ksi::RecordedNode>& nodes_ = ksi::RecordedNodes();
  std::mt19937_64 random_{1};
  std::vector<ksi::MomentReading> readings_;
  size_t figures_ = 0;
};

double CpuMilliseconds() {
  struct rusage usage = {};
  getrusage(RUSAGE_SELF, &usage);
  const auto of = [](const timeval& time) {
    return static_cast<double>(time.tv_sec) * 1e3 + static_cast<double>(time.tv_usec) / 1e3;
  };
  return of(usage.ru_utime) + of(usage.ru_stime);
}

void Print(const char* name, double figure, const char* unit) {
  std::printf("%-34s %12.2f %s\n", name, figure, unit);
}

ksi::HostIdentity Host() {
  return {std::string(ksi::kDefinitions.signature), std::string(ksi::kDefinitions.built), "model",
          "boot", ksi::RecordedNodes()};
}

size_t SizeOfCapture(const Model& model) {
  ksi::Moment moment = {Host(), {}, model.Readings()};
  moment.facts.taken = kEvery;
  ksicache::CacheContent content("capture");
  ksicache::PutReadings(moment, content);
  return content.Finish(ksicache::CaptureOf(moment)).size();
}

void Record(const std::string& fileName, int moments) {
  Model model;
  ksicache::NewFile(fileName, true, ksicache::NewFile::kMode)
      .Commit(ksicache::RecordingStore::Empty("model"));
  ksicache::RecordingStore store(fileName, int64_t{2} << 30);
  ksicache::Recorder recorder(store);
  const ksi::HostIdentity host = Host();
  std::vector<double> costs;
  size_t changes = 0;
  for (int i = 0; i < moments; ++i) {
    ksi::MomentFacts facts;
    facts.taken = facts.uptime = (i + 1) * kEvery;
    if (i != 0) changes += model.Step();
    const double before = CpuMilliseconds();
    recorder.Add(host, facts, model.Readings());
    recorder.Tidy();
    costs.push_back(CpuMilliseconds() - before);
  }
  std::ranges::sort(costs);
  double sum = 0;
  for (const double cost : costs) sum += cost;
  struct rusage usage = {};
  getrusage(RUSAGE_SELF, &usage);
  Print("figures", static_cast<double>(model.Figures()), "");
  Print("changes a moment", static_cast<double>(changes) / std::max(1, moments - 1), "");
  Print("cost of a moment", sum / moments, "ms CPU");
  Print("  999 of 1000 at most", costs[(costs.size() * 999 + 999) / 1000 - 1], "ms CPU");
  Print("  at most", costs.back(), "ms CPU");
  Print("memory at most", static_cast<double>(usage.ru_maxrss) / 1024, "MB");
  Print("file", static_cast<double>(store.Size()) / 1e6, "MB");
  Print("  a day of it", static_cast<double>(store.Size()) / moments * kMomentsADay / 1e6, "MB");
  Print("captures of a day", static_cast<double>(SizeOfCapture(model)) * kMomentsADay / 1e6, "MB");
}

// Any moment: open the file and find it.
void Read(const std::string& fileName, int moments) {
  std::mt19937 random(2);
  std::vector<double> times;
  for (int i = 0; i < 200; ++i) {
    const auto begin = std::chrono::steady_clock::now();
    const std::string name =
        fileName + "@" + ksi::TextOfTime((1 + static_cast<int64_t>(random()) % moments) * kEvery);
    std::unique_ptr<ksi::Source> source;
    if (ksi::OpenCacheSource(name.c_str(), &source) != ksi::kOk) std::exit(1);
    times.push_back(
        std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - begin)
            .count());
  }
  std::ranges::sort(times);
  Print("any moment, to open it", times[times.size() / 2], "ms");
  Print("  at most", times.back(), "ms");
}

}  // namespace

int main(int argc, char** argv) {
  if (argc < 2 || argc > 3) {
    static_cast<void>(std::fputs("usage: recording_bench FILE [MOMENTS]\n", stderr));
    return 2;
  }
  try {
    const int moments = argc == 3 ? std::atoi(argv[2]) : 17280;
    Record(argv[1], std::max(1, moments));
    Read(argv[1], std::max(1, moments));
    return 0;
  } catch (const std::exception& error) {
    static_cast<void>(std::fprintf(stderr, "recording_bench: %s\n", error.what()));
    return 1;
  }
}
