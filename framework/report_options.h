// The options of the reports, and what a report states of its own.
#ifndef FRAMEWORK_REPORT_OPTIONS_H_
#define FRAMEWORK_REPORT_OPTIONS_H_

#include <cstdint>

#include "framework/flag_filter.h"
#include "framework/status.h"

namespace tally {

// The deepest level of a walk.
constexpr uint32_t kMaxLevels = 12;

// How a level is compared with the deepest one.
enum class LevelCheck : uint8_t { asUnsigned, asSigned };

// When, among the settings, the columns are selected.
enum class SelectColumnsAt : uint8_t { beforeUnit, afterUnit, afterFilters };

// What frames a report: its title, its options and how they are settled. The options decide the
// lines of the title block, too: each setting that can be given has one.
struct ReportFrame {
  const char* title;      // of the title block, such as "GROUP STATS"
  int ruleLength;         // dashes below the title
  const char* options;    // short options, for getopt; the long ones follow from them
  int longVerbose = 'v';  // what --verbose is taken for
  bool totalRow = false;  // the rows are added up
  uint32_t defaultLevels = kMaxLevels;
  LevelCheck levelCheck = LevelCheck::asUnsigned;
  bool allowBytes = false;  // "b" is a display unit, and the default one
  SelectColumnsAt selectColumnsAt = SelectColumnsAt::afterUnit;
  const FlagName* filterNames = nullptr;  // the table of -i and -e
  int labelWidth = 16;                    // of the labels in the title block

  bool Takes(char letter) const;
};

// What the command line says to a report.
struct ReportOptions {
  int64_t startGid = 0;
  uint32_t levels = kMaxLevels;  // not 0
  const char* unitText = nullptr;
  const char* inclusionText = nullptr;
  const char* exclusionText = nullptr;
  const char* columnMask = nullptr;
  bool verbose = false;
  bool csvMode = false;
  bool tags = false;
};

// Goes on with the scan of the command line where the front end stopped. Options that the report
// does not take are passed over. A level that is no number above 0 is kBadParameter after its
// message; one that is too deep becomes the deepest after its message.
[[nodiscard]] Status ParseReportOptions(const ReportFrame& frame, int argc, char** argv,
                                        ReportOptions& options);

}  // namespace tally

#endif  // FRAMEWORK_REPORT_OPTIONS_H_
