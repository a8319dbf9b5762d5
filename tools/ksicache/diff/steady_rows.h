#ifndef TOOLS_KSICACHE_DIFF_STEADY_ROWS_H_
#define TOOLS_KSICACHE_DIFF_STEADY_ROWS_H_

#include <cstddef>
#include <string>

#include "tools/ksicache/diff/rows.h"
#include "tools/ksicache/diff/steady.h"

namespace ksicache {

// One column of a report's rows.
class RowSampler : public Sampler {
 public:
  // `by`: the column; null: that of what the report's things have taken. Fails with a UsageError if
  // there is none.
  RowSampler(const tally::Report& report, const std::string* by);

  void Take(const Origin& origin, Samples& samples, Complaints& complaints) override;
  void Finish(const Samples& samples, SteadyGrowths& growths) override;

 private:
  void SetName(const Rows& rows, size_t row, Series& series) const;

  const tally::Report& report_;
  Rows::Names kept_;
  RowColumn column_;
  SeriesByIdentity all_;
  size_t end_ = 0;  // behind the last sample that has all rows
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_DIFF_STEADY_ROWS_H_
