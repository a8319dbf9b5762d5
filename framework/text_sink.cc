#include "framework/text_sink.h"

#include <cstdio>

namespace tally {

void TextSink::Begin(const Heading& heading) {
  heading_ = heading;
  shown_.resize(heading.columns.size());
  kept_.clear();
  converted_.clear();
  for (size_t i = 0; i < heading.figures.size(); ++i) {
    (heading.figures[i].IsShownAsItIs(heading.unit) ? kept_ : converted_).push_back(i);
  }
}

void TextSink::Row(RowKind kind, std::span<const Cell> cells) {
  if (!converted_.empty()) {
    for (const size_t i : kept_) shown_[i] = cells[i];
    for (const size_t i : converted_) {
      shown_[i] = heading_.figures[i].Shown(cells[i], heading_.unit);
    }
    cells = shown_;
  }
  const bool isTotal = kind == RowKind::total || kind == RowKind::counted;
  PrintRow(table(), csvMode_, isTotal, cells);
}

void TextSink::Note(std::string_view text) {
  std::printf("%.*s\n", static_cast<int>(text.size()), text.data());
}

void TextSink::Describe() { PrintColumnDescriptions(table()); }

}  // namespace tally
