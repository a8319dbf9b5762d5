// ksicache export: its command line, files and moments, CSV and JSON.
#include <unistd.h>

#include <algorithm>
#include <array>
#include <set>
#include <string>
#include <vector>

#include <nlohmann/json.hpp>
#include "tests/ksicache/export_fixture.h"

namespace ksi {
namespace {

using nlohmann::json;

constexpr const char* kHints =
    "host,time,type,totAdd,totRemove,active\n"
    "hypervisor.example.org,2026-11-21T10:00:00Z,regular,15325080,15013392,311688\n"
    "hypervisor.example.org,2026-11-21T10:00:00Z,lpage,3924480,3871232,53248\n"
    "hypervisor.example.org,2026-11-21T10:00:00Z,Total,19249560,18884624,364936\n";

TEST_F(ExportTest, WritesCsv) {
  EXPECT_EQ(Output({"export", "pshareHint-stats", kExample}), kHints);
  EXPECT_EQ(Output({"export", "PSHAREHINT-stats", "--format", "CSV", "--unit=KB", kExample}),
            kHints);
}

TEST_F(ExportTest, WritesJson) {
  EXPECT_EQ(Output({"export", "comp-stats", "-umb", "--format=json", kExample}),
            R"({"host":"hypervisor.example.org","time":"2026-11-21T10:00:00Z",)"
            R"("total":262144,"discarded":0,"managedByMemMap":257536,"reliableMem":16384,)"
            R"("kernelCode":24,"critical":64,"dataAndHeap":3072,"buddyOvhd":512,"rsvdLow":128,)"
            R"("managedByMemSched":254464,"minFree":3200,"knvClientConsumed":5120,)"
            R"("otherConsumed":114423,"free":134856,"numHigh":10,"numClear":13,"numSoft":5,)"
            R"("numHard":1,"numLow":0,"memState":"High"})"
            "\n");
}

// With several reports each row says of which it is, and each report has its header.
TEST_F(ExportTest, WritesSeveralReports) {
  const std::string start = "hypervisor.example.org,2026-11-21T10:00:00Z,";
  EXPECT_EQ(Output({"export", "pshareHint-stats,pshare-stats", kExample}),
            "host,time,report,type,totAdd,totRemove,active\n" + start +
                "pshareHint-stats,regular,15325080,15013392,311688\n" + start +
                "pshareHint-stats,lpage,3924480,3871232,53248\n" + start +
                "pshareHint-stats,Total,19249560,18884624,364936\n"
                "\n"
                "host,time,report,cow,cow1,zero,used,reclaimed,totAdd,totRemove\n" +
                start +
                "pshare-stats,18937228,1683308,3313500,3787444,15149784,60599136,45449352\n");
  std::set<std::string> reports;
  for (const std::string& line : Lines(Output({"export", "all", "--format=json", kExample}))) {
    reports.insert(json::parse(line)["report"]);
  }
  EXPECT_EQ(reports, std::set<std::string>(kReports.begin(), kReports.end()));
}

// The figures of a column without a value, as tally shows them in each unit.
const std::set<std::string> kNoValues = {
    "-1",
    "18446744073709551615",
    "18446744073709551612",  // pages in KB
    "18014398509481983",     // and in MB, as are bytes in KB
    "4611686018427387903",   // pages in pages
};

// Each cell is what tally shows, but for figures without a value.
TEST_F(ExportTest, HasTheFiguresOfTally) {
  size_t none = 0;
  size_t cells = 0;
  for (const std::string& report : kReports) {
    for (const std::string unit : {"", "mb", "kb", "pg"}) {
      SCOPED_TRACE(report + " in " + unit);
      std::vector<std::string> exported = {"export", report, kExample};
      std::vector<std::string> printed = {"-c", kExample, "-r", report, "-q"};
      if (!unit.empty()) {
        exported.insert(exported.end(), {"-u", unit});
        printed.insert(printed.end(), {"-u", unit});
      }
      const std::vector<Row> ours = Cells(Output(exported));
      const std::vector<Row> tallys = Cells(RunTally(printed).out);
      // The last row of tally may be the Total.
      ASSERT_GT(ours.size(), 1u);
      ASSERT_TRUE(ours.size() == tallys.size() ||
                  (ours.size() + 1 == tallys.size() &&
                   (tallys.back()[0] == "Total" || tallys.back()[0].empty())));
      for (size_t row = 0; row < ours.size(); ++row) {
        ASSERT_EQ(ours[row].size(), tallys[row].size() + 2);
        for (size_t i = 0; i < tallys[row].size(); ++i) {
          const std::string& cell = ours[row][i + 2];
          ++cells;
          if (cell.empty()) {
            ++none;
            EXPECT_TRUE(kNoValues.contains(tallys[row][i])) << tallys[row][i];
          } else {
            EXPECT_EQ(cell == "\"\"" ? "" : cell, tallys[row][i]) << ours[0][i + 2];
            EXPECT_FALSE(kNoValues.contains(cell)) << ours[0][i + 2];
          }
        }
      }
    }
  }
  EXPECT_GT(none, 100u);
  EXPECT_GT(cells, 20'000u);
}

// JSON has what CSV has, with types.
TEST_F(ExportTest, HasTheSameFiguresInJson) {
  for (const std::string& report : kReports) {
    SCOPED_TRACE(report);
    const std::vector<Row> csv = Cells(Output({"export", report, kExample}));
    const std::vector<std::string> lines =
        Lines(Output({"export", report, "--format", "json", kExample}));
    ASSERT_EQ(lines.size() + 1, csv.size());
    for (size_t row = 0; row < lines.size(); ++row) {
      const nlohmann::ordered_json object = nlohmann::ordered_json::parse(lines[row]);
      ASSERT_EQ(object.size(), csv[0].size());
      size_t column = 0;
      for (const auto& [name, value] : object.items()) {
        const std::string& cell = csv[row + 1][column];
        EXPECT_EQ(name, csv[0][column++]);
        if (value.is_null()) {
          EXPECT_EQ(cell, "");
        } else if (value.is_boolean()) {
          EXPECT_EQ(cell, value.get<bool>() ? "y" : "n");
        } else if (value.is_number()) {
          EXPECT_EQ(cell, value.dump());
        } else {
          EXPECT_EQ(cell == "\"\"" ? "" : cell, value.get<std::string>());
        }
      }
    }
  }
}

// What a report computes from a figure without a value has none either, nor has what does not fit
// into the report; tally shows a number for both.
TEST_F(ExportTest, HasNoValueForWhatIsComputedFromNone) {
  const std::string none = "18446744073709551615";
  const std::string host = ExampleWith(
      "none.ksi",
      {{R"("mapped":6543112)", R"("mapped":)" + none},
       {R"("size":2097152)", R"("size":4294967295)"},
       {R"("hintsAdded":4812390)", R"("hintsAdded":)" + none},
       {R"("lpageHintsRemoved":967808)", R"("lpageHintsRemoved":981121)"},
       {R"("keys":["clear"],"value":{"up":9)", R"("keys":["clear"],"value":{"up":4294967295)"},
       {R"("min":0,"max":-1)", R"("min":8589934592,"max":8589934592)"},
       {R"("isSwapping":0)", R"("isSwapping":255)"},
       {R"("curSwapper":0)", R"("curSwapper":4294967295)"},
       {R"("memState":0)", R"("memState":4294967295)"}});
  const auto values = [&](const std::string& report, const std::string& column) {
    std::string text;
    for (const std::string& line : Lines(Output({"export", report, "--format=json", host}))) {
      const json row = json::parse(line);
      if (!row.contains("name") || row["name"] == "web-01" || row["name"] == "acpi")
        text += row[column].dump() + " ";
    }
    return text;
  };
  EXPECT_EQ(values("vm-stats", "mapped"), "null ");
  EXPECT_EQ(values("vm-stats", "consumed"), "null ");
  EXPECT_EQ(values("vm-stats", "min"), "null ");
  EXPECT_EQ(values("vm-stats", "max"), "null ");
  EXPECT_EQ(values("heap-stats", "used"), "null ");
  EXPECT_EQ(values("heap-stats", "avail"), "676337 ");
  EXPECT_EQ(values("pshareHint-stats", "totAdd"), "null 3924480 null ");
  EXPECT_EQ(values("pshareHint-stats", "totRemove"), "14960140 3924484 18884624 ");
  EXPECT_EQ(values("pshareHint-stats", "active"), "null null 364936 ");
  EXPECT_EQ(values("comp-stats", "numHigh"), "null ");
  EXPECT_EQ(values("comp-stats", "numClear"), "13 ");
  EXPECT_EQ(values("comp-stats", "memState"), "null ");
  EXPECT_EQ(values("swap-stats", "CurSwapper"), "null ");
  EXPECT_EQ(values("swap-stats", "isSwapping"), "null ");
  EXPECT_EQ(Output({"export", "vm-stats", "--format=openmetrics", host})
                .find("tally_vm_consumed_bytes{host=\"hypervisor.example.org\",name=\"web-01\""),
            std::string::npos);
  EXPECT_NE(
      RunTally({"-c", host, "-r", "heap-stats", "-q", "-s", "used"}).out.find("acpi,4294290958\n"),
      std::string::npos);
}

// In bytes nothing is lost: limits in 32 bits of kilobytes have room, too.
TEST_F(ExportTest, TakesBytesForEveryReport) {
  const std::vector<Row> kb = Cells(Output({"export", "vm-stats", kExample}));
  const std::vector<Row> bytes = Cells(Output({"export", "vm-stats", "-u", "b", kExample}));
  size_t memory = 0;
  for (size_t row = 1; row < kb.size(); ++row) {
    for (const char* name : {"memSize", "min", "minLimit", "consumed"}) {
      const auto column = static_cast<size_t>(std::ranges::find(kb[0], name) - kb[0].begin());
      EXPECT_EQ(std::stoull(bytes[row][column]), 1024 * std::stoull(kb[row][column]));
      ++memory;
    }
  }
  EXPECT_EQ(memory, 48u);
  EXPECT_EQ(Lines(Output({"export", "pshare-stats", "-u", "b", kExample}))[1],
            "hypervisor.example.org,2026-11-21T10:00:00Z,19391721472,1723707392,3393024000,"
            "3878342656,15513378816,62053515264,46540136448");
}

// A number that has no room in the unit is none, and said, instead of another one.
TEST_F(ExportTest, WrapsNoFigure) {
  const std::string host =
      ExampleWith("large.ksi", {{R"("cow":4734307)", R"("cow":18446744073709551000)"}});
  const harness::Result result = Run({"export", "pshare-stats", "-u", "b", "--format=json", host});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err,
            "ksicache: " + host + ": pshare-stats: cow has a figure that is too large in Bytes\n");
  EXPECT_EQ(json::parse(result.out)["cow"], nullptr);
  EXPECT_EQ(Cells(Output({"export", "pshare-stats", "-u", "mb", host}))[1][2], "72057594037927933");
}

TEST_F(ExportTest, QuotesHostileNames) {
  const std::string longName(4096, 'n');
  const std::string host = ExampleWith(
      "hostile.ksi", {
                         {R"({"text":"web-01"})", R"({"text":"a,\"b\"\r\nc"})"},
                         {R"({"text":"web-02"})", R"({"text":"=1+1"})"},
                         {R"({"text":"web-03"})", R"({"text":" blanks "})"},
                         {R"({"text":"mail"})", R"({"text":""})"},
                         {R"({"text":"build-linux"})", R"({"text":"a%ff 5% %2"})"},
                         {R"({"text":"gateway"})", R"({"text":"caf\u00e9 \u202e\u001b[2J\\"})"},
                         {R"({"text":"monitoring"})",
                          R"({"text":{"hex":"61ff)" + std::string(2 * 62, '0') + R"("}})"},
                         {R"("desktop-anna")", '"' + longName + '"'},
                         {R"({"text":")" + longName + "\"}", R"({"text":"desktop-anna"})"},
                         {R"("host": "hypervisor.example.org")", R"("host": "h,\u0007")"},
                     });
  const std::string csv = Output({"export", "guest-stats", host});
  const std::string start = "\"h,\a\",2026-11-21T10:00:00Z,";
  EXPECT_NE(csv.find("\n" + start + "\"a,\"\"b\"\"\r\nc\",1020,"), std::string::npos) << csv;
  EXPECT_NE(csv.find("\n" + start + "=1+1,1030,"), std::string::npos);
  EXPECT_NE(csv.find("\n" + start + "\" blanks \",1040,"), std::string::npos);
  EXPECT_NE(csv.find("\n" + start + "\"\",1050,"), std::string::npos);
  EXPECT_NE(csv.find("\n" + start + "a%25ff 5% %2,"), std::string::npos);
  EXPECT_NE(csv.find("\n" + start + "café \xe2\x80\xae\x1b[2J\\,1110,"), std::string::npos);
  EXPECT_NE(csv.find("\n" + start + "a%ff,1100,"), std::string::npos);

