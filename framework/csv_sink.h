#ifndef FRAMEWORK_CSV_SINK_H_
#define FRAMEWORK_CSV_SINK_H_

#include "framework/text_sink.h"

namespace tally {

// Prints a report as programs read it: a line of labels, then the rows, separated by commas.
class CsvSink : public TextSink {
 public:
  CsvSink() : TextSink(true) {}

  void Begin(const Heading& heading) override {
    TextSink::Begin(heading);
    PrintHeader(table(), true);
  }
  void Rule() override {}
};

}  // namespace tally

#endif  // FRAMEWORK_CSV_SINK_H_
