// Figures of rows over all moments: of each stretch of moments the least and the greatest.
//
// In the page a line is, in numbers (packing.h):
//
//   the number of bits that are cut off all of its figures, the lower ones downward and the upper
//   ones upward
//   for each stretch   0 where there is no figure, or 1 + the folded difference of the least one to
//                      that of the stretch before which has one
//   for each of these  how much greater the greatest one is
#ifndef TOOLS_KSICACHE_PAGE_LINES_H_
#define TOOLS_KSICACHE_PAGE_LINES_H_

#include <cstddef>
#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "tools/ksicache/export/row_format.h"
#include "tools/ksicache/page/names.h"
#include "tools/ksicache/page/roles.h"
#include "tools/ksicache/page/table_stream.h"

namespace ksicache {

struct Extent {
  int64_t least = INT64_MAX;
  int64_t greatest = INT64_MIN;

  bool IsEmpty() const { return least > greatest; }
  void Add(int64_t figure);
  void Add(const Extent& other);
};

// The least and the greatest figure of a line, and the moments at which it had them first.
struct Range {
  Extent extent;
  size_t least = 0;
  size_t greatest = 0;

  void Add(int64_t figure, size_t moment);
  // By how much it goes up and down; 0 if it has no figure.
  uint64_t Size() const;
};

// An extent for each stretch of moments.
using Line = std::vector<Extent>;

// Makes one of each two stretches.
void Halve(Line& line);

// Puts a line behind `bytes`, with so many bits cut off. It may have fewer stretches than it has
// to: there is nothing in the others.
void PutLine(const Line& line, size_t stretches, int bits, std::string& bytes);

// The lines of one report.
class ReportLines {
 public:
  // As many things of a report have lines: those that are met first.
  static constexpr uint32_t kMostThings = 2000;

  // `columns`: names of figures. The names of the report's things are added to `names`.
  ReportLines(PageTexts& texts, const char* report, std::vector<const char*> columns,
              ThingNames& names);

  // The rows of one moment, of this stretch, which is none before that of the last one: End behind
  // them, the rest as of TableStream.
  void BeginMoment(size_t moment, size_t stretch);
  void Begin(std::span<const RowColumn> columns);
  void Row(std::span<const Value> values);
  // `isWhole`: no row is missing from the sums.
  void End(bool isWhole);

  void Thin();

  // Puts the lines behind `bytes`: for each column that of all rows together, which has a figure
  // only where all rows have one, and those of the things. With `isCut` they are as exact as a
  // screen.
  void Put(size_t stretches, bool isCut, std::string& bytes) const;

  // What the things are called, in their order; nothing if the rows are no things.
  std::string ThingsToJson() const;

  // The moments at which a column's figures were the worst: of all rows together, then of so many
  // things whose figures changed most. What never changed has none.
  std::vector<size_t> WorstMoments(size_t column, bool isLessWorse, size_t things) const;

  // Whether there are others.
  bool LeavesOut() const { return leavesOut_; }

 private:
  // A figure over time.
  struct Figure {
    Line line;
    Range range;
  };
  struct Thing {
    std::string name;
    int64_t number;  // -1: it has none
  };

  void AddTo(Figure& figure, int64_t number) const;
  std::optional<size_t> ThingOf(std::span<const Value> values);
  Thing NamedIn(std::span<const Value> values) const;

  PageTexts& texts_;
  const roles::Things* role_;  // null if the rows are no things
  std::vector<const char*> columnNames_;
  ThingNames& names_;
  size_t moment_ = 0;
  size_t stretch_ = 0;

  std::vector<RowColumn> columns_;
  std::vector<size_t> places_;  // of the names among the columns
  std::vector<PageValue> row_;  // at hand: its keys
  RowIdentities identities_;
  std::vector<Figure> lines_;                // of the first thing, of the second, ...; one a column
  std::vector<Figure> sums_;                 // one a column
  std::vector<std::optional<int64_t>> sum_;  // of the moment at hand
  std::vector<Thing> things_;
  bool leavesOut_ = false;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_LINES_H_
