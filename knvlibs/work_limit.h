// How much SQLite may do on a file of which nothing is trusted.
//
// Pages that lead to the same pages again and again make a small file endless, so what may be done
// follows from the file's size. Two things are counted: the steps of SQLite's machine, and the
// pages that it fetches, for one step may go through as many as the file has for each comparison.
#ifndef KNVLIBS_WORK_LIMIT_H_
#define KNVLIBS_WORK_LIMIT_H_

#include <cstdint>

#include <sqlite3.h>

namespace ksi {

class WorkLimit {
 public:
  WorkLimit() = default;
  WorkLimit(const WorkLimit&) = delete;
  WorkLimit& operator=(const WorkLimit&) = delete;

  // Watches the work on a file of `fileSize` bytes. Work beyond the limit ends with
  // SQLITE_INTERRUPT. The database must not outlive this.
  void Watch(sqlite3* database, uint64_t fileSize);

  // What is done from now on may take `steps`.
  void Allow(int64_t steps);

  // The steps that all that can be asked of a file of this size may take.
  static int64_t StepsFor(uint64_t fileSize);

  // As if nothing had been done since Allow. False when a step took what no honest file would make
  // it take: nothing more is to be read of this one.
  bool BeginAgain() {
    left_ = allowed_;
    return !tooManyPages_;
  }

  bool Exceeded() const { return tooManyPages_ || left_ < 0; }

 private:
  static int Tick(void* limit);
  bool TooManyPages() const;

  sqlite3* database_ = nullptr;
  int64_t allowed_ = 0;
  int64_t left_ = 0;
  int64_t mostPages_ = 0;  // between two ticks
  bool tooManyPages_ = false;
};

}  // namespace ksi

#endif  // KNVLIBS_WORK_LIMIT_H_