  std::vector<json> names;
  for (const std::string& line : Lines(Output({"export", "guest-stats", "--format=json", host}))) {
    const json row = json::parse(line);
    EXPECT_EQ(row["host"], "h,\a");
    names.push_back(row["name"]);
  }
  for (const json& name :
       std::vector<json>{"a,\"b\"\r\nc", "=1+1", " blanks ", "", "café \u202e\x1b[2J\\", "a%ff"}) {
    EXPECT_EQ(std::ranges::count(names, name), 1) << name;
  }
  EXPECT_NE(Output({"export", "lpool-stats", host}).find("," + longName + ","), std::string::npos);
}

TEST_F(ExportTest, TakesAMomentOfARecording) {
  const auto states = [](const std::string& name) {
    std::string result;
    for (const Row& row : Cells(Output({"export", "comp-stats", name}))) {
      if (row[0] != "host") result += row[1] + " " + row.back() + "\n";
    }
    return result;
  };
  EXPECT_EQ(states(kIncident), "2026-11-21T10:06:00Z High\n");
  EXPECT_EQ(states(kIncident + "@10:05Z"), "2026-11-21T10:05:00Z Hard\n");
  EXPECT_EQ(states(kIncident + "@first"), "2026-11-21T10:02:00Z High\n");
  EXPECT_EQ(states(kExample + "@2026-11-21T12:00Z"), "2026-11-21T10:00:00Z High\n");
  const std::string all =
      "2026-11-21T10:02:00Z High\n2026-11-21T10:03:00Z High\n2026-11-21T10:04:00Z High\n"
      "2026-11-21T10:05:00Z Hard\n2026-11-21T10:06:00Z High\n";
  EXPECT_EQ(states(kIncident + "@.."), all);
  EXPECT_EQ(states(kIncident + "@first..last"), all);
  EXPECT_EQ(states(kIncident + "@-4m.."), all);
  EXPECT_EQ(states(kIncident + "@10:04Z.."), all.substr(52));
  EXPECT_EQ(states(kIncident + "@10:04:01Z.."), all.substr(78));
  EXPECT_EQ(states(kIncident + "@..10:02:59Z"), all.substr(0, 26));
  EXPECT_EQ(states(kIncident + "@10:03Z..10:04Z"), all.substr(26, 52));
  EXPECT_EQ(states(kIncident + "@09:00Z.."), all);
  EXPECT_EQ(states(kIncident + "@09:00Z..11:00Z"), all);
  EXPECT_EQ(states(kIncident + "@..11:00Z"), all);
  EXPECT_EQ(states(kIncident + "@10:05Z..10:03Z"), all.substr(78));
}

// Times without a date are of one day, and none is of the day before the other.
TEST_F(ExportTest, TakesBothTimesOfASpanOnOneDay) {
  const std::string file = RecordingAt(
      "days.rec", {"2026-11-19T23:30:00Z", "2026-11-20T10:00:00Z", "2026-11-20T23:30:00Z",
                   "2026-11-21T09:00:00Z", "2026-11-21T10:15:00Z", "2026-11-21T10:30:00Z"});
  const auto days = [&](const std::string& span) {
    std::string text;
    for (const Row& row : Cells(Output({"export", "pshare-stats", file + "@" + span}))) {
      if (row[0] != "host") text += row[1].substr(8, 8) + " ";
    }
    return text;
  };
  EXPECT_EQ(days("10:00Z..11:00Z"), "21T10:15 21T10:30 ");
  EXPECT_EQ(days("10:00Z..10:20Z"), "21T10:15 ");
  EXPECT_EQ(days("23:00Z..01:00Z"), "20T23:30 ");
  EXPECT_EQ(days("23:00Z..09:00Z"), "20T23:30 21T09:00 ");
  EXPECT_EQ(days("23:00Z..22:59Z"), "20T23:30 21T09:00 21T10:15 21T10:30 ");
  EXPECT_EQ(days("2026-11-19T23:00Z..11:00Z"), "19T23:30 20T10:00 ");
  EXPECT_EQ(days("..11:00Z"), "19T23:30 20T10:00 ");
  EXPECT_EQ(days("-90m..11:00Z"), "21T09:00 21T10:15 21T10:30 ");
  EXPECT_EQ(days("10:15Z..10:15Z"), "21T10:15 ");
  EXPECT_EQ(days("2026-11-20T10:00Z..2027-01-01T00:00Z"),
            "20T10:00 20T23:30 21T09:00 21T10:15 21T10:30 ");
}

TEST_F(ExportTest, RefusesTimesThatThereAreNot) {
  const std::string kSpan = "moments are of 2026-11-21T10:02:00Z to 2026-11-21T10:06:00Z";
  const auto expect = [](const std::string& name, const std::string& message) {
    const harness::Result result = Run({"export", "comp-stats", "--format=json", name});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err, "ksicache: " + name + ": " + message + "\n");
  };
  expect(kIncident + "@11:00..11x",
         "11x is no time, as 2026-11-21T10:05, 10:05, -10m and last are: " + kSpan);
  expect(kIncident + "@2026-11-22T10:00Z..", "there is no moment in that time: " + kSpan);
  expect(kIncident + "@11:00Z..", "there is no moment in that time: " + kSpan);
  expect(kIncident + "@11:00Z..12:00Z", "there is no moment in that time: " + kSpan);
  expect(kIncident + "@..09:00Z", "there is no moment in that time: " + kSpan);
  expect(kIncident + "@2026-11-20T10:00Z", "there is no moment so early: " + kSpan);
  expect(kExample + "@..", "is no recording");
  expect(Path("none@.."), "No such file or directory");
}

