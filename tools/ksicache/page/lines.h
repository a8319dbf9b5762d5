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
#include "tools/ksicache/page/table_stream.h"

namespace ksicache {

struct Extent {
  int64_t least = INT64_MAX;
  int64_t greatest = INT64_MIN;

  bool IsEmpty() const { return least > greatest; }
  void Add(int64_t figure);
  void Add(const Extent& other);
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

  // `columns`: names of figures.
  ReportLines(PageTexts& texts, std::vector<const char*> columns);

  // The rows of one moment, of this stretch, which is none before that of the last one: End behind
  // them, the rest as of TableStream.
  void BeginMoment(size_t stretch);
  void Begin(std::span<const RowColumn> columns);
  void Row(std::span<const Value> values);
  // `isWhole`: no row is missing from the sums.
  void End(bool isWhole);

  void Thin();

  // Puts the lines behind `bytes`: for each column that of all rows together, which has a figure
  // only where all rows have one, and those of the things. With `isCut` they are as exact as a
  // screen.
  void Put(size_t stretches, bool isCut, std::string& bytes) const;

  // The key values of the things, in their order.
  std::string ThingsToJson() const;

  // Whether there are others.
  bool LeavesOut() const { return leavesOut_; }

 private:
  void AddTo(Line& line, int64_t figure) const;
  std::optional<size_t> ThingOf(std::span<const Value> values);
  void AddThing();

  PageTexts& texts_;
  std::vector<const char*> names_;
  size_t stretch_ = 0;

  std::vector<RowColumn> columns_;
  std::vector<size_t> places_;  // of the names among the columns
  std::vector<PageValue> row_;  // at hand: its keys
  RowIdentities identities_;
  std::vector<Line> lines_;  // of the first thing, of the second, ...; a line a column
  std::vector<Line> sums_;   // a line a column
  std::vector<std::optional<int64_t>> sum_;   // of the moment at hand
  std::vector<std::vector<PageValue>> keys_;  // of the things
  bool leavesOut_ = false;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_PAGE_LINES_H_
