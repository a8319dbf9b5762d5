#include "tools/ksicache/diff/memory.h"

#include <span>
#include <string_view>
#include <unordered_set>
#include <utility>

#include "reports/reports.h"
#include "tools/ksicache/diff/match.h"
#include "tools/ksicache/diff/rows.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

constexpr int64_t kPage = 4096;
constexpr int64_t kLargePage = int64_t{2} << 20;

std::optional<int64_t> Difference(std::optional<int64_t> a, std::optional<int64_t> b) {
  int64_t difference = 0;
  if (!a || !b || __builtin_sub_overflow(*a, *b, &difference)) return std::nullopt;
  return difference;
}

std::optional<int64_t> Times(std::optional<int64_t> number, int64_t size) {
  int64_t product = 0;
  if (!number || __builtin_mul_overflow(*number, size, &product)) return std::nullopt;
  return product;
}

class Reader {
 public:
  Reader(const Origin& origin, const MemoryOptions& options) : origin_(origin), options_(options) {
    if (options.byPath) Try([&] { paths_.emplace(origin_); });
  }

  Memory Run() {
    ReadHost();
    ReadMachines();
    ReadUserWorlds();
    ReadGroups();
    ReadHeaps();
    if (options_.isAll) {
      ReadLargePages();
      ReadSharing();
    }
    return std::move(memory_);
  }

 private:
  // One row by the names of its columns, in the order in which they were asked for.
  class Row {
   public:
    Row(std::span<const size_t> places, std::span<const Value> values)
        : places_(places), values_(values) {}

    std::string_view Text(size_t i) const { return values_[places_[i]].text; }
    std::optional<int64_t> Number(size_t i) const { return NumberOf(values_[places_[i]]); }

   private:
    std::span<const size_t> places_;
    std::span<const Value> values_;
  };

  template <class Do>
  void Try(Do&& act) {
    try {
      act();
    } catch (const DataError& error) {
      memory_.complaints.emplace_back(error.what());
    }
  }

  // Calls `visit` with each row of a report; false if the report tells of none.
  template <class Visit>
  bool ForEachRow(const tally::Report& report, Rows::Names names, Visit&& visit) {
    bool isTold = false;
    Try([&] {
      const Rows rows(report, origin_, tally::DisplayUnit::b, names);
      if (rows.Columns().empty()) return;
      std::vector<size_t> places;
      for (const std::string_view name : names) {
        size_t place = 0;
        while (rows.Columns()[place].name != name) ++place;
        places.push_back(place);
      }
      for (size_t i = 0; i < rows.Count(); ++i) visit(Row(places, rows.At(i)));
      isTold = true;
    });
    return isTold;
  }

  std::vector<Amount>& New(Part part) { return memory_.parts[static_cast<size_t>(part)].emplace(); }

  // Nobody knows who they are.
  void Forget(std::initializer_list<Part> parts) {
    for (const Part part : parts) memory_.parts[static_cast<size_t>(part)].reset();
  }

  Amount OfGroup(const Row& row, std::optional<int64_t> bytes,
                 std::optional<int64_t> limit = std::nullopt) const {
    const int64_t number = row.Number(0).value_or(-1);
    const std::string name(row.Text(1));
    const std::string identity =
        paths_ ? paths_->Of(number).value_or(name) : std::to_string(number) + " " + name;
    return {identity, name, number, bytes, limit};
  }

  void ReadHost() {
    ForEachRow(tally::compStats,
               {"total", "free", "dataAndHeap", "knvClientConsumed", "otherConsumed"},
               [&](const Row& row) {
                 memory_.host = {row.Number(0), row.Number(1), row.Number(2), row.Number(3),
                                 row.Number(4)};
               });
  }