// The first moment on or after each multiple of the time.
TEST_F(ExportTest, TakesAMomentOfEachInterval) {
  const std::string file = RecordingAt(
      "thin.rec", {"2026-11-20T23:59:59Z", "2026-11-21T10:00:00Z", "2026-11-21T10:04:59Z",
                   "2026-11-21T10:05:01Z", "2026-11-21T10:09:59Z", "2026-11-21T10:10:00Z",
                   "2026-11-21T10:31:00Z"});
  const auto times = [](const std::vector<std::string>& args) {
    std::string text;
    for (const Row& row : Cells(Output(args))) {
      if (row[0] != "host") text += row[1].substr(8, 11) + " ";
    }
    return text;
  };
  EXPECT_EQ(times({"export", "pshare-stats", "--every", "5m", file + "@.."}),
            "20T23:59:59 21T10:00:00 21T10:05:01 21T10:10:00 21T10:31:00 ");
  EXPECT_EQ(times({"export", "pshare-stats", "--every", "1d", file + "@.."}),
            "20T23:59:59 21T10:00:00 ");
  // Each file has intervals of its own, and a single moment is one.
  EXPECT_EQ(times({"export", "pshare-stats", "--every", "1h", file + "@10:04Z..", file + "@10:05Z",
                   file + "@10:09Z.."}),
            "21T10:04:59 21T10:04:59 21T10:09:59 ");
}

