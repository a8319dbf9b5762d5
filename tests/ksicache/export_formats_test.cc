// ksicache export as a SQLite database and as metrics.
#include <sys/resource.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "knvlibs/sqlite.h"
#include "reports/reports.h"
#include "tests/ksicache/export_fixture.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/metric_name.h"
#include "tools/ksicache/export/row_sink.h"
#include "tools/ksicache/export/text_output.h"

namespace ksi {
namespace {

class ExportFormats : public ExportTest {
 protected:
  // The first column of what a query gives.
  static std::vector<std::string> Query(const std::string& fileName, const std::string& sql) {
    const Database database = OpenAsOwner(fileName);
    Statement query;
    EXPECT_EQ(query.Prepare(database.get(), sql.c_str()), SQLITE_OK)
        << sqlite3_errmsg(database.get());
    std::vector<std::string> rows;
    while (query.Step() == SQLITE_ROW) rows.emplace_back(query.Text(0));
    return rows;
  }

  static bool IsThere(const std::string& program) {
    return std::system(("command -v " + program + " >/dev/null").c_str()) == 0;
  }

  // What a shell command says on both its outputs; its status is expected to be 0.
  static std::string Shell(const std::string& command) {
    harness::Program shell = Command({});
    shell.path = "/bin/sh";
    shell.args = {"sh", "-c", command};
    const harness::Result result = harness::RunProgram(shell);
    EXPECT_EQ(result.status, 0) << result.err;
    return result.out + result.err;
  }
};

TEST_F(ExportFormats, SqliteHasATableForEachReport) {
  const std::string file = Path("host.db");
  EXPECT_EQ(Output({"export", "all", "--format=sqlite", "-o", file, kExample}), "");
  std::set<std::string> tables = {"columns"};
  for (std::string report : kReports) tables.insert(report.replace(report.find('-'), 1, "_"));
  const std::vector<std::string> found =
      Query(file, "SELECT name FROM sqlite_master WHERE type = 'table'");
  EXPECT_EQ(std::set<std::string>(found.begin(), found.end()), tables);
  EXPECT_EQ(Query(file,
                  "SELECT quote(host) || quote(time) || quote(name) || quote(b) || "
                  "quote(consumed) || quote(max) FROM vm_stats ORDER BY consumed LIMIT 2"),
            (std::vector<std::string>{
                "'hypervisor.example.org''2026-11-21T10:00:00Z''gateway'01518336NULL",
                "'hypervisor.example.org''2026-11-21T10:00:00Z''desktop-anna'127934086291456"}));
  EXPECT_EQ(Query(file,
                  "SELECT report || '|' || quote(unit) || '|' || description || '|' || isKey "
                  "|| isCounter FROM columns WHERE name IN ('size', 'buddyOvhd', 'numHigh', "
                  "'schedGrp', 'avgZipTime') ORDER BY name, report LIMIT 5"),
            (std::vector<std::string>{"zip_stats|'us'|Average compression time in usec|00",
                                      "comp_stats|'KB'|Memmap buddy overhead|00",
                                      "comp_stats|NULL|Num times host in high state|01",
                                      "guest_stats|NULL|Scheduler group ID|10",
                                      "lpage_stats|NULL|Scheduler group ID|10"}));
  EXPECT_EQ(Query(file,
                  "SELECT name || '|' || description || '|' || isKey FROM columns "
                  "WHERE report = 'vm_stats' AND name IN ('host', 'time') ORDER BY name"),
            (std::vector<std::string>{"host|The host that the row is of|1",
                                      "time|When it was read, in UTC|1"}));
  EXPECT_EQ(Query(file, "PRAGMA integrity_check"), std::vector<std::string>{"ok"});
}

// Whoever sums a column sums what there is.
TEST_F(ExportFormats, SqliteHasTheFiguresOfCsv) {
  const std::string file = Path("host.db");
  size_t cells = 0;
  Output({"export", "all", "--format=sqlite", "-u", "mb", "-o", file, kExample});
  for (const std::string& report : kReports) {
    SCOPED_TRACE(report);
    const std::vector<Row> csv = Cells(Output({"export", report, "-u", "mb", kExample}));
    std::string table = report;
    table.replace(table.find('-'), 1, "_");
    for (size_t column = 0; column < csv[0].size(); ++column) {
      const std::vector<std::string> values =
          Query(file, "SELECT \"" + csv[0][column] + "\" FROM " + table + " ORDER BY rowid");
      ASSERT_EQ(values.size() + 1, csv.size());
      for (size_t row = 0; row < values.size(); ++row, ++cells) {
        std::string cell = csv[row + 1][column];
        if (cell == "\"\"") cell.clear();
        const bool isFlag = cell == "y" || cell == "n";
        EXPECT_EQ(isFlag ? std::string(cell == "y" ? "1" : "0") : cell, values[row]);
      }
    }
  }
  EXPECT_GT(cells, 5'000u);
}

TEST_F(ExportFormats, SqliteHoldsWhatHasNoIntegerAndNoText) {
  const std::string host = ExampleWith(
      "odd.ksi",
      {{R"("mapped":32547796)", R"("mapped":18446744073709551000)"},
       {R"({"text":"web-01"})", R"({"text":{"hex":"61ff)" + std::string(2 * 62, '0') + R"("}})"},
       {R"({"text":"mail"})", R"({"text":"a'\"\n;"})"}});
  const std::string file = Path("odd.db");
  Output({"export", "vm-stats", "--format=sqlite", "-o", file, host});
  EXPECT_EQ(Query(file,
                  "SELECT quote(name) || ' ' || typeof(mapped) || printf(' %.15g', mapped) "
                  "FROM vm_stats WHERE "
                  "schedGrp IN (1000, 1020, 1050)"),
            (std::vector<std::string>{"'db-orders' real 1.84467440737096e+19",
                                      "'a%ff' integer 6543112", "'a''\"\n;' integer 7549744"}));
  EXPECT_NE(Output({"export", "vm-stats", host}).find(",18446744073709551000,"), std::string::npos);
  EXPECT_NE(Output({"export", "vm-stats", "--format=json", host})
                .find(R"("mapped":18446744073709551000,)"),
            std::string::npos);
}

TEST_F(ExportFormats, SqliteTakesAFile) {
  ExpectFailure({"export", "all", "--format=sqlite", kExample}, "sqlite takes a file: --output OUT",
                2);
  harness::Program program = Command({"export", "all", "--format=sqlite", "-o", "-", kExample});
  const harness::Result result = harness::RunProgram(program);
  EXPECT_EQ(result.status, 0);
  EXPECT_EQ(result.out.substr(0, 15), "SQLite format 3");
  // What stood there stands there still where all is not well.
  WriteContent(Path("old.db"), "old");
  ExpectFailure({"export", "all", "--format=sqlite", "-o", Path("old.db"), kExample},
                Path("old.db") + ": exists already (--force replaces it)");
  EXPECT_EQ(FileContent(Path("old.db")), "old");
}

// Moments and hosts stand in the same tables.
TEST_F(ExportFormats, SqliteTakesManyFiles) {
  const std::string file = Path("many.db");
  WriteContent(Path("text"), "no cache file");
  const harness::Result result = Run({"export", "comp-stats", "--format=sqlite", "-o", file,
                                      kIncident + "@..", Path("text"), kExample});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: " + Path("text") + ": not a cache file\n");
  EXPECT_EQ(Query(file, "SELECT time || memState FROM comp_stats"),
            (std::vector<std::string>{"2026-11-21T10:02:00ZHigh", "2026-11-21T10:03:00ZHigh",
                                      "2026-11-21T10:04:00ZHigh", "2026-11-21T10:05:00ZHard",
                                      "2026-11-21T10:06:00ZHigh", "2026-11-21T10:00:00ZHigh"}));
}

// Rows of a host and a time are found without going through all.
TEST_F(ExportFormats, SqliteHasAnIndexOfIdentities) {
  const std::string file = Path("host.db");
  Output({"export", "vm-stats,comp-stats", "--format=sqlite", "-o", file, kExample});
  EXPECT_EQ(Query(file,
                  "SELECT sql FROM sqlite_schema WHERE type = 'index' AND sql IS NOT NULL "
                  "ORDER BY name"),
            (std::vector<std::string>{
                "CREATE INDEX comp_stats_identity ON comp_stats(host, time)",
                "CREATE INDEX vm_stats_identity ON vm_stats(host, time, \"name\", \"schedGrp\")"}));
}

// What is there already is not there twice, be it a part of a span or all of it.
TEST_F(ExportFormats, SqliteIsAddedTo) {
  const std::string file = Path("host.db");
  const auto add = [&](const std::string& reports, const std::string& name) {
    Output({"export", reports, "--format=sqlite", "--append", "-o", file, name});
  };
  // Made where there is none.
  add("vm-stats", kIncident + "@10:02Z..10:04Z");
  add("vm-stats", kIncident + "@10:03Z..10:05Z");
  add("comp-stats,vm-stats", kIncident + "@..");
  add("vm-stats,comp-stats", kExample);
  add("vm-stats,comp-stats", kExample);
  EXPECT_EQ(Query(file, "SELECT time || count(*) FROM vm_stats GROUP BY time"),
            (std::vector<std::string>{"2026-11-21T10:00:00Z12", "2026-11-21T10:02:00Z12",
                                      "2026-11-21T10:03:00Z12", "2026-11-21T10:04:00Z12",
                                      "2026-11-21T10:05:00Z12", "2026-11-21T10:06:00Z12"}));
  EXPECT_EQ(Query(file, "SELECT count(*) FROM comp_stats"), std::vector<std::string>{"6"});
  EXPECT_EQ(Query(file, "SELECT count(*) FROM sqlite_schema WHERE name LIKE '%identity'"),
            std::vector<std::string>{"2"});
  EXPECT_EQ(Query(file, "PRAGMA integrity_check"), std::vector<std::string>{"ok"});
  // As if all had been exported at once.
  Output({"export", "vm-stats,comp-stats", "--format=sqlite", "-o", Path("once.db"), kExample,
          kIncident + "@.."});
  for (const std::string table : {"vm_stats", "comp_stats", "columns"}) {
    const std::string rows = "SELECT count(*) FROM (SELECT * FROM " + table +
                             " EXCEPT SELECT * FROM other." + table + ")";
    const Database database = OpenAsOwner(file);
    Statement query;
    ASSERT_EQ(sqlite3_exec(database.get(), ("ATTACH '" + Path("once.db") + "' AS other").c_str(),
                           nullptr, nullptr, nullptr),
              SQLITE_OK);
    ASSERT_EQ(query.Prepare(database.get(), rows.c_str()), SQLITE_OK);
    ASSERT_EQ(query.Step(), SQLITE_ROW);
    EXPECT_EQ(query.Number(0), 0) << table;
  }
}

// Nothing is added to what is another database, or in other columns or units; all or nothing is.
TEST_F(ExportFormats, SqliteIsAddedToOnlyIfItIsTheSame) {
  const std::string file = Path("host.db");
  Output({"export", "vm-stats", "--format=sqlite", "-o", file, "-u", "mb", kIncident + "@10:02Z"});
  const std::string content = FileContent(file);
  const auto refuse = [&](const std::vector<std::string>& more, const std::string& message,
                          const std::string& to) {
    std::vector<std::string> args = {
        "export", "comp-stats,vm-stats", "--format=sqlite", "--append", "-o", to, kExample};
    args.insert(args.end(), more.begin(), more.end());
    ExpectFailure(args, to + ": " + message);
  };
  refuse({}, "vm_stats has other columns or units there", file);
  refuse({"-u", "mb", "-s", "consumed"}, "vm_stats has other columns or units there", file);
  EXPECT_EQ(FileContent(file), content);
  const std::string capture = FileContent(kExample);
  WriteContent(Path("copy.ksi"), capture);
  refuse({}, "is no database of exported rows", Path("copy.ksi"));
  EXPECT_EQ(FileContent(Path("copy.ksi")), capture);
  WriteContent(Path("text"), std::string(5000, 't'));
  refuse({}, "cannot write: file is not a database", Path("text"));
  refuse({}, "is not a regular file", "/dev/null");
  EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"copy.ksi", "host.db", "text"}));
  // Of nothing at all nothing is added, and a part with the status that says so.
  EXPECT_EQ(Run({"export", "vm-stats", "--format=sqlite", "--append", "-o", file, "-u", "mb",
                 Path("text")})
                .status,
            1);
  EXPECT_EQ(FileContent(file), content);
  EXPECT_EQ(Run({"export", "vm-stats", "--format=sqlite", "--append", "-o", file, "-u", "mb",
                 Path("text"), kIncident + "@10:03Z"})
                .status,
            1);
  EXPECT_EQ(Query(file, "SELECT count(*) FROM vm_stats"), std::vector<std::string>{"24"});
}

// What somebody put into the file is not run.
TEST_F(ExportFormats, SqliteIsAddedToWithoutItsTriggers) {
  const std::string file = Path("host.db");
  Output({"export", "comp-stats", "--format=sqlite", "-o", file, kIncident + "@10:02Z"});
  RunSql(file,
         "CREATE TABLE seen(n); CREATE TRIGGER spy AFTER INSERT ON comp_stats BEGIN "
         "INSERT INTO seen VALUES(1); END");
  Output({"export", "comp-stats", "--format=sqlite", "--append", "-o", file, kExample});
  EXPECT_EQ(Query(file, "SELECT count(*) FROM comp_stats"), std::vector<std::string>{"2"});
  EXPECT_EQ(Query(file, "SELECT count(*) FROM seen"), std::vector<std::string>{"0"});
}

// Rows of one identity and time are all there.
TEST_F(ExportFormats, SqliteKeepsTwins) {
  const std::string host = ExampleWith(
      "twins.ksi",
      {{R"("value":{"name":"acpi","dynGrow")", R"("value":{"name":"twin","dynGrow")"},
       {R"("value":{"name":"config","dynGrow")", R"("value":{"name":"twin","dynGrow")"}});
  const std::string file = Path("host.db");
  Output({"export", "heap-stats", "--format=sqlite", "-o", file, host, kExample});
  EXPECT_EQ(Query(file, "SELECT count(*) FROM heap_stats WHERE name = 'twin'"),
            std::vector<std::string>{"2"});
  EXPECT_EQ(Query(file, "SELECT count(*) FROM heap_stats"), std::vector<std::string>{"28"});
}

TEST_F(ExportFormats, WritesMetrics) {
  const auto counter = [](const std::string& head, const std::string& name,
                          const std::vector<std::string>& numbers) {
    const std::string start = name + "{host=\"hypervisor.example.org\",type=\"";
    return head + start + "regular\"} " + numbers[0] + "\n" + start + "lpage\"} " + numbers[1] +
           "\n" + start + "Total\"} " + numbers[2] + "\n";
  };
  const std::vector<std::string> added = {"15692881920", "4018667520", "19711549440"};
  const std::vector<std::string> removed = {"15373713408", "3964141568", "19337854976"};
  const std::vector<std::string> active = {"319168512", "54525952", "373694464"};
  EXPECT_EQ(Output({"export", "pshareHint-stats", "--format=openmetrics", kExample}),
            counter("# TYPE tally_pshare_hint_tot_add_bytes counter\n"
                    "# UNIT tally_pshare_hint_tot_add_bytes bytes\n"
                    "# HELP tally_pshare_hint_tot_add_bytes Total hints added\n",
                    "tally_pshare_hint_tot_add_bytes_total", added) +
                counter("# TYPE tally_pshare_hint_tot_remove_bytes counter\n"
                        "# UNIT tally_pshare_hint_tot_remove_bytes bytes\n"
                        "# HELP tally_pshare_hint_tot_remove_bytes Total hints removed\n",
                        "tally_pshare_hint_tot_remove_bytes_total", removed) +
                counter("# TYPE tally_pshare_hint_active_bytes gauge\n"
                        "# UNIT tally_pshare_hint_active_bytes bytes\n"
                        "# HELP tally_pshare_hint_active_bytes Currently active hints\n",
                        "tally_pshare_hint_active_bytes", active) +
                "# EOF\n");
  EXPECT_EQ(Output({"export", "pshareHint-stats", "--format=prometheus", kExample}),
            counter("# TYPE tally_pshare_hint_tot_add_bytes_total counter\n"
                    "# HELP tally_pshare_hint_tot_add_bytes_total Total hints added\n",
                    "tally_pshare_hint_tot_add_bytes_total", added) +
                counter("# TYPE tally_pshare_hint_tot_remove_bytes_total counter\n"
                        "# HELP tally_pshare_hint_tot_remove_bytes_total Total hints removed\n",
                        "tally_pshare_hint_tot_remove_bytes_total", removed) +
                counter("# TYPE tally_pshare_hint_active_bytes gauge\n"
                        "# HELP tally_pshare_hint_active_bytes Currently active hints\n",
                        "tally_pshare_hint_active_bytes", active));
}

// What is a state or words to OpenMetrics is a number to Prometheus; the samples are the same.
TEST_F(ExportFormats, MetricsTellStatesAndWords) {
  const std::string words = Output({"export", "comp-stats", "--format=openmetrics", kExample});
  const std::string host = "{host=\"hypervisor.example.org\",";
  const std::string samples = "tally_comp_mem_state" + host +
                              "tally_comp_mem_state=\"High\"} 1\n"
                              "tally_comp_mem_state" +
                              host + "tally_comp_mem_state=\"Clear\"} 0\n";
  const std::string info = "tally_comp_info" + host + "mem_state=\"High\"} 1\n";
  EXPECT_NE(words.find("# TYPE tally_comp_mem_state stateset\n"
                       "# HELP tally_comp_mem_state Current memory state\n" +
                       samples),
            std::string::npos)
      << words;
  EXPECT_NE(words.find("# TYPE tally_comp info\n"
                       "# HELP tally_comp mem_state: Current memory state\n" +
                       info + "# EOF\n"),
            std::string::npos);
  const std::string numbers = Output({"export", "comp-stats", "--format=prometheus", kExample});
  EXPECT_NE(numbers.find("# TYPE tally_comp_mem_state gauge\n"
                         "# HELP tally_comp_mem_state Current memory state\n" +
                         samples),
            std::string::npos);
  EXPECT_NE(numbers.find("# TYPE tally_comp_info gauge\n"
                         "# HELP tally_comp_info mem_state: Current memory state\n" +
                         info),
            std::string::npos);
}

// Bytes, seconds and ratios are explained as such.
TEST_F(ExportFormats, MetricsAreExplainedInTheirUnits) {
  const std::string metrics = Output({"export", "all", "--format=openmetrics", kExample});
  for (const char* line :
       {"# HELP tally_group_mps_bytes Memory per share\n",
        "# HELP tally_zip_avg_zip_time_seconds Average compression time\n",
        "# HELP tally_asyncremap_staged_bytes Number of pages ever staged, in bytes\n"}) {
    EXPECT_NE(metrics.find(line), std::string::npos) << line;
  }
}

TEST_F(ExportFormats, MetricsAreInBaseUnits) {
  const std::string metrics = Output({"export", "all", "--format=openmetrics", kExample});
  const std::string host = "{host=\"hypervisor.example.org\"";
  const std::string machine = host + ",name=\"build-linux\",sched_grp=\"1060\"";
  for (const std::string& line : {
           "tally_zip_avg_zip_time_seconds" + machine + "} 0.000031",
           "tally_zip_nr_free_half" + machine + "} 3495",
           "tally_vm_flag" + machine + ",flag=\"b\"} 1",
           "tally_vm_flag" + machine + ",flag=\"useReliableMem\"} 0",
           "tally_vm_info" + machine + ",par_sched_group=\"4\",world_grp=\"4120\"} 1",
           "tally_vm_min_bytes" + machine + "} 0",
           "tally_swap_swapout_ready_total" + machine + "} 0",
           "tally_comp_info" + host + ",mem_state=\"High\"} 1",
           "tally_comp_num_high_total" + host + "} 10",
           "tally_heap_pct_free_of_cur_ratio" + host + ",name=\"acpi\"} 0.32",
           "tally_guest_lpage_all" + host + ",name=\"db-orders\",sched_grp=\"1000\"} 6553",
       }) {
    EXPECT_NE(metrics.find("\n" + line + "\n"), std::string::npos) << line;
  }
  // A limit that is not set has no sample.
  EXPECT_EQ(metrics.find("tally_vm_max_bytes" + machine), std::string::npos);
  ExpectFailure({"export", "all", "--format=openmetrics", "-u", "kb"},
                "openmetrics is in bytes and seconds, and takes no --unit", 2);
}

TEST_F(ExportFormats, MetricNamesAreSnakeCase) {
  for (const auto& [name, snake] : std::vector<std::pair<std::string, std::string>>{
           {"memSizeLimit", "mem_size_limit"},
           {"COWSwapper", "cow_swapper"},
           {"vpmemRO", "vpmem_ro"},
           {"nodeID", "node_id"},
           {"nrSPageAllocs", "nr_spage_allocs"},
           {"iMin", "imin"},
           {"4KBfree", "4kb_free"},
           {"512MBused", "512mb_used"},
           {"alloc2MBlocks", "alloc_2m_blocks"},
           {"cow1", "cow1"},
           {"CurSwapper", "cur_swapper"},
           {"pshareHint", "pshare_hint"},
           {"a-b", "a_b"},
           {"", ""},
       }) {
    EXPECT_EQ(ksicache::SnakeCase(name), snake);
  }
}

TEST_F(ExportFormats, MetricsHoldHostileNames) {
  const std::string host = ExampleWith(
      "odd.ksi",
      {{R"({"text":"web-01"})", R"({"text":"a\"} 1\n#\\"})"},
       {R"({"text":"web-02"})", R"({"text":{"hex":"61ff)" + std::string(2 * 62, '0') + R"("}})"}});
  const std::string metrics = Output({"export", "vm-stats", "--format=openmetrics", host});
  const std::string start = "\ntally_vm_mem_size_bytes{host=\"hypervisor.example.org\",name=";
  EXPECT_NE(metrics.find(start + R"("a\"} 1\n#\\",sched_grp="1020"} 8589934592)" + "\n"),
            std::string::npos);
  EXPECT_NE(metrics.find(start + R"("a%ff",sched_grp="1030"} 8589934592)" + "\n"),
            std::string::npos);
}

// Metrics without times have one moment of a host: the later one, whole, wherever it stands.
TEST_F(ExportFormats, MetricsSayWhichMomentsTheyHaveNot) {
  const harness::Result result = Run({"export", "comp-stats", "--format=openmetrics",
                                      kIncident + "@10:06Z", kIncident + "@10:05Z", kExample});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.out,
            Output({"export", "comp-stats", "--format=openmetrics", kIncident + "@10:06Z"}));
  const std::string message =
      ": comp-stats: there is another moment of hypervisor.example.org: metrics have the later "
      "one\n";
  EXPECT_EQ(result.err,
            "ksicache: " + kIncident + "@10:05Z" + message + "ksicache: " + kExample + message);
}

