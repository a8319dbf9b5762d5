#ifndef TOOLS_KSICACHE_EXPORT_EXPORTER_H_
#define TOOLS_KSICACHE_EXPORT_EXPORTER_H_

#include <cstdint>
#include <span>
#include <string>

#include "framework/report.h"
#include "tools/ksicache/complaints.h"
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/report_run.h"

namespace ksicache {

// Puts reports into a format, of one file after the other. What cannot be read is said, and the
// rest goes on.
class Exporter {
 public:
  // `every`: of a file's moments the first in each interval of so many us is taken; 0: all.
  // `selection`: as of RunReport.
  Exporter(const FormatInfo& info, RowFormat& format, RowSink& sink, int64_t every,
           const tally::ReportOptions& selection)
      : isByReport_(info.isByReport),
        format_(format),
        sink_(sink),
        every_(every),
        selection_(selection) {}

  using Reports = std::span<const tally::Report* const>;

  // No files: this host.
  void Export(Reports reports, std::span<const std::string> files);

  // What the reports have, without their rows.
  void Describe(Reports reports);

  // Whether nothing was left out.
  bool IsWhole() const { return complaints_.IsEmpty(); }

  // Whether there is anything at all, be it only that there are no rows.
  bool HasBegun() const { return hasBegun_; }

 private:
  void ExportTogether(Reports reports, std::span<const std::string> files);
  void ExportFile(Reports reports, const std::string& name);
  void ExportMoment(Reports reports, const Origin& origin);
  template <class Action>
  void Saying(Action&& action);

  bool isByReport_;
  RowFormat& format_;
  RowSink& sink_;
  int64_t every_;
  tally::ReportOptions selection_;
  Complaints complaints_;
  bool hasBegun_ = false;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_EXPORT_EXPORTER_H_