// Those that are named, whatever the case and the order, and those that tell rows apart.
TEST_F(ExportTest, TakesTheColumnsThatAreNamed) {
  const auto header = [](const std::vector<std::string>& args) { return Lines(Output(args))[0]; };
  EXPECT_EQ(header({"export", "vm-stats", "-s", "SWAPPED:consumed:name", kExample}),
            "host,time,name,schedGrp,consumed,swapped");
  EXPECT_EQ(header({"export", "group-stats", "--columns=consumed", kExample}),
            "host,time,gid,name,consumed");
  EXPECT_EQ(Output({"export", "comp-stats", "-s", "free:memState", "--format=json", "-u", "mb",
                    kIncident + "@10:05Z"}),
            R"({"host":"hypervisor.example.org","time":"2026-11-21T10:05:00Z",)"
            R"("free":900,"memState":"Hard"})"
            "\n");
  // Of several reports each has those that it has.
  const std::vector<std::string> lines =
      Lines(Output({"export", "comp-stats,heap-stats", "-s", "used:free", kExample}));
  EXPECT_EQ(lines[0], "host,time,report,free");
  EXPECT_EQ(lines[3], "host,time,report,name,used");
  // The figures are those of all columns.
  const std::vector<Row> all = Cells(Output({"export", "vm-stats", kExample}));
  const std::vector<Row> some = Cells(Output({"export", "vm-stats", "-s", "touched", kExample}));
  const auto place = static_cast<size_t>(std::ranges::find(all[0], "touched") - all[0].begin());
  ASSERT_EQ(some.size(), all.size());
  for (size_t row = 0; row < all.size(); ++row) EXPECT_EQ(some[row].back(), all[row][place]);
}

