#ifndef FRAMEWORK_TABLE_SINK_H_
#define FRAMEWORK_TABLE_SINK_H_

#include "framework/text_sink.h"

namespace tally {

// Prints a report as people read it: title block, labels between rules, aligned rows.
class TableSink : public TextSink {
 public:
  TableSink() : TextSink(false) {}

  void Begin(const Heading& heading) override;
  void Rule() override { PrintDashes(table(), false); }

 private:
  void PrintTitleBlock() const;
};

}  // namespace tally

#endif  // FRAMEWORK_TABLE_SINK_H_
