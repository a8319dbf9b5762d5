#include "tools/ksicache/export/exporter.h"

#include <optional>
#include <utility>

#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// Of moments one after the other the first in each interval, which lie on the clock's grid.
class Thinning {
 public:
  explicit Thinning(int64_t every) : every_(every) {}

  bool Takes(int64_t taken) {
    return every_ == 0 || std::exchange(interval_, taken / every_) != interval_;
  }

 private:
  int64_t every_;
  std::optional<int64_t> interval_;
};

}  // namespace

void Exporter::Export(Reports reports, std::span<const std::string> files) {
  if (!isByReport_) return ExportTogether(reports, files);
  for (size_t i = 0; i < reports.size(); ++i) ExportTogether(reports.subspan(i, 1), files);
}

void Exporter::Describe(Reports reports) {
  hasBegun_ = true;
  for (const tally::Report* report : reports) sink_.Expect(*report, {});
}

void Exporter::ExportTogether(Reports reports, std::span<const std::string> files) {
  do {
    if (files.empty()) ExportMoment(reports, LiveOrigin());
    for (const std::string& name : files) ExportFile(reports, name);
  } while (format_.EndReports());
}

void Exporter::ExportFile(Reports reports, const std::string& name) {
  complaints_.BeginFile(name);
  Thinning thinning(every_);
  Saying([&] {
    ForEachMoment(name, [&](const Origin& origin) {
      if (thinning.Takes(origin.taken)) ExportMoment(reports, origin);
    });
  });
}

void Exporter::ExportMoment(Reports reports, const Origin& origin) {
  for (const tally::Report* report : reports) {
    hasBegun_ = true;
    sink_.Expect(*report, origin);
    Saying([&] { RunReport(*report, sink_, selection_); });
    const std::string lost = sink_.TakeComplaint();
    if (!lost.empty()) complaints_.Say(report->name + (": " + lost));
  }
}

// Goes on after what cannot be read.
template <class Action>
void Exporter::Saying(Action&& action) {
  std::string error;
  try {
    action();
  } catch (const DataError& caught) {
    error = caught.what();
  }
  complaints_.SayDiagnostics();
  if (!error.empty()) complaints_.Say(error);
}

}  // namespace ksicache