// Those that tally shows with the same options.
TEST_F(ExportTest, TakesTheRowsThatAreSelected) {
  const auto namesOf = [](const std::vector<Row>& cells) {
    const auto place = static_cast<size_t>(std::ranges::find(cells[0], "name") - cells[0].begin());
    std::vector<std::string> names;
    for (size_t row = 1; row < cells.size(); ++row) {
      const std::string& name = cells[row][place];
      if (name != "Total" && !name.empty()) names.push_back(name);
    }
    return names;
  };
  const std::vector<std::vector<std::string>> selections = {
      {"vm-stats", "-g", "1050"},
      {"vm-stats", "-g", "4", "-l", "1"},
      {"uw-stats", "-g", "3", "-l", "2"},
      {"uw-stats", "-i", "uw"},
      {"uw-stats", "-e", "UW"},
      {"group-stats", "-l", "2"},
      {"group-stats", "-i", "vm:vmm", "-e", "sys"},
      {"asyncremap-stats", "-g", "1010"},
  };
  std::set<size_t> counts;
  for (const std::vector<std::string>& selection : selections) {
    SCOPED_TRACE(selection[0] + selection[1] + selection[2]);
    std::vector<std::string> shown = {"-c", kExample, "-r"};
    shown.insert(shown.end(), selection.begin(), selection.end());
    shown.insert(shown.end(), {"-q", "-s", "name"});
    std::vector<std::string> exported = {"export"};
    exported.insert(exported.end(), selection.begin(), selection.end());
    exported.push_back(kExample);
    const std::vector<std::string> names = namesOf(Cells(Output(exported)));
    EXPECT_EQ(names, namesOf(Cells(RunTally(shown).out)));
    counts.insert(names.size());
  }
  EXPECT_GE(counts.size(), 4u);
  // Of several reports each takes what it can.
  EXPECT_EQ(Lines(Output({"export", "vm-stats,comp-stats", "--group", "1050", "--levels=3",
                          kIncident + "@.."}))
                .size(),
            1u + 5u + 2u + 5u);
}

TEST_F(ExportTest, RefusesSelectionsThatThereAreNot) {
  ExpectFailure({"export", "comp-stats,heap-stats", "-g", "1", kExample},
                "no report that is exported takes --group", 2);
  ExpectFailure({"export", "pmem-stats", "-l", "2", kExample},
                "no report that is exported takes --levels", 2);
  ExpectFailure({"export", "vm-stats", "-i", "vm", kExample},
                "no report that is exported takes --include", 2);
  ExpectFailure({"export", "vm-stats", "-g", "1x", kExample},
                "--group takes the number of a group: 1x", 2);
  ExpectFailure({"export", "vm-stats", "-g", "-1", kExample},
                "--group takes the number of a group: -1", 2);
  ExpectFailure({"export", "vm-stats", "-l", "0", kExample}, "--levels takes a number from 1 on: 0",
                2);
  ExpectFailure({"export", "vm-stats", "-l", "13", kExample}, "--levels takes a number up to 12",
                2);
  const harness::Result result = Run({"export", "all", "-e", "uw:sys", kExample});
  EXPECT_EQ(result.status, 2);
  EXPECT_EQ(result.err, "ksicache: --exclude takes flags of uw-stats: uw:sys\nThere are uw, vm\n");
  // A moment without the group is said, and the others are there.
  const harness::Result none = Run({"export", "vm-stats", "-g", "999", kExample});
  EXPECT_EQ(none.status, 1);
  EXPECT_EQ(none.err, "ksicache: " + kExample +
                          ": TallyTraverseGroups: KSI_GetInstanceListAlloc failure: Not found\n" +
                          "ksicache: " + kExample + ": vm-stats: 0xbad0003 Not found\n");
}

TEST_F(ExportTest, TakesAListOfFiles) {
  const std::string one = RecordingAt("one.rec", {"2026-11-21T10:00:00Z"});
  const std::string odd = Path("a\nb.ksi");
  WriteContent(odd, FileContent(kExample));
  const auto hosts = [](const std::vector<std::string>& args, const std::string& input = "") {
    const harness::MemoryFile standardInput(input);
    lseek(standardInput.Descriptor(), 0, SEEK_SET);
    harness::Program program = Command(args);
    program.files.emplace_back(STDIN_FILENO, standardInput.Descriptor());
    const harness::Result result = harness::RunProgram(program);
    EXPECT_EQ(result.err, "");
    EXPECT_EQ(result.status, 0);
    std::string text;
    for (const Row& row : Cells(result.out)) text += row[0] + " ";
    return text;
  };
  WriteContent(Path("lines"), one + "\n\n" + kIncident + "@10:05Z\n" + one + "@..");
  EXPECT_EQ(hosts({"export", "pshare-stats", kExample, "--files-from", Path("lines")}),
            "host hypervisor.example.org h hypervisor.example.org h ");
  EXPECT_EQ(hosts({"export", "pshare-stats", "--files-from=-"},
                  one + std::string(1, '\0') + odd + std::string(1, '\0')),
            "host h hypervisor.example.org ");
  // No file is not this host.
  WriteContent(Path("none"), "\n");
  ExpectFailure({"export", "pshare-stats", "--files-from", Path("none")},
                Path("none") + ": names no file");
  ExpectFailure({"export", "pshare-stats", "--files-from", Path("missing")},
                Path("missing") + ": No such file or directory");
}