// Two things of one name have numbers, and nothing is lost.
TEST_F(ExportFormats, MetricsTellThingsOfOneNameApart) {
  const std::string host = ExampleWith(
      "twins.ksi",
      {{R"("value":{"name":"acpi","dynGrow")", R"("value":{"name":"twin","dynGrow")"},
       {R"("value":{"name":"config","dynGrow")", R"("value":{"name":"twin","dynGrow")"}});
  const std::string metrics = Output({"export", "heap-stats", "--format=openmetrics", host});
  const std::string start = "\ntally_heap_size_bytes{host=\"hypervisor.example.org\",name=\"twin\"";
  EXPECT_NE(metrics.find(start + "} "), std::string::npos);
  EXPECT_NE(metrics.find(start + ",nth=\"2\"} "), std::string::npos);
  EXPECT_EQ(metrics.find(start + ",nth=\"3\"} "), std::string::npos);
}

TEST_F(ExportFormats, MetricsOfASpanHaveTheirTimes) {
  const std::string metrics =
      Output({"export", "comp-stats", "--format=openmetrics", kIncident + "@10:04Z..10:05Z"});
  const std::string start = "tally_comp_free_bytes{host=\"hypervisor.example.org\"} ";
  EXPECT_NE(metrics.find("\n" + start + "37455228928 1795255440\n" + start +
                         "943718400 1795255500\n# TYPE"),
            std::string::npos)
      << metrics;
  EXPECT_NE(Output({"export", "comp-stats", "--format=prometheus", kIncident + "@10:04Z..10:05Z"})
                .find("\n" + start + "37455228928 1795255440000\n"),
            std::string::npos);
  const harness::Result twice = Run({"export", "comp-stats", "--format=openmetrics",
                                     kIncident + "@10:04Z..10:05Z", kIncident + "@10:05Z..10:05Z"});
  EXPECT_EQ(twice.out, metrics);
  EXPECT_EQ(twice.status, 1);
  EXPECT_EQ(twice.err, "ksicache: " + kIncident +
                           "@10:05Z..10:05Z: comp-stats: there is another moment of "
                           "hypervisor.example.org at 2026-11-21T10:05:00Z: metrics have the later "
                           "one\n");
}

