#ifndef FRAMEWORK_TEXT_SINK_H_
#define FRAMEWORK_TEXT_SINK_H_

#include <cstddef>
#include <span>
#include <string_view>
#include <vector>

#include "framework/sink.h"

namespace tally {

// What the sinks that print to standard output have in common. Errors stay with the stream.
class TextSink : public Sink {
 public:
  void Begin(const Heading& heading) override;
  void Row(RowKind kind, std::span<const Cell> cells) override;
  void Note(std::string_view text) override;
  void Describe() override;

 protected:
  explicit TextSink(bool csvMode) : csvMode_(csvMode) {}

  const Heading& heading() const { return heading_; }
  const ColumnDesc* table() const { return heading_.columns.data(); }

 private:
  bool csvMode_;
  Heading heading_ = {};
  // The places of the figures that are shown as they are, and those of the others.
  std::vector<size_t> kept_;
  std::vector<size_t> converted_;
  std::vector<Cell> shown_;  // the row at hand, in the display unit
};

}  // namespace tally

#endif  // FRAMEWORK_TEXT_SINK_H_