// Of a recording that is damaged somewhere the other chunks are exported.
TEST_F(ExportTest, ExportsWhatIsNotDamagedOfARecording) {
  std::vector<std::string> times;
  for (int minute = 10; minute < 19; ++minute) {
    times.push_back("2026-11-21T10:" + std::to_string(minute) + ":00Z");
  }
  const std::string file = RecordingAt("whole.rec", times, 3);
  const std::string all = Output({"export", "pshare-stats", "-u", "pg", "-s", "cow", file + "@.."});
  const std::vector<std::string> lines = Lines(all);
  ASSERT_EQ(lines.size(), 10u);
  const std::string damaged = Path("damaged.rec");
  for (size_t chunk = 0; chunk < 3; ++chunk) {
    SCOPED_TRACE(chunk);
    WriteContent(damaged, FileContent(file));
    RunSql(damaged,
           "UPDATE block SET data = substr(data, 1, 10) || zeroblob(length(data) - 10) WHERE id = "
           "(SELECT block FROM part WHERE number = " +
               std::to_string(3 * chunk) + " AND moments = 3)");
    const harness::Result result =
        Run({"export", "pshare-stats", "-u", "pg", "-s", "cow", damaged + "@.."});
    EXPECT_EQ(result.status, 1);
    std::string rest;
    for (size_t i = 0; i < lines.size(); ++i) {
      if (i == 0 || (i - 1) / 3 != chunk) rest += lines[i] + "\n";
    }
    EXPECT_EQ(result.out, rest);
    EXPECT_EQ(result.err, "ksicache: " + damaged + "@..: the part of " + times[3 * chunk] +
                              " is damaged\nksicache: " + damaged + "@..: 3 moments of " +
                              times[3 * chunk] + " to " + times[3 * chunk + 2] +
                              " cannot be read\n");
    // Nothing is wrong with what was not asked for.
  }
  // Nothing is missing of what lies before it.
  EXPECT_EQ(Cells(Output({"export", "pshare-stats", damaged + "@10:10Z..10:14Z"})).size(), 6u);
}

// What is wrong with one file is said, and the others have their turn.
TEST_F(ExportTest, GoesOnAfterABrokenFile) {
  WriteContent(Path("broken.ksi"), FileContent(kExample).substr(0, 20'000));
  WriteContent(Path("text"), "no cache file");
  const harness::Result result = Run({"export", "pshareHint-stats", Path("broken.ksi"), kExample,
                                      Path("text"), Path("none"), kIncident + "@10:05Z"});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.out,
            std::string(kHints) +
                "hypervisor.example.org,2026-11-21T10:05:00Z,regular,15325080,15013392,311688\n"
                "hypervisor.example.org,2026-11-21T10:05:00Z,lpage,3924480,3871232,53248\n"
                "hypervisor.example.org,2026-11-21T10:05:00Z,Total,19249560,18884624,364936\n");
  const std::vector<std::string> lines = Lines(result.err);
  ASSERT_EQ(lines.size(), 3u);
  EXPECT_EQ(lines[0].substr(0, lines[0].rfind(": ")), "ksicache: " + Path("broken.ksi"));
  EXPECT_EQ(lines[1], "ksicache: " + Path("text") + ": not a cache file");
  EXPECT_EQ(lines[2], "ksicache: " + Path("none") + ": No such file or directory");
}

TEST_F(ExportTest, TellsRowsThatAreMissing) {
  WriteContent(Path("less.json"),
               R"({"ksiCache":1,"host":"h","taken":"2026-11-21T10:00:00Z","readings":[
    {"node":"memory/pshare/stats","keys":[],"status":"0xbad005a"}]})");
  Output({"load", Path("less.json"), Path("less.ksi")});
  const harness::Result result =
      Run({"export", "pshareHint-stats,pshare-stats", Path("less.ksi"), kExample});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(Lines(result.out).size(), 7u);
  EXPECT_EQ(result.err,
            "ksicache: " + Path("less.ksi") + ": pshareHint-stats: 0xbad005a Permission denied\n" +
                "ksicache: " + Path("less.ksi") + ": pshare-stats: 0xbad005a Permission denied\n");
}

// Rows that could not be read are missing, whether tally has a word for it or not.
TEST_F(ExportTest, TellsOfSingleRowsThatAreMissing) {
  const auto expect = [&](const std::string& name, const std::string& report,
                          const std::vector<std::pair<std::string, std::string>>& changes,
                          size_t rows, const std::string& message) {
    SCOPED_TRACE(name);
    const std::string host = ExampleWith(name, changes);
    const harness::Result result = Run({"export", report, "--format=json", host});
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(Lines(result.out).size(), rows);
    const std::vector<std::string> lines = Lines(result.err);
    ASSERT_FALSE(lines.empty());
    EXPECT_EQ(lines.back(), "ksicache: " + host + ": " + report + ": rows are missing: " + message);
  };
  expect("swap.ksi", "vm-stats",
         {{R"("node":"sched/memClients/swapInfo","keys":[4121],"value":{"isSwapping":1)",
           R"("node":"sched/memClients/swapInfo","keys":[5121],"value":{"isSwapping":1)"}},
         11, "0xbad0003 Not found");
  expect("list.ksi", "group-stats",
         {{R"("node":"sched/groups/members/groups","keys":[1020])",
           R"("node":"sched/groups/members/groups","keys":[91020])"}},
         49, "0xbad0003 Not found");
  expect("buddy.ksi", "buddy-stats",
         {{R"("node":"memory/memNodes","keys":[0])", R"("node":"memory/memNodes","keys":[70])"}}, 1,
         "0xbad0003 Not found");
}

// A report without rows has a header and a table.
TEST_F(ExportTest, HasTheColumnsOfAReportWithoutRows) {
  WriteContent(Path("less.json"), JsonWith(""));
  Output({"load", Path("less.json"), Path("less.ksi")});
  const harness::Result result =
      Run({"export", "heap-stats,pmem-stats", "-o", Path("less.csv"), Path("less.ksi")});
  EXPECT_EQ(result.status, 1);
  const std::vector<std::string> lines = Lines(FileContent(Path("less.csv")));
  ASSERT_EQ(lines.size(), 3u);
  EXPECT_EQ(lines[0].substr(0, 38), "host,time,report,name,dynGrow,lowerLim");
  EXPECT_EQ(lines[1], "");
  EXPECT_EQ(lines[2].substr(0, 36), "host,time,report,uuid,alloc2MBlocks,");
}