TEST_F(ExportFormats, TablesForClickHouse) {
  EXPECT_EQ(Output({"export", "moments", "--format=clickhouse-schema", "--cluster", "it's"}),
            R"(CREATE TABLE IF NOT EXISTS moments
(
  host String,
  time DateTime,
  `built` Nullable(String) COMMENT 'when the kernel\'s definitions were built'
)
ENGINE = MergeTree PARTITION BY toYYYYMM(time) ORDER BY (host, time);
CREATE TABLE IF NOT EXISTS moments_all AS moments
ENGINE = Distributed('it\'s', currentDatabase(), 'moments', sipHash64(host));
)");
  const std::string tables =
      Output({"export", "vm-stats,heap-stats", "--format=clickhouse-schema", "-u", "mb"});
  for (const char* line :
       {"\n  `b` Nullable(UInt8) COMMENT 'Is balloon driver active?',\n",
        "\n  `consumed` Nullable(UInt64) COMMENT 'Host physical memory consumed by guest, MB',\n",
        "\n  `dynGrow` Nullable(Int64) COMMENT 'dynamically growable',\n"}) {
    EXPECT_NE(tables.find(line), std::string::npos) << line << tables;
  }
  EXPECT_EQ(tables.find("_all"), std::string::npos);
  ExpectFailure({"export", "all", "--format=clickhouse-schema", kExample},
                "clickhouse-schema is the same for all files, and takes none", 2);
  ExpectFailure({"export", "all", "--cluster", "c", kExample},
                "--cluster is for the format clickhouse-schema", 2);
}

