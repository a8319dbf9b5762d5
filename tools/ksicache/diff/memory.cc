#include "tools/ksicache/diff/memory.h"

#include <span>
#include <string_view>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include "reports/reports.h"
#include "tools/ksicache/diff/figure.h"
#include "tools/ksicache/diff/match.h"
#include "tools/ksicache/diff/rows.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

constexpr int64_t kPage = 4096;
constexpr int64_t kLargePage = int64_t{2} << 20;

class Reader {
 public:
  Reader(const Origin& origin, const MemoryOptions& options) : origin_(origin), options_(options) {
    if (!options.byPath) return;
    try {
      paths_.emplace(origin_);
    } catch (const DataError& error) {
      memory_.complaints.emplace_back(error.what());
    }
  }

  Memory Run() {
    ReadHost();
    ReadMachines();
    ReadUserWorlds();
    ReadGroups();
    ReadHeaps();
    if (options_.isAll) {
      SumNames();
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

  // Calls `visit` with each row of a report; false if there may be others.
  template <class Visit>
  bool ForEachRow(const tally::Report& report, const Rows::Names& names, Visit&& visit) {
    const Rows rows(report, origin_, tally::DisplayUnit::b, names);
    std::vector<size_t> places;
    for (const std::string_view name : names) places.push_back(PlaceOf(rows.Columns(), name));
    for (size_t i = 0; i < rows.Count(); ++i) visit(Row(places, rows.At(i)));
    if (!rows.IsWhole()) memory_.complaints.push_back(rows.Complaint());
    return rows.IsWhole();
  }

  Things& Of(Part part) { return memory_.parts[static_cast<size_t>(part)]; }
  std::vector<Amount>& New(Part part) { return Of(part).amounts; }

  void SetWhole(bool isWhole, std::initializer_list<Part> parts) {
    for (const Part part : parts) Of(part).isWhole = isWhole;
  }

  Amount OfGroup(const Row& row, std::optional<int64_t> bytes,
                 std::optional<int64_t> limit = std::nullopt) const {
    const int64_t number = row.Number(0).value_or(-1);
    const std::string name(row.Text(1));
    return {IdentityOf(number, name), name, number, bytes, limit};
  }

  std::string IdentityOf(int64_t number, const std::string& name) const {
    if (paths_) return paths_->Of(number).value_or(name);
    return options_.isAll ? std::to_string(number) : std::to_string(number) + " " + name;
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
    const bool isWhole = ForEachRow(
        tally::vmStats, {"schedGrp", "name", "consumed", "ovhd", "sharedSaved", "memSizeLimit"},
        [&](const Row& row) {
          machines.push_back(OfGroup(row, row.Number(2), row.Number(5)));
          overheads.push_back(OfGroup(row, row.Number(3)));
          sharing.push_back(OfGroup(row, row.Number(4)));
          machines_.insert(machines.back().number);
        });
    SetWhole(isWhole, {Part::machines, Part::overheads, Part::machineSharing});
  }

  // A user world that belongs to a machine is in the machine's overhead.
  void ReadUserWorlds() {
    std::vector<Amount>& worlds = New(Part::userWorlds);
    const bool isWhole =
        ForEachRow(tally::uwStats, {"schedGrp", "name", "consumed", "max"}, [&](const Row& row) {
          Amount world = OfGroup(row, row.Number(2), row.Number(3));
          if (machines_.contains(world.number)) return;
          worlds_.insert(world.number);
          worlds.push_back(std::move(world));
        });
    // One of a machine that is missing would pass for one of nobody.
    SetWhole(isWhole && Of(Part::machines).isWhole, {Part::userWorlds});
  }

  // What starts one process after the other, or is started anew again and again, grows in none.
  void SumNames() {
    std::unordered_map<std::string, Amount> sums;
    for (const Amount& world : Of(Part::userWorlds).amounts) {
      const auto [found, isFirst] = sums.try_emplace(world.name, world);
      Amount& sum = found->second;
      if (isFirst) continue;
      sum.number = -1;
      sum.bytes = Sum(sum.bytes, world.bytes);
    }
    for (auto& [name, sum] : sums) {
      sum.identity = name;
      sum.limit.reset();
      New(Part::worldsOfName).push_back(std::move(sum));
    }
    SetWhole(Of(Part::userWorlds).isWhole, {Part::worldsOfName});
  }

  // Groups stand behind those that they are in.
  void ReadGroups() {
    std::vector<Amount>& groups = New(Part::groups);
    std::vector<Amount>& tables = New(Part::pageTables);
    bool isRoot = true;
    const bool isWhole =
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
    SetWhole(isWhole && Of(Part::userWorlds).isWhole, {Part::groups, Part::pageTables});
  }

  void ReadHeaps() {
    std::vector<Amount>& heaps = New(Part::heaps);
    std::vector<Amount>& used = New(Part::heapUse);
    const bool isWhole =
        ForEachRow(tally::heapStats, {"name", "size", "used", "max"}, [&](const Row& row) {
          const std::string name(row.Text(0));
          heaps.push_back({name, name, -1, row.Number(1), row.Number(3)});
          used.push_back({name, name, -1, row.Number(2), row.Number(3)});
        });
    SetWhole(isWhole, {Part::heaps, Part::heapUse});
  }

  void ReadLargePages() {
    std::vector<Amount>& pools = New(Part::largePages);
    const bool isWhole = ForEachRow(
        tally::lpoolStats, {"name", "nodeID", "nrLPages", "nrFreeSPages"}, [&](const Row& row) {
          const std::string name =
              std::string(row.Text(0)) + " of node " + std::to_string(row.Number(1).value_or(-1));
          const std::optional<int64_t> bytes =
              Less(Times(row.Number(2), kLargePage), Times(row.Number(3), kPage));
          pools.push_back({name, name, -1, bytes, Times(row.Number(2), kLargePage)});
        });
    SetWhole(isWhole, {Part::largePages});
  }

  void ReadSharing() {
    std::vector<Amount>& sharing = New(Part::hostSharing);
    const bool isWhole = ForEachRow(tally::pshareStats, {"reclaimed"}, [&](const Row& row) {
      sharing.push_back({"host", "host", -1, row.Number(0), std::nullopt});
    });
    SetWhole(isWhole, {Part::hostSharing});
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