// All moments of a report come before the next report, below one header.
TEST_F(ExportTest, WritesCsvReportByReport) {
  const std::vector<Row> rows =
      Cells(Output({"export", "comp-stats,pshare-stats", kIncident + "@..", kExample}));
  ASSERT_EQ(rows.size(), 15u);
  EXPECT_EQ(rows[0][3], "total");
  for (size_t i = 1; i <= 6; ++i) EXPECT_EQ(rows[i][2], "comp-stats");
  EXPECT_EQ(rows[7], Row{""});
  EXPECT_EQ(rows[8][3], "cow");
  for (size_t i = 9; i <= 14; ++i) EXPECT_EQ(rows[i][2], "pshare-stats");
  EXPECT_EQ(rows[13][1], "2026-11-21T10:06:00Z");
  EXPECT_EQ(rows[14][1], "2026-11-21T10:00:00Z");
}

// Groups that contain each other end the walk; the next report begins anew.
TEST_F(ExportTest, TellsOfGroupsThatContainEachOther) {
  const std::string host = ExampleWith(
      "circle.ksi",
      {{R"("keys":[1000],"instances":[1001,1002])", R"("keys":[1000],"instances":[1001,1002,0])"}});
  const harness::Result result = Run({"export", "group-stats,comp-stats", host});
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.err.find("ksicache: " + host +
                            ": group-stats: groups contain each other, rows "
                            "are missing: 0xbad"),
            std::string::npos)
      << result.err;
  EXPECT_EQ(Lines(result.out).back().substr(0, 55),
            "hypervisor.example.org,2026-11-21T10:00:00Z,comp-stats,");
}

// This host, as tally shows it.
TEST_F(ExportTest, TakesThisHostWithoutAFile) {
  const std::vector<Row> rows = Cells(Output({"export", "comp-stats", "-u", "mb"}));
  ASSERT_EQ(rows.size(), 2u);
  std::array<char, 256> name = {};
  ASSERT_EQ(gethostname(name.data(), name.size() - 1), 0);
  EXPECT_EQ(rows[1][0], name.data());
  EXPECT_EQ(rows[1][1].size(), sizeof "2026-11-21T10:00:00Z" - 1);
  const std::vector<Row> tallys = Cells(RunTally({"-r", "comp-stats", "-q", "-u", "mb"}).out);
  EXPECT_EQ(rows[1][2], tallys[1][0]);
}

TEST_F(ExportTest, MakesAFile) {
  const std::string out = Path("out.csv");
  EXPECT_EQ(Output({"export", "pshareHint-stats", "-o", out, kExample}), "");
  EXPECT_EQ(FileContent(out), kHints);
  ExpectFailure({"export", "pshareHint-stats", "-o", out, kExample},
                out + ": exists already (--force replaces it)");
  EXPECT_EQ(Output({"export", "pshareHint-stats", "-o", out, "--force", "--mode=0644",
                    "--format=json", kExample})
                .size(),
            0u);
  EXPECT_EQ(Lines(FileContent(out)).size(), 3u);
  EXPECT_EQ(Output({"export", "pshareHint-stats", "-o", "-", kExample}), kHints);
  // Of nothing at all there is no file.
  EXPECT_EQ(Run({"export", "pshareHint-stats", "-o", Path("none.csv"), Path("none")}).status, 1);
  // Nothing is left behind beside it.
  EXPECT_EQ(directory_.Names(), std::vector<std::string>{"out.csv"});
}

// The file is there as soon as there was a moment, whatever of it is missing, and replaces what
// stood there only then, in whatever format.
TEST_F(ExportTest, ReplacesAFileByWhatCouldBeRead) {
  WriteContent(Path("text"), "no cache file");
  WriteContent(Path("less.json"), JsonWith(""));
  Output({"load", Path("less.json"), Path("less.ksi")});
  for (const std::string format : {"csv", "json", "sqlite", "openmetrics", "prometheus"}) {
    SCOPED_TRACE(format);
    WriteContent(Path("out"), "old");
    const auto run = [&](const std::vector<std::string>& files) {
      std::vector<std::string> args = {
          "export", "comp-stats,vm-stats", "--format", format, "--force", "-o", Path("out")};
      args.insert(args.end(), files.begin(), files.end());
      EXPECT_EQ(Run(args).status, 1);
      return FileContent(Path("out"));
    };
    EXPECT_EQ(run({Path("text"), Path("none")}), "old");
    EXPECT_NE(run({Path("text"), Path("less.ksi")}), "old");
    const std::string part = run({Path("text"), kExample});
    Output({"export", "comp-stats,vm-stats", "--format", format, "--force", "-o", Path("out"),
            kExample});
    EXPECT_EQ(FileContent(Path("out")), part);
  }
}

