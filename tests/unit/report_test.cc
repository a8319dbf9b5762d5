// The reports as another program runs them: found by name, into a sink of its own, as often as it
// likes. Rows are those of the example host.
#include "framework/report.h"

#include <gtest/gtest.h>
#include <knvlibs/ksi.h>

#include <string>
#include <vector>

#include "framework/csv_sink.h"
#include "framework/table_sink.h"
#include "reports/reports.h"

namespace tally {
namespace {

struct RecordedCell {
  std::string text;  // as it is shown, for a text or a flag
  uint64_t raw = 0;
  uint64_t shown = 0;
  Kind kind = Kind::text;
  DisplayUnit unit = DisplayUnit::kb;  // of `shown`, for memory
  bool isNone = false;

  friend bool operator==(const RecordedCell&, const RecordedCell&) = default;
};

struct RecordedRow {
  RowKind kind;
  std::vector<RecordedCell> cells;

  friend bool operator==(const RecordedRow&, const RecordedRow&) = default;
};

// Keeps what a report produces.
class Recording : public Sink {
 public:
  void Begin(const Heading& given) override {
    unit = given.unit;
    columns.assign(given.columns.begin(), given.columns.end());
    figures.assign(given.figures.begin(), given.figures.end());
    for (const Setting& setting : given.settings) {
      events += "[" + std::string(setting.label) + "=" + setting.value + "]";
    }
    for (const ColumnDesc& column : given.columns) names.emplace_back(column.name);
  }
  void Row(RowKind kind, std::span<const Cell> cells) override {
    events += kind == RowKind::item ? "r" : kind == RowKind::tag ? "t" : "T";
    rows.push_back({kind, {}});
    for (size_t i = 0; i < cells.size(); ++i) {
      const Figure& figure = figures[i];
      rows.back().cells.push_back({.text = std::string(cells[i].text()),
                                   .raw = cells[i].number(),
                                   .shown = figure.Shown(cells[i], unit).number(),
                                   .kind = figure.kind,
                                   .unit = unit,
                                   .isNone = figure.IsNone(cells[i])});
    }
  }
  void Rule() override { events += "-"; }
  void Note(std::string_view text) override { events += "<" + std::string(text) + ">"; }
  void Describe() override { events += "D"; }

  // The cell of the column called `name` in a row.
  const RecordedCell& At(size_t row, const std::string& name) const {
    const auto place = std::find(names.begin(), names.end(), name) - names.begin();
    return rows.at(row).cells.at(static_cast<size_t>(place));
  }

  DisplayUnit unit = DisplayUnit::kb;
  std::vector<ColumnDesc> columns;
  std::vector<Figure> figures;
  std::string events;
  std::vector<std::string> names;
  std::vector<RecordedRow> rows;
};

class Reporting : public testing::Test {
 protected:
  static void SetUpTestSuite() { ASSERT_EQ(KSI_UseCache(TALLY_EXAMPLE, 0), kSuccess); }

