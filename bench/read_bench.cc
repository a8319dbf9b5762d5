// read_bench FILE COUNT: what a keyed read of a cache file costs, in the order of the walk and in
// random order, against a point query of SQLite on the same file. FILE is a `make_cache FILE groups
// COUNT`. Prints nanoseconds a read: library in order, library at random, SQLite in order, SQLite
// at random.

#include <sqlite3.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <iterator>
#include <memory>
#include <numeric>
#include <random>
#include <string>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>

namespace {

constexpr int64_t kReads = 200000;

[[noreturn]] void Fail(const char* what) {
  std::fprintf(stderr, "read_bench: %s\n", what);
  std::exit(1);
}

// Groups stand behind their container, 1,000 to each.
int64_t GroupId(int64_t index) { return 2 + index + index / 1000; }

// A node that group-stats reads of each group.
struct Node {
  uint16_t id;
  const char* path;
  size_t size;
};

const Node kNodes[] = {
    {KSI_NODE_sched_groups_groupFlags, "sched/groups/groupFlags", sizeof(uint32_t)},
    {KSI_NODE_sched_groups_groupName, "sched/groups/groupName", sizeof(KSI_GroupName)},
    {KSI_NODE_sched_groups_groupTag, "sched/groups/groupTag", sizeof(KSI_GroupTag)},
    {KSI_NODE_sched_groups_parentGroupID, "sched/groups/parentGroupID", sizeof(int64_t)},
    {KSI_NODE_sched_groups_memAllocationInKB, "sched/groups/memAllocationInKB",
     sizeof(KSI_GroupAllocation)},
    {KSI_NODE_sched_groups_stats_capacity, "sched/groups/stats/capacity",
     sizeof(KSI_GroupCapacity)},
    {KSI_NODE_sched_groups_stats_memoryStats, "sched/groups/stats/memoryStats",
     sizeof(KSI_GroupMemoryStats)},
};

void ReadFromLibrary(int64_t group, size_t node) {
  KSI_ParamList* const keys = KSI_ParamListCreate(1, 2);
  char record[sizeof(KSI_GroupMemoryStats)];
  if (KSI_ParamListAddInt(keys, static_cast<uint64_t>(group)) != 0 ||
      KSI_Get(kNodes[node].id, keys, record, kNodes[node].size) != 0) {
    Fail("the library cannot read a record");
  }
  KSI_ParamListDestroy(keys);
}

class PointQuery {
 public:
  explicit PointQuery(const char* fileName) {
    sqlite3* database = nullptr;
    const std::string uri = std::string("file:") + fileName + "?immutable=1";
    if (sqlite3_open_v2(uri.c_str(), &database, SQLITE_OPEN_READONLY | SQLITE_OPEN_URI, nullptr) !=
        SQLITE_OK) {
      Fail("SQLite cannot open the file");
    }
    database_.reset(database);
    query_ = Prepare("SELECT answer FROM reading WHERE key1 = ?1 AND key2 = '' AND node = ?2");
    const Statement id = Prepare("SELECT id FROM node WHERE path = ?1 AND kind = 'value'");
    for (const Node& node : kNodes) {
      sqlite3_bind_text(id.get(), 1, node.path, -1, SQLITE_STATIC);
      if (sqlite3_step(id.get()) != SQLITE_ROW) Fail("the file lacks a node");
      ids_.push_back(sqlite3_column_int64(id.get(), 0));
      sqlite3_reset(id.get());
    }
  }

  void Read(int64_t group, size_t node) {
    sqlite3_bind_int64(query_.get(), 1, group);
    sqlite3_bind_int64(query_.get(), 2, ids_[node]);
    if (sqlite3_step(query_.get()) != SQLITE_ROW ||
        sqlite3_column_bytes(query_.get(), 0) != static_cast<int>(kNodes[node].size)) {
      Fail("SQLite cannot read a record");
    }
    sqlite3_reset(query_.get());
  }

 private:
  struct Closer {
    void operator()(sqlite3* database) const { sqlite3_close(database); }
    void operator()(sqlite3_stmt* query) const { sqlite3_finalize(query); }
  };
  using Statement = std::unique_ptr<sqlite3_stmt, Closer>;

  Statement Prepare(const char* sql) {
    sqlite3_stmt* statement = nullptr;
    if (sqlite3_prepare_v2(database_.get(), sql, -1, &statement, nullptr) != SQLITE_OK) {
      Fail(sqlite3_errmsg(database_.get()));
    }
    return Statement(statement);
  }

  std::unique_ptr<sqlite3, Closer> database_;
  Statement query_;
  std::vector<int64_t> ids_;
};

// Nanoseconds of one `read` of a node of a group.
template <class Read>
double Time(const std::vector<int64_t>& groups, Read read) {
  const auto start = std::chrono::steady_clock::now();
  for (int64_t done = 0; done < kReads; ++done) {
    const auto next = static_cast<size_t>(done);
    read(groups[next / std::size(kNodes) % groups.size()], next % std::size(kNodes));
  }
  const std::chrono::duration<double, std::nano> taken = std::chrono::steady_clock::now() - start;
  return taken.count() / static_cast<double>(kReads);
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 3) {
    std::fputs("Usage: read_bench FILE COUNT\n", stderr);
    return 2;
  }
  if (KSI_UseCache(argv[1], 0) != 0) Fail("the library cannot open the file");
  std::vector<int64_t> inOrder(static_cast<size_t>(std::atoll(argv[2])));
  std::iota(inOrder.begin(), inOrder.end(), 0);
  std::transform(inOrder.begin(), inOrder.end(), inOrder.begin(), GroupId);
  std::vector<int64_t> atRandom = inOrder;
  std::shuffle(atRandom.begin(), atRandom.end(), std::mt19937(20261121));

  PointQuery query(argv[1]);
  const auto readQuery = [&](int64_t group, size_t node) { query.Read(group, node); };
  std::printf("%.0f %.0f %.0f %.0f\n", Time(inOrder, ReadFromLibrary),
              Time(atRandom, ReadFromLibrary), Time(inOrder, readQuery), Time(atRandom, readQuery));
  return 0;
}
