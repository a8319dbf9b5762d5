// What two moments differ in, and who explains it.
#include <nlohmann/json.hpp>

#include <cstdint>
#include <cstdlib>
#include <random>
#include <regex>
#include <string>
#include <utility>
#include <vector>

#include "tests/ksicache/export_fixture.h"

namespace ksi {
namespace {

using nlohmann::json;

class Diff : public ExportTest {
 protected:
  static inline const std::string kBefore = kIncident + "@10:02Z";
  static inline const std::string kAfter = kIncident + "@10:05Z";

  static json Json(std::vector<std::string> args) {
    args.insert(args.begin(), "diff");
    args.emplace_back("--json");
    const std::string out = Output(args);
    const json value = json::parse(out, nullptr, false);
    EXPECT_FALSE(value.is_discarded()) << out;
    return value;
  }

  // The example host, later and with changes.
  std::string Later(const std::string& name,
                    std::vector<std::pair<std::string, std::string>> changes) const {
    changes.emplace_back("2026-11-21T10:00:00Z", "2026-11-21T10:10:00Z");
    return ExampleWith(name, changes);
  }

  // Each of the figures that are compared is up to twice what it was, or a tenth, or not known;
  // names of heaps and user worlds may be others.
  static std::string WithOtherFigures(const std::string& text, std::mt19937& random) {
    static const std::regex kFigure(
        R"re("(mapped|sharedSaved|ovhd|consumed|size|free|total)":([0-9]+))re");
    std::string changed;
    auto from = text.begin();
    for (std::sregex_iterator match(text.begin(), text.end(), kFigure), end; match != end;
         ++match) {
      const uint64_t figure = std::stoull((*match)[2]);
      const bool isUnknown = random() % 30 == 0 && (*match)[1] != "free" && (*match)[1] != "total";
      const uint64_t now = isUnknown ? UINT64_MAX : figure * (1 + random() % 20) / 10;
      const bool isKept = random() % 2 == 0 || (*match)[1] == "size";
      changed.append(from, text.begin() + match->position());
      changed += "\"" + (*match)[1].str() + "\":" + std::to_string(isKept ? figure : now);
      from = text.begin() + match->position() + match->length();
    }
    changed.append(from, text.end());
    return changed;
  }

  static json RowCalled(const json& rows, const std::string& column, const std::string& name) {
    for (const json& row : rows) {
      if (row["row"][column] == name) return row;
    }
    return {};
  }

