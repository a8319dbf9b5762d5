// The names of a table's rows, in a column that is too narrow for some of them.
#ifndef TOOLS_KSICACHE_DIFF_NAMES_H_
#define TOOLS_KSICACHE_DIFF_NAMES_H_

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>

namespace ksicache {

// Names that are too long lose their middle. Those that look alike then have a line for themselves,
// with all of it, and these and names of several things have the numbers of the things behind them.
class NameColumn {
 public:
  explicit NameColumn(size_t width) : width_(width) {}

  // A name that the table has, of which `start` stands before it.
  void Add(const std::string& start, const std::string& name);

  struct Cell {
    std::string above;  // a line; empty: there is none
    std::string text;   // as wide as the column
  };
  // REQUIRES: all names of the table have been added.
  Cell CellOf(const std::string& start, const std::string& name, int64_t number) const;

 private:
  struct Lookalikes {
    std::string name;  // with its start
    bool areAlike = true;
    size_t count = 0;
  };

  size_t width_;
  std::map<std::string, Lookalikes> shown_;  // by what the column has of them
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_NAMES_H_