  void ReadMachines() {
    std::vector<Amount>& machines = New(Part::machines);
    std::vector<Amount>& overheads = New(Part::overheads);
    std::vector<Amount>& sharing = New(Part::machineSharing);
    const bool isTold = ForEachRow(
        tally::vmStats, {"schedGrp", "name", "consumed", "ovhd", "sharedSaved", "memSizeLimit"},
        [&](const Row& row) {
          machines.push_back(OfGroup(row, row.Number(2), row.Number(5)));
          overheads.push_back(OfGroup(row, row.Number(3)));
          sharing.push_back(OfGroup(row, row.Number(4)));
          machines_.insert(machines.back().number);
        });
    if (!isTold) Forget({Part::machines, Part::overheads, Part::machineSharing});
  }

  // A user world that belongs to a machine is in the machine's overhead.
  void ReadUserWorlds() {
    std::vector<Amount>& worlds = New(Part::userWorlds);
    const bool isTold =
        ForEachRow(tally::uwStats, {"schedGrp", "name", "consumed", "max"}, [&](const Row& row) {
          Amount world = OfGroup(row, row.Number(2), row.Number(3));
          if (machines_.contains(world.number)) return;
          worlds_.insert(world.number);
          worlds.push_back(std::move(world));
        });
    if (!isTold) Forget({Part::userWorlds});
  }

  // Groups stand behind those that they are in.
  void ReadGroups() {
    std::vector<Amount>& groups = New(Part::groups);
    std::vector<Amount>& tables = New(Part::pageTables);
    bool isRoot = true;
    const bool isTold =
        ForEachRow(tally::groupStats, {"gid", "name", "parGid", "consumed", "ovhd", "max"},
                   [&](const Row& row) {
                     const int64_t number = row.Number(0).value_or(-1);
                     if (std::exchange(isRoot, false)) return;
                     if (worlds_.contains(number))
                       return tables.push_back(OfGroup(row, row.Number(4)));
                     if (machines_.contains(row.Number(2).value_or(-1))) machines_.insert(number);
                     if (machines_.contains(number)) return;
                     groups.push_back(OfGroup(row, row.Number(3), row.Number(5)));
                   });
    if (!isTold) Forget({Part::groups, Part::pageTables});
  }

  void ReadHeaps() {
    std::vector<Amount>& heaps = New(Part::heaps);
    std::vector<Amount>& used = New(Part::heapUse);
    const bool isTold =
        ForEachRow(tally::heapStats, {"name", "size", "used", "max"}, [&](const Row& row) {
          const std::string name(row.Text(0));
          heaps.push_back({name, name, -1, row.Number(1), row.Number(3)});
          used.push_back({name, name, -1, row.Number(2), row.Number(3)});
        });
    if (!isTold) Forget({Part::heaps, Part::heapUse});
  }

  void ReadLargePages() {
    std::vector<Amount>& pools = New(Part::largePages);
    const bool isTold = ForEachRow(
        tally::lpoolStats, {"name", "nodeID", "nrLPages", "nrFreeSPages"}, [&](const Row& row) {
          const std::string name =
              std::string(row.Text(0)) + " of node " + std::to_string(row.Number(1).value_or(-1));
          const std::optional<int64_t> bytes =
              Difference(Times(row.Number(2), kLargePage), Times(row.Number(3), kPage));
          pools.push_back({name, name, -1, bytes, Times(row.Number(2), kLargePage)});
        });
    if (!isTold) Forget({Part::largePages});
  }

  void ReadSharing() {
    std::vector<Amount>& sharing = New(Part::hostSharing);
    const bool isTold = ForEachRow(tally::pshareStats, {"reclaimed"}, [&](const Row& row) {
      sharing.push_back({"host", "host", -1, row.Number(0), std::nullopt});
    });
    if (!isTold) Forget({Part::hostSharing});
  }

  const Origin& origin_;
  const MemoryOptions& options_;
  std::optional<GroupPaths> paths_;
  std::unordered_set<int64_t> machines_;  // and what is below them
  std::unordered_set<int64_t> worlds_;
  Memory memory_;
};

}  // namespace

Memory ReadMemory(const Origin& origin, const MemoryOptions& options) {
  return Reader(origin, options).Run();
}

}  // namespace ksicache