  static json PartCalled(const json& diff, const std::string& name) {
    for (const json& part : diff["parts"]) {
      if (part["what"] == name) return part;
    }
    return {};
  }
};

TEST_F(Diff, OneScreen) {
  EXPECT_EQ(Output({"diff", kBefore, kAfter}),
            R"(hypervisor.example.org, 2026-11-21T10:02:00Z to 2026-11-21T10:05:00Z: 3m 0s

KB                                       before        after       growth   part
total                                 268435456    268435456            0
free                                  138092636       921600   -137171036
in use                                130342820    267513856    137171036   100%
  kernel                                3145728      3145728            0     0%
  caches                                5242880      5242880            0     0%
  others                              117170084    254341120    137171036   100%

who explains it                          before        after       growth   part
12 machines                           113908928    103003736    -10905192    -8%
  build-linux                          14696852      6769616     -7927236    -6%
  mail                                  6845104      3867148     -2977956    -2%
12 overheads of machines                1731300      1731300            0     0%
8 user worlds                           1208592    149284820    148076228   108%
  storage-daemon                         194152    148270380    148076228   108%
14 heaps                                 589824       589824            0     0%
nobody                                                                  0     0%
in use                                                          137171036   100%

groups, which contain the above          before        after       growth   part
  services                              1223884    149300112    148076228   108%
  machines                            115640228    104735036    -10905192    -8%
)");
}

TEST_F(Diff, TheLaterMomentMayComeFirst) {
  const std::string out = Output({"diff", kAfter, kBefore, "-u", "mb", "--top", "1"});
  EXPECT_TRUE(
      out.starts_with("hypervisor.example.org, 2026-11-21T10:05:00Z to "
                      "2026-11-21T10:02:00Z: -3m 0s, the later one first\n"))
      << out;
  EXPECT_NE(out.find("  storage-daemon                         144795          189      -144606"
                     "   108%\n"),
            std::string::npos)
      << out;
}

TEST_F(Diff, Report) {
  EXPECT_EQ(Output({"diff", kBefore, kAfter, "-r", "vm-stats"}),
            R"(hypervisor.example.org, 2026-11-21T10:02:00Z to 2026-11-21T10:05:00Z: 3m 0s
vm-stats, KB, by consumed

                               before           after         growth
build-linux, schedGrp 1060
  consumed                   14696852         6769616       -7927236
  swapped                     1509948         9437184        7927236
  mapped                     16106132         8178896       -7927236
mail, schedGrp 1050
  consumed                    6845104         3867148       -2977956
  ballooned                   2264924         5242880        2977956
  mapped                      7549744         4571788       -2977956

2 rows changed, 0 of them new and 0 gone; 10 did not
)");
  EXPECT_EQ(Output({"diff", kBefore, kAfter, "-r", "VM-stats", "--by", "BALLOONED", "-u", "mb",
                    "--top", "1"}),
            R"(hypervisor.example.org, 2026-11-21T10:02:00Z to 2026-11-21T10:05:00Z: 3m 0s
vm-stats, MB, by ballooned

                               before           after         growth
mail, schedGrp 1050
  consumed                       6684            3776          -2908
  ballooned                      2211            5120           2909
  mapped                         7372            4464          -2908

2 rows changed, 0 of them new and 0 gone; 10 did not; 1 not shown
)");
}

TEST_F(Diff, ReportWithoutNames) {
  EXPECT_EQ(Output({"diff", kBefore, kAfter, "-r", "comp-stats", "-u", "mb"}),
            R"(hypervisor.example.org, 2026-11-21T10:02:00Z to 2026-11-21T10:05:00Z: 3m 0s
comp-stats, MB, by otherConsumed

                               before           after         growth    a second
host
  otherConsumed                114423          248380         133957
  free                         134856             900        -133956
  numClear                         13              14              1       0.006
  numSoft                           5               6              1       0.006
  numHard                           1               2              1       0.006
  memState                       High            Hard              -

1 row changed, 0 of them new and 0 gone; 0 did not
)");
}

TEST_F(Diff, ReportForPrograms) {
  EXPECT_EQ(Output({"diff", kBefore, kAfter, "-r", "swap-stats", "--json"}),
            R"({"before":{"host":"hypervisor.example.org","time":"2026-11-21T10:02:00Z"},)"
            R"("after":{"host":"hypervisor.example.org","time":"2026-11-21T10:05:00Z"},)"
            R"("seconds":180,"rebooted":false,"report":"swap-stats","unit":"KB","by":"swapped",)"
            R"("unchanged":11,"unknown":0,"changed":1,"rows":[)"
            "\n"
            R"({"row":{"name":"build-linux","schedGrp":1060},"state":"changed","columns":)"
            R"({"swapped":{"before":1509948,"after":9437184,"growth":7927236}}})"
            "\n]}\n");
}

// What was counted for ever has a rate; a count that fell began again.
TEST_F(Diff, Counters) {
  const std::string later =
      Later("later.ksi", {{R"("numSuccAllocs":160042,"numFailAllocs":0)",
                           R"("numSuccAllocs":160642,"numFailAllocs":3)"},
                          {R"("numSuccAllocs":1920504)", R"("numSuccAllocs":5)"}});
  const json diff = Json({kExample, later, "-r", "heap-stats"});
  ASSERT_EQ(diff["rows"].size(), 3U) << diff;
  const json grown = diff["rows"][0]["columns"];
  EXPECT_EQ(grown["numSuccAllocs"]["growth"], 600);
  EXPECT_EQ(grown["numSuccAllocs"]["perSecond"], 1.0);
  EXPECT_EQ(grown["numSuccAllocs"]["restarted"], false);
  EXPECT_EQ(grown["numFailAllocs"]["perSecond"], 0.005);
  const json restarted = diff["rows"][2]["columns"]["numSuccAllocs"];
  EXPECT_EQ(restarted["after"], 5);
  EXPECT_EQ(restarted["growth"], nullptr);
  EXPECT_EQ(restarted["perSecond"], nullptr);
  EXPECT_EQ(restarted["restarted"], true);
  EXPECT_NE(Output({"diff", kExample, later, "-r", "heap-stats"})
                .find("  numSuccAllocs               1920504               5      restarted\n"),
            std::string::npos);
}

// A number that another thing has now is no jump.
TEST_F(Diff, ANumberTakenAgain) {
  const std::string later =
      Later("later.ksi", {{R"("text":"storage-daemon")", R"("text":"another")"}});
  const json diff = Json({kExample, later, "-r", "uw-stats"});
  const json gone = RowCalled(diff["rows"], "name", "storage-daemon");
  const json came = RowCalled(diff["rows"], "name", "another");
  EXPECT_EQ(gone["state"], "gone");
  EXPECT_EQ(gone["columns"]["mapped"],
            json::parse(R"({"before":196608,"after":null,"growth":-196608})"));
  EXPECT_EQ(came["state"], "new");
  EXPECT_EQ(came["row"]["schedGrp"], 307);
  EXPECT_EQ(came["columns"]["mapped"],
            json::parse(R"({"before":null,"after":196608,"growth":196608})"));

  const std::string screen = Output({"diff", kExample, later, "-u", "mb"});
  EXPECT_NE(screen.find("8 user worlds                              1180         1180            0"
                        "      -\n"
                        "  another                                   new          189          189"
                        "      -\n"
                        "  storage-daemon                            189         gone         -189"
                        "      -\n"),
            std::string::npos)
      << screen;
}

// Whose figure is not known at one of the moments is told, and in no sum.
TEST_F(Diff, WithoutAFigure) {
  const std::string later =
      Later("later.ksi", {{R"("mapped":196608)", R"("mapped":18446744073709551615)"}});
  const json worlds = PartCalled(Json({kExample, later}), "user worlds");
  EXPECT_EQ(worlds["withoutFigure"], 1);
  EXPECT_EQ(worlds["count"], 8);
  EXPECT_EQ(worlds["before"], 1208592 - 194152);
  EXPECT_EQ(worlds["growth"], 0);
  EXPECT_NE(Output({"diff", kExample, later}).find("  1 more without a figure, not added\n"),
            std::string::npos);
}

// Of what a report cannot tell nothing is known; the rest is shown.
TEST_F(Diff, AReportThatFails) {
  std::string text = FileContent(TALLY_EXAMPLE_JSON);
  const size_t begin = text.find(R"({"node":"memory/comprehensive")");
  text.replace(begin, text.find("}}", begin) + 2 - begin,
               R"({"node":"memory/comprehensive","keys":[],"status":"0xbad005a"})");
  WriteContent(Path("later.json"), text);
  Output({"load", Path("later.json"), Path("later.ksi")});
  const harness::Result result = Run({"diff", kExample, Path("later.ksi"), "--fail-above", "1"});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err,
            "ksicache: " + Path("later.ksi") + ": comp-stats: 0xbad005a Permission denied\n");
  EXPECT_NE(result.out.find("free                                  138092636            -"
                            "            -\n"),
            std::string::npos)
      << result.out;
  EXPECT_NE(result.out.find("nobody                                                   "
                            "               -      -\n"),
            std::string::npos)
      << result.out;
  EXPECT_NE(result.out.find("12 machines                           113908928    113908928"),
            std::string::npos);
}

// One file is enough.
TEST_F(Diff, OneFile) {
  const auto times = [](const std::string& name) {
    const json diff = Json({name});
    return diff["before"]["time"].get<std::string>() + " " +
           diff["after"]["time"].get<std::string>();
  };
  EXPECT_EQ(times(kIncident), "2026-11-21T10:02:00Z 2026-11-21T10:06:00Z");
  EXPECT_EQ(times(kIncident + "@10:04Z"), "2026-11-21T10:04:00Z 2026-11-21T10:06:00Z");
  EXPECT_EQ(times(kIncident + "@10:03Z..10:05Z"), "2026-11-21T10:03:00Z 2026-11-21T10:05:00Z");
  EXPECT_EQ(times(kIncident + "@.."), "2026-11-21T10:02:00Z 2026-11-21T10:06:00Z");
}

TEST_F(Diff, OtherHosts) {
  const std::string other = ExampleWith("a17.ksi", {{"hypervisor.example.org", "a17"}});
  ExpectFailure({"diff", kExample, other},
                "they are of two hosts, hypervisor.example.org and a17: --across-hosts compares "
                "them");
  EXPECT_EQ(Output({"diff", kExample, other, "-r", "vm-stats", "--across-hosts"}),
            R"(hypervisor.example.org, 2026-11-21T10:00:00Z to a17, 2026-11-21T10:00:00Z: 0s
Another boot or host: groups and processes are matched by their names.
vm-stats, KB

                               before           after         growth

0 rows changed, 0 of them new and 0 gone; 12 did not
)");
}

// Figures have a space between them however long they are.
TEST_F(Diff, LongFigures) {
  const std::string later = Later("later.ksi", {{R"("free":138092636)", R"("free":138092632)"}});
  const std::string out = Output({"diff", kExample, later, "-u", "b"});
  EXPECT_NE(out.find("\nfree                             141406859264  141406855168         -4096"),
            std::string::npos)
      << out;
  // Nothing stands below a title.
  EXPECT_EQ(out.find("groups, which"), std::string::npos) << out;
}

// A capture alone is compared with what the library reads by itself.
TEST_F(Diff, WithThisHost) {
  const harness::Result refused = Run({"diff", kExample});
  EXPECT_EQ(refused.status, 1);
  EXPECT_TRUE(refused.err.starts_with("ksicache: they are of two hosts, hypervisor.example.org"))
      << refused.err;
  const harness::Result result = Run({"diff", kExample, "-r", "comp-stats", "--across-hosts"});
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_NE(result.out.find("1 row changed"), std::string::npos) << result.out;
}

// Names that differ in their middle alone are told apart; of one name the numbers do it.
TEST_F(Diff, LongNamesThatLookAlike) {
  const std::vector<std::pair<std::string, std::string>> names = {
      {R"("text":"db-orders")", R"("text":"db-ledger-replica-third-of-the-data-center")"},
      {R"("text":"db-ledger-replica-of-the-second-site")",
       R"("text":"db-ledger-replica-second-of-the-data-center")"}};
  const std::string before = ExampleWith("before.ksi", names);
  std::vector<std::pair<std::string, std::string>> changes = names;
  changes.emplace_back(R"("mapped":32547796)", R"("mapped":32548796)");
  const std::string out = Output({"diff", before, Later("later.ksi", changes)});
  EXPECT_NE(out.find(R"(
  db-ledger-replica-third-of-the-data-center 1000
                                       30668752     30669752         1000      -
  db-ledger-replica-second-of-the-data-center 1010
                                       24377296     24378296         1000      -
)"),
            std::string::npos)
      << out;
}

TEST_F(Diff, FailAbove) {
  const auto status = [](std::vector<std::string> args) {
    args.insert(args.begin(), "diff");
    return Run(args).status;
  };
  // 148076228 KB.
  EXPECT_EQ(status({kBefore, kAfter, "--fail-above", "141G"}), 3);
  EXPECT_EQ(status({kBefore, kAfter, "--fail-above", "142G"}), 0);
  EXPECT_EQ(status({kBefore, kAfter, "--fail-above", "151630057472"}), 0);
  EXPECT_EQ(status({kBefore, kAfter, "--fail-above", "151630057471"}), 3);
  EXPECT_EQ(status({kBefore, kAfter, "-r", "swap-stats", "--fail-above", "7g"}), 3);
  EXPECT_EQ(status({kBefore, kAfter, "-r", "swap-stats", "--fail-above", "8g", "-u", "mb"}), 0);
  EXPECT_EQ(status({kBefore, kAfter, "-r", "vm-stats", "--by", "ballooned", "--fail-above", "3g"}),
            0);
  ExpectFailure(
      {"diff", kBefore, kAfter, "-r", "lpage-stats", "--by", "nrBackings", "--fail-above", "1"},
      "--fail-above takes memory, and nrBackings is none: --by names another column", 2);
}

// What a row has taken is looked at, whatever else of it changed more.
TEST_F(Diff, FailAboveLooksAtWhatIsConsumed) {
  const std::string afternoon = TALLY_EXAMPLES "/afternoon.rec";
  const harness::Result result =
      Run({"diff", afternoon, "-r", "vm-stats", "--fail-above", "500m", "--top", "1"});
  EXPECT_EQ(result.status, 3);
  EXPECT_NE(result.out.find("vm-stats, KB, by consumed\n"), std::string::npos) << result.out;
  EXPECT_EQ(Run({"diff", afternoon, "-r", "vm-stats", "--fail-above", "2g"}).status, 0);
  ExpectFailure({"diff", kBefore, kAfter, "-r", "comp-stats", "--fail-above", "1g"},
                "--fail-above takes memory: --by names the column of comp-stats", 2);
}

// What was started anew has not grown by all it has.
TEST_F(Diff, FailAboveAfterARestart) {
  const std::string restarted =
      Later("restarted.ksi",
            {{"[307]", "[309]"}, {",307]", ",309]"}, {R"("mapped":196608)", R"("mapped":198656)"}});
  for (const std::vector<std::string>& more : {{}, std::vector<std::string>{"-r", "uw-stats"}}) {
    std::vector<std::string> args = {"diff", kExample, restarted, "--json"};
    args.insert(args.end(), more.begin(), more.end());
    args.insert(args.end(), {"--fail-above", "2m"});
    const harness::Result result = Run(args);
    EXPECT_EQ(result.status, 0);
    EXPECT_NE(result.out.find(R"("state":"new")"), std::string::npos) << result.out;
    EXPECT_NE(result.out.find(R"("state":"gone")"), std::string::npos);
    args.back() = "2097151";
    EXPECT_EQ(Run(args).status, 3);
  }
  // Another one beside it has grown by all it has.
  const std::string another =
      Later("another.ksi", {{R"("text":"storage-daemon")", R"("text":"another")"}});
  EXPECT_EQ(Run({"diff", kExample, another, "--fail-above", "100m"}).status, 3);
  EXPECT_EQ(Run({"diff", kExample, another, "-r", "uw-stats", "--fail-above", "100m"}).status, 3);
}

// It is not said that nothing grew where that cannot be told.
TEST_F(Diff, FailAboveWithoutAnAnswer) {
  ExpectFailure({"diff", kAfter, kBefore, "--fail-above", "11G"},
                "--fail-above takes the earlier moment first");
  const std::string later =
      Later("later.ksi", {{R"("free":138092636)", R"("free":18446744073709551615)"}});
  const harness::Result result = Run({"diff", kExample, later, "--fail-above", "1g"});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: " + later + ": by how much the host grew is not known\n");
}

// One machine that cannot be read takes nothing with it, and what grew too much is told.
TEST_F(Diff, OneMachineThatCannotBeRead) {
  std::string text = FileContent(TALLY_EXAMPLE_JSON);
  const std::string node = R"({"node":"sched/groups/stats/memoryStats","keys":[1040],)";
  const size_t begin = text.find(node) + node.size();
  ASSERT_GT(begin, node.size());
  text.replace(begin, text.find("}}", begin) + 2 - begin, R"("status":"0xbad0002"})");
  const size_t mapped = text.find(R"("mapped":196608)");
  ASSERT_NE(mapped, std::string::npos);
  text.replace(mapped, 15, R"("mapped":999999)");
  WriteContent(Path("later.json"), text);
  Output({"load", Path("later.json"), Path("later.ksi")});
  const harness::Result result =
      Run({"diff", kExample, Path("later.ksi"), "--json", "--fail-above", "500m"});
  EXPECT_EQ(result.status, 3);
  const json diff = json::parse(result.out);
  const json machines = PartCalled(diff, "machines");
  EXPECT_EQ(machines["count"], 11);
  EXPECT_EQ(machines["withoutFigure"], 1);
  EXPECT_EQ(machines["growth"], 0);
  const json worlds = PartCalled(diff, "user worlds");
  EXPECT_EQ(worlds["rows"].size(), 1U) << worlds;
  EXPECT_EQ(worlds["growth"], 999999 - 196608);

  const harness::Result rows =
      Run({"diff", kExample, Path("later.ksi"), "-r", "vm-stats", "--json"});
  EXPECT_EQ(rows.status, 1);
  EXPECT_EQ(json::parse(rows.out)["unchanged"], 11);
  EXPECT_EQ(json::parse(rows.out)["unknown"], 1);
  EXPECT_EQ(json::parse(rows.out)["changed"], 0);
}

// Whatever becomes of a host, what is printed adds up, in any unit: the rows to their part, and the
// parts and nobody to what is in use.
TEST_F(Diff, AddsUp) {
  std::mt19937 random(14);
  const std::string text = FileContent(TALLY_EXAMPLE_JSON);
  for (int i = 0; i < 20; ++i) {
    SCOPED_TRACE(i);
    WriteContent(Path("later.json"), WithOtherFigures(text, random));
    Output({"load", "--force", Path("later.json"), Path("later.ksi")});
    for (const char* unit : {"kb", "mb", "b"}) {
      const json diff = Json({kExample, Path("later.ksi"), "-u", unit, "--top", "1000"});
      const auto growthOf = [](const json& of) { return of["growth"].get<int64_t>(); };
      int64_t all = diff["nobody"].get<int64_t>();
      for (const json& part : diff["parts"]) {
        if (!part["added"].get<bool>()) continue;
        all += growthOf(part);
        int64_t rows = 0;
        for (const json& row : part["rows"]) {
          rows += growthOf(row);
          ASSERT_EQ(growthOf(row), row["after"].get<int64_t>() - row["before"].get<int64_t>());
        }
        // A row drops less than a unit at each moment.
        const int64_t most = unit == std::string("mb") ? part["count"].get<int64_t>() + 1 : 0;
        ASSERT_LE(std::abs(growthOf(part) - rows), most) << part;
      }
      ASSERT_EQ(all, growthOf(diff["host"]["used"]));
      ASSERT_EQ(growthOf(diff["host"]["used"]),
                growthOf(diff["host"]["total"]) - growthOf(diff["host"]["free"]));
    }
  }
}

TEST_F(Diff, Misused) {
  ExpectFailure({"diff", kExample, "--by", "free"}, "--by goes with --report", 2);
  ExpectFailure({"diff", kExample, "-r", "none"}, "there is no report none", 2);
  ExpectFailure({"diff", kBefore, kAfter, "-r", "vm-stats", "--by", "none"},
                "vm-stats has no column none that could grow", 2);
  ExpectFailure({"diff", kBefore, kAfter, "-r", "vm-stats", "--by", "name"},
                "vm-stats has no column name that could grow", 2);
  ExpectFailure({"diff", kExample, "-u", "gb"}, "--unit is mb, kb, pg or b", 2);
  ExpectFailure({"diff", kExample, "--top", "0"}, "--top takes a number from 1 on: 0", 2);
  ExpectFailure({"diff", kExample, kExample, "--fail-above", "much"},
                "--fail-above takes a size such as 500M or 2G: much", 2);
  ExpectFailure({"diff", kExample, kExample, "--since", "1h"}, "--since takes one FILE", 2);
  ExpectFailure({"diff", kIncident, "--since", "1h", "-r", "comp-stats"},
                "--since takes a column of comp-stats: --by names it", 2);
  ExpectFailure({"diff", kIncident, "--since", "1h", "-r", "vm-stats", "--by", "none"},
                "vm-stats has no column none that could grow", 2);
  ExpectFailure({"diff", kExample, "--since", "1h"}, kExample + ": --since takes a recording");
  ExpectFailure({"diff", Path("none.rec"), "--since", "1h"},
                Path("none.rec") + ": No such file or directory");
  ExpectFailure({"diff", kIncident, "--since", "1h"},
                kIncident + ": it has 5 moments in that time, and a trend takes 12");
  ExpectFailure({"diff", kIncident + "@09:00Z"},
                kIncident +
                    "@09:00Z: there is no moment so early: moments are of "
                    "2026-11-21T10:02:00Z to 2026-11-21T10:06:00Z");
}

}  // namespace
}  // namespace ksi