#ifndef TALLY_SANITIZED
// A file is written as it is made, also where there are no unnamed ones beside it.
TEST_F(ExportTest, WritesAFilePieceByPiece) {
  const std::vector<std::string> args = {"export", "all", "--format=json", kIncident + "@.."};
  const std::string rows = Output(args);
  ASSERT_GT(rows.size(), 300'000u);
  for (const std::string refused : {"", "openat", "linkat"}) {
    SCOPED_TRACE(refused);
    harness::Program program = Command(args);
    program.args.insert(program.args.end(), {"-o", Path("out.json")});
    program.environment.emplace_back("LD_PRELOAD=" KSICACHE_WITHOUT_UNNAMED_FILES);
    program.environment.push_back("REFUSED=" + refused);
    const harness::Result made = harness::RunProgram(program);
    EXPECT_EQ(made.status, 0) << made.err;
    EXPECT_EQ(FileContent(Path("out.json")), rows);
    EXPECT_EQ(directory_.Names(), std::vector<std::string>{"out.json"});
    unlink(Path("out.json").c_str());
  }
}
#endif

// No file is lost because it was taken for the output, by whatever name.
TEST_F(ExportTest, ReplacesNoneOfItsInputs) {
  const std::string file = RecordingAt("own.rec", {"2026-11-21T10:00:00Z", "2026-11-21T10:01:00Z"});
  const std::string content = FileContent(file);
  ASSERT_EQ(link(file.c_str(), Path("other.rec").c_str()), 0);
  WriteContent(Path("own.json"), JsonWith(""));
  const std::string text = FileContent(Path("own.json"));
  const auto refuse = [&](const std::vector<std::string>& args, const std::string& out) {
    ExpectFailure(args, out + ": is read, too, and not replaced");
  };
  refuse({"export", "pshare-stats", "--force", "-o", file, kExample, file}, file);
  refuse({"export", "pshare-stats", "--force", "-o", Path("other.rec"), file + "@.."},
         Path("other.rec"));
  refuse({"export", "pshare-stats", "--format=sqlite", "--force", "-o", file, file + "@last"},
         file);
  refuse({"extract", "--force", file + "@first", file}, file);
  refuse({"join", "--force", file, kExample, Path("other.rec")}, file);
  refuse({"load", "--force", Path("own.json"), Path("own.json")}, Path("own.json"));
  EXPECT_EQ(FileContent(file), content);
  EXPECT_EQ(FileContent(Path("own.json")), text);
}

TEST_F(ExportTest, RefusesWhatItDoesNotUnderstand) {
  ExpectFailure({"export"},
                "not as in:\nUsage: ksicache export REPORT[,REPORT...]|all "
                "[FILE[@WHEN|@FROM..TO]...]\n                       [--format FORMAT] "
                "[--unit UNIT] [--columns NAMES]\n                       [--group GID] "
                "[--levels N] [--include FLAGS]\n                       [--exclude FLAGS] "
                "[--every TIME] [--files-from LIST]\n                       [--output OUT] "
                "[--append] [--force] [--mode MODE]\n                       [--cluster NAME]",
                2);
  ExpectFailure({"export", "vm-stats,vm-stats"}, "vm-stats is named twice", 2);
  const harness::Result report = Run({"export", "vm-stats,", kExample});
  EXPECT_EQ(report.status, 2);
  EXPECT_EQ(report.err,
            "ksicache: there is no report \n"
            "There are group-stats, vm-stats, uw-stats, pshare-stats, pshareHint-stats,\n"
            "swap-stats, buddy-stats, comp-stats, lpool-stats, heap-stats, guest-stats,\n"
            "zip-stats, lpage-stats, asyncremap-stats, pmem-stats, all, moments\n");
  const harness::Result format = Run({"export", "all", "--format=xml"});
  EXPECT_EQ(format.status, 2);
  EXPECT_EQ(format.err,
            "ksicache: there is no format xml\n"
            "There are csv, json, sqlite, openmetrics, prometheus, clickhouse-schema\n");
  ExpectFailure({"export", "vm-stats,heap-stats", "-s", "used:free", kExample},
                "no report that is exported has a column free", 2);
  ExpectFailure({"export", "all", "-s", "::", kExample}, "--columns takes NAME[:NAME...]", 2);
  ExpectFailure({"export", "all", "--every", "5m", kIncident + "@last"},
                "--every is for FILE@FROM..TO", 2);
  ExpectFailure({"export", "all", "--every", "5", "x@..", "--every=often"},
                "--every takes a time such as 5s, 10m, 6h or 7d: often", 2);
  ExpectFailure({"export", "all", "--append", "-o", Path("out.csv")},
                "--append is for the format sqlite", 2);
  ExpectFailure({"export", "all", "--append", "--format=sqlite"},
                "--append takes a file: --output OUT", 2);
  ExpectFailure({"export", "all", "--append", "--format=sqlite", "-o", "-"},
                "--append takes a file: --output OUT", 2);
  ExpectFailure({"export", "all", "--append", "--format=sqlite", "-o", Path("a"), "--force"},
                "--append replaces nothing, and takes no --force", 2);
  ExpectFailure({"export", "all", "-u", "gb"}, "--unit is mb, kb, pg or b", 2);
  ExpectFailure({"export", "all", "--force"}, "--force is for a file, not standard output", 2);
  ExpectFailure({"export", "all", "-o", "-", "--mode=0644"},
                "--mode is for a file, not standard output", 2);
  ExpectFailure({"export", "all", "-o"}, "unknown or incomplete option -o", 2);
  ExpectFailure({"info", kExample, "-u", "kb"}, "info does not take --unit", 2);
}

TEST_F(ExportTest, TellsOfOutputThatIsLost) {
  harness::Program program = Command({"export", "all", kExample});
  program.outPath = "/dev/full";
  const harness::Result full = harness::RunProgram(program);
  EXPECT_EQ(full.status, 1);
  EXPECT_EQ(full.err, "ksicache: standard output: No space left on device\n");
  program.outPath.clear();
  program.outPipeWithoutReader = true;
  program.ignoreSigpipe = true;
  const harness::Result closed = harness::RunProgram(program);
  EXPECT_EQ(closed.status, 1);
  EXPECT_EQ(closed.err, "ksicache: standard output: Broken pipe\n");
}

}  // namespace
}  // namespace ksi