TEST_F(ExportFormats, MomentsSayOfWhichKernelTheyAre) {
  const std::string rows = Output({"export", "moments", kIncident + "@10:04Z..10:05Z"});
  EXPECT_EQ(rows.substr(0, 16), "host,time,built\n");
  const std::string built(kDefinitions.built);
  EXPECT_NE(rows.find(",2026-11-21T10:04:00Z," + built + "\n"), std::string::npos) << rows;
  EXPECT_NE(rows.find(",2026-11-21T10:05:00Z," + built + "\n"), std::string::npos) << rows;
}

// The same metrics, however often the rows have to be given for want of memory.
TEST_F(ExportFormats, MetricsNeedLittleMemory) {
  const tally::Report& report = *tally::FindReport("vm-stats");
  std::vector<ksicache::RowColumn> columns;
  for (const tally::ColumnInfo& column : ksicache::ColumnsOf(report)) {
    columns.push_back(ksicache::RowColumnOf(column, tally::DisplayUnit::b));
  }
  int readings = 0;
  const auto metrics = [&](size_t mostBytes) {
    const std::unique_ptr<ksicache::RowFormat> format = ksicache::MakeOpenMetrics(
        {.file = nullptr, .hasManyReports = false, .hasSpans = true, .mostBytes = mostBytes});
    testing::internal::CaptureStdout();
    readings = 0;
    do {
      ++readings;
      for (int64_t minute = 0; minute < 5; ++minute) {
        const ksicache::Origin origin = {"h", "", minute * 60'000'000};
        format->Begin({&report, columns, &origin});
        for (uint64_t machine = 0; machine < 200; ++machine) {
          std::vector<ksicache::Value> values;
          for (const ksicache::RowColumn& column : columns) {
            const bool isText = column.kind == tally::Kind::text;
            values.push_back(
                {isText ? ksicache::ValueType::text : ksicache::ValueType::unsignedNumber,
                 machine * 100 + (column.isKey ? 0 : static_cast<uint64_t>(minute)), "same"});
          }
          format->Row(values);
        }
      }
    } while (format->EndReports());
    format->Finish();
    std::fflush(stdout);
    return testing::internal::GetCapturedStdout();
  };
  const std::string once = metrics(size_t{1} << 30);
  EXPECT_EQ(readings, 1);
  EXPECT_EQ(Lines(once).size(), 28'078u);
  EXPECT_EQ(metrics(100'000), once);
  EXPECT_GT(readings, 3);
  EXPECT_THROW(metrics(10'000), ksicache::Error);
  testing::internal::GetCapturedStdout();
}

// Text goes out while it is made, also into a file.
TEST_F(ExportFormats, TextTakesLittleMemory) {
  const auto mostMemory = [] {
    rusage usage = {};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
  };
  const std::string row(1000, 'r');
  const long before = mostMemory();
  ksicache::NewFile file(Path("large"), false, 0600);
  ksicache::TextOutput output(&file);
  for (int i = 0; i < 64'000; ++i) {
    output.Put(row);
    output.EndRow();
  }
  EXPECT_EQ(directory_.Names(), std::vector<std::string>());
  output.Finish();
  EXPECT_LT(mostMemory() - before, 16 << 10);
  EXPECT_EQ(std::filesystem::file_size(Path("large")), 64'000'000u);
}

// A strict parser has no complaint, with times and without.
TEST_F(ExportFormats, MetricsPassAStrictParser) {
  const std::string parse = "/usr/bin/python3 " TALLY_STRICT_OPENMETRICS;
  if (std::system((parse + " </dev/null >/dev/null 2>&1").c_str()) == 77 << 8) {
    GTEST_SKIP() << "there is no python3-prometheus-client";
  }
  const auto counts = [&](const std::string& file) {
    Output({"export", "all", "--format=openmetrics", "--force", "-o", Path("all.om"), file});
    return Shell(parse + " <" + Path("all.om"));
  };
  EXPECT_EQ(counts(kExample), "counter=855 gauge=2953 info=136 stateset=6\n");
  EXPECT_TRUE(counts(kIncident + "@..").starts_with("counter=4275 gauge=14765 info=680 "));
}

TEST_F(ExportFormats, PromtoolHasNoComplaint) {
  if (!IsThere("promtool")) GTEST_SKIP() << "there is no promtool (Debian package prometheus)";
  Output({"export", "all", "--format=prometheus", "-o", Path("host.prom"), kExample});
  EXPECT_EQ(Shell("promtool check metrics <" + Path("host.prom")), "");
}

// A recording goes into a Prometheus that had not been there.
TEST_F(ExportFormats, PromtoolMakesBlocksOfASpan) {
  if (!IsThere("promtool")) GTEST_SKIP() << "there is no promtool (Debian package prometheus)";
  Output({"export", "vm-stats,comp-stats", "--format=openmetrics", "-o", Path("span.om"),
          kIncident + "@.."});
  Shell("mkdir -p " + Path("data/wal") + "; promtool tsdb create-blocks-from openmetrics " +
        Path("span.om") + " " + Path("data"));
  const std::string dump =
      Shell("promtool tsdb dump --match='tally_comp_free_bytes' " + Path("data"));
  EXPECT_NE(dump.find("tally_comp_free_bytes"), std::string::npos) << dump;
  EXPECT_NE(dump.find("} 9.437184e+08 1795255500000\n"), std::string::npos) << dump;
}

}  // namespace
}  // namespace ksi
