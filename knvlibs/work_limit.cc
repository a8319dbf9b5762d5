#include "knvlibs/work_limit.h"

#include <algorithm>

namespace ksi {
namespace {

// How often is looked; some ten rows.
constexpr int kStepsOfTick = 128;

// Captures take 0.1 steps a byte to go through and 0.3 to check, files of the smallest rows 0.9 and
// 2; small ones some hundreds more.
constexpr int64_t kStepsOfByte = 8;
constexpr int64_t kStepsOfAnyFile = 100000;

// A row takes a page or two, and some more if it does not fit into one. To check a file's structure
// is one step, which goes through all of its pages; these have 512 bytes at least.
constexpr int64_t kPagesOfTick = 4096;
constexpr int64_t kBytesOfPage = 256;

// More than a host of a million groups has. A file may claim any size, for holes cost nothing.
constexpr uint64_t kLargestFile = uint64_t{16} << 30;

int64_t SizeOf(uint64_t fileSize) { return static_cast<int64_t>(std::min(fileSize, kLargestFile)); }

int64_t Fetched(sqlite3* database, int counter) {
  int pages = 0;
  int most = 0;
  constexpr int kReset = 1;
  sqlite3_db_status(database, counter, &pages, &most, kReset);
  return pages;
}

}  // namespace

void WorkLimit::Watch(sqlite3* database, uint64_t fileSize) {
  database_ = database;
  mostPages_ = kPagesOfTick + SizeOf(fileSize) / kBytesOfPage;
  sqlite3_progress_handler(database, kStepsOfTick, Tick, this);
}

void WorkLimit::Allow(int64_t steps) {
  allowed_ = steps;
  left_ = steps;
}

int64_t WorkLimit::StepsFor(uint64_t fileSize) {
  return kStepsOfAnyFile + kStepsOfByte * SizeOf(fileSize);
}

int WorkLimit::Tick(void* limit) {
  auto& self = *static_cast<WorkLimit*>(limit);
  self.left_ -= kStepsOfTick;
  self.tooManyPages_ = self.tooManyPages_ || self.TooManyPages();
  return self.Exceeded() ? 1 : 0;
}

bool WorkLimit::TooManyPages() const {
  return Fetched(database_, SQLITE_DBSTATUS_CACHE_HIT) +
             Fetched(database_, SQLITE_DBSTATUS_CACHE_MISS) >
         mostPages_;
}

}  // namespace ksi