  static Recording Run(const char* name, const ReportOptions& options = {}) {
    Recording recording;
    const Report* const report = FindReport(name);
    EXPECT_EQ(report->run(options, recording), kSuccess);
    return recording;
  }
};

TEST_F(Reporting, FindsReportsInAnyCase) {
  EXPECT_STREQ(FindReport("VM-STATS")->name, "vm-stats");
  EXPECT_STREQ(FindReport("psharehint-stats")->name, "pshareHint-stats");
  EXPECT_EQ(FindReport("vm"), nullptr);
  EXPECT_EQ(FindReport(""), nullptr);
}

TEST_F(Reporting, ListsAllReportsWithTheirColumns) {
  std::string names;
  for (const Report* report : Reports()) {
    names += std::string(report->name) + " ";
    EXPECT_EQ(FindReport(report->name), report);
    for (const ReportVariant& variant : report->variants) {
      EXPECT_FALSE(variant.columns.empty());
      for (const ColumnInfo& column : variant.columns) {
        EXPECT_TRUE(IsSound(column)) << report->name << " " << column.desc.name;
        EXPECT_EQ(column.desc.selected, 1);
      }
      // The variant is what a run of so many levels has.
      const Recording recording = Run(report->name, {.levels = variant.levels});
      ASSERT_EQ(recording.names.size(), variant.columns.size());
      for (size_t i = 0; i < variant.columns.size(); ++i) {
        EXPECT_EQ(recording.names[i], variant.columns[i].desc.name);
        EXPECT_EQ(recording.figures[i].kind, variant.columns[i].figure.kind);
      }
    }
  }
  EXPECT_EQ(names,
            "group-stats vm-stats uw-stats pshare-stats pshareHint-stats swap-stats buddy-stats "
            "comp-stats lpool-stats heap-stats guest-stats zip-stats lpage-stats "
            "asyncremap-stats pmem-stats ");
}

TEST_F(Reporting, GivesFiguresAsTheyAreAndAsTheyAreShown) {
  const Recording recording = Run("vm-stats", {.unitText = "mb"});
  const RecordedCell& memory = recording.At(0, "memSize");
  EXPECT_EQ(memory.kind, Kind::kilobytes);
  EXPECT_EQ(memory.unit, DisplayUnit::mb);
  EXPECT_EQ(memory.raw, 33554432U);
  EXPECT_EQ(memory.shown, 32768U);
  EXPECT_FALSE(memory.isNone);

  const RecordedCell& name = recording.At(0, "name");
  EXPECT_EQ(name.kind, Kind::text);
  EXPECT_EQ(name.text, "db-orders");

  const RecordedCell& balloon = recording.At(0, "b");
  EXPECT_EQ(balloon.kind, Kind::flag);
  EXPECT_EQ(balloon.raw, 1U);
  EXPECT_EQ(balloon.text, "y");

  // No limit is no value.
  const RecordedCell& max = recording.At(0, "max");
  EXPECT_TRUE(max.isNone);
  EXPECT_EQ(max.shown, UINT64_MAX);
}

TEST_F(Reporting, GivesPagesAndBytesAsTheKernelCountsThem) {
  const Recording pages = Run("pshare-stats", {.unitText = "kb"});
  EXPECT_EQ(pages.At(0, "cow").kind, Kind::pages);
  EXPECT_EQ(pages.At(0, "cow").shown, 4 * pages.At(0, "cow").raw);
  EXPECT_GT(pages.At(0, "cow").raw, 0U);

  const Recording bytes = Run("heap-stats", {.unitText = "kb"});
  EXPECT_EQ(bytes.At(0, "size").kind, Kind::bytes);
  EXPECT_EQ(bytes.At(0, "size").shown, bytes.At(0, "size").raw / 1024);
  EXPECT_GT(bytes.At(0, "size").shown, 0U);
  EXPECT_EQ(Run("heap-stats").unit, DisplayUnit::b);
}

TEST_F(Reporting, TellsAllPartsInTheirOrder) {
  EXPECT_EQ(Run("comp-stats", {.unitText = "pg", .verbose = true}).events, "[Unit=Page (4K)]r-D");
  const std::string pshare = Run("pshare-stats").events;
  EXPECT_TRUE(pshare.starts_with("[Unit=KB][Peak chain length=")) << pshare;
  EXPECT_EQ(Run("pshareHint-stats").events, "[Unit=KB]rr-T-");
  EXPECT_TRUE(Run("lpool-stats", {.verbose = true})
                  .events.ends_with("-T-D<Displayed stats are either in small 4K page (SPage) or "
                                    "large 2M page (LPage) units>"));
  const std::string tags =
      Run("group-stats", {.levels = 2, .inclusionText = "sys:vm", .tags = true}).events;
  EXPECT_TRUE(
      tags.starts_with("[Start Group ID=0][No. of levels=2][Unit=KB]"
                       "[Inclusion filter=vm:sys][Exclusion filter=(none)]"))
      << tags;
  EXPECT_NE(tags.find("-<Virtual tags report>t"), std::string::npos) << tags;
}

// Widths and selection are the run's own.
TEST_F(Reporting, LeavesNothingBehind) {
  for (const Report* report : Reports()) {
    const Recording first = Run(report->name);
    const Recording narrow = Run(report->name, {.columnMask = "nothing"});
    const Recording again = Run(report->name);
    EXPECT_EQ(narrow.rows.size(), first.rows.size()) << report->name;
    EXPECT_EQ(again.rows, first.rows) << report->name;
    EXPECT_EQ(again.events, first.events) << report->name;
    for (const ReportVariant& variant : report->variants) {
      for (const ColumnInfo& column : variant.columns) EXPECT_EQ(column.desc.selected, 1);
    }
  }
}

TEST_F(Reporting, FailsBeforeTheSinkIsTold) {
  for (const Report* report : Reports()) {
    Recording recording;
    EXPECT_EQ(report->run({.levels = 0}, recording), kBadParameter) << report->name;
    EXPECT_EQ(recording.events, "");
    EXPECT_TRUE(recording.names.empty());
  }
  Recording recording;
  testing::internal::CaptureStderr();
  EXPECT_EQ(FindReport("vm-stats")->run({.unitText = "b"}, recording), kBadParameter);
  EXPECT_EQ(testing::internal::GetCapturedStderr(),
            "Invalid unit specified. Choose from {mb, kb, pg}\n");
  EXPECT_TRUE(recording.names.empty());
}

// The sinks of the program have nothing that another sink has not: CSV can be made of a recording.
TEST_F(Reporting, PrintsWhatASinkIsGiven) {
  for (const Report* report : Reports()) {
    CsvSink sink;
    testing::internal::CaptureStdout();
    EXPECT_EQ(report->run({.unitText = report->frame->Takes('u') ? "mb" : nullptr}, sink),
              kSuccess);
    std::fflush(stdout);
    const std::string printed = testing::internal::GetCapturedStdout();

    const Recording recording =
        Run(report->name, {.unitText = report->frame->Takes('u') ? "mb" : nullptr});
    std::string made;
    for (const std::string& name : recording.names) made += (made.empty() ? "" : ",") + name;
    made += "\n";
    for (const RecordedRow& row : recording.rows) {
      for (size_t i = 0; i < row.cells.size(); ++i) {
        if (i > 0) made += ",";
        const ColumnDesc& column = recording.columns[i];
        if (row.kind != RowKind::item && column.summable == 0) continue;
        const RecordedCell& cell = row.cells[i];
        const std::string_view conversion = column.conversion;
        made += conversion == "s" || conversion == "c" ? cell.text
                : conversion == "Lu"                   ? std::to_string(cell.shown)
                : conversion == "Ld" ? std::to_string(static_cast<int64_t>(cell.shown))
                : conversion == "u"  ? std::to_string(static_cast<uint32_t>(cell.shown))
                                     : std::to_string(static_cast<int32_t>(cell.shown));
      }
      made += "\n";
    }
    EXPECT_EQ(printed, made) << report->name;
  }
}

TEST_F(Reporting, PrintsATableForPeople) {
  TableSink sink;
  testing::internal::CaptureStdout();
  EXPECT_EQ(FindReport("vm-stats")->run({.unitText = "mb", .columnMask = "name:memSize"}, sink),
            kSuccess);
  std::fflush(stdout);
  const std::string printed = testing::internal::GetCapturedStdout();
  EXPECT_TRUE(printed.starts_with("\n VIRTUAL MACHINE STATS: ")) << printed;
  EXPECT_NE(printed.find("   Unit             : MB\n"
                         "   Selected columns : name:memSize\n\n"
                         "--------------------------\n"
                         "           name    memSize\n"
                         "--------------------------\n"
                         "      db-orders      32768\n"),
            std::string::npos)
      << printed;
}

}  // namespace
}  // namespace tally
