// What `ksicache record` says, and that it goes on.
#include <gtest/gtest.h>

#include <regex>
#include <string>
#include <vector>

#include "knvlibs/sqlite.h"
#include "tests/harness/program.h"
#include "tests/ksicache/ksicache_fixture.h"

#ifdef KSICACHE_SET_CLOCK
namespace ksi {
namespace {

class RecordCommand : public Ksicache {
 protected:
  // Of a recorder that does not wait, from an hour of 2026-11-21 on.
  static harness::Result Record(int hour, const std::vector<std::string>& args) {
    harness::Program program = Command(args);
    program.args.insert(program.args.begin() + 1, "record");
    program.environment.emplace_back("LD_PRELOAD=" KSICACHE_SET_CLOCK);
    program.environment.push_back("SET_CLOCK=" + std::to_string(1795219200 + hour * 3600 + 1));
    return harness::RunProgram(program);
  }
};

// Changes a file as somebody else's SQLite would.
void Change(const std::string& fileName, const std::string& sql) {
  sqlite3* handle = nullptr;
  ASSERT_EQ(sqlite3_open_v2(fileName.c_str(), &handle, SQLITE_OPEN_READWRITE, nullptr), SQLITE_OK);
  const Database database(handle);
  ASSERT_EQ(sqlite3_exec(handle, sql.c_str(), nullptr, nullptr, nullptr), SQLITE_OK);
}

TEST_F(RecordCommand, OnceAnHourTellsWhatItCost) {
  const std::string file = Path("a.rec");
  const harness::Result result = Record(9, {file, "--every", "20m", "--count", "7"});
  EXPECT_EQ(result.status, 0) << result.err;
  const auto hour = [&file](const std::string& moments, const std::string& from) {
    return file + ": " + moments + " moments since 2026-11-21T" + from +
           ":00Z, 0 skipped, 0 dropped; each took [0-9]+\\.[0-9] ms, [0-9]+\\.[0-9] ms of CPU; "
           "[0-9]+ bytes\n";
  };
  EXPECT_TRUE(std::regex_match(
      result.out, std::regex(file + ": recording .* every 1200 s\n" + hour("2", "09:20") +
                             hour("3", "10:00") + file + ": 7 moments recorded, [0-9]+ bytes\n")))
      << result.out;
}

// Single moments are left by a recorder that was killed, and one of them damaged by a loss of
// power.
TEST_F(RecordCommand, GoesOnBehindWhatIsDamaged) {
  const std::string file = Path("a.rec");
  EXPECT_EQ(Record(9, {file, "--every", "1s", "--count", "3"}).status, 0);
  Change(file,
         "UPDATE part SET moments = 0 WHERE moments = 3;"
         "UPDATE block SET data = zeroblob(4572) WHERE id = (SELECT block FROM part WHERE "
         "number = 1 AND moments = 1)");
  const harness::Result result = Record(10, {file, "--every", "1s", "--count", "2"});
  EXPECT_EQ(result.status, 0);
  EXPECT_EQ(result.err, "ksicache: " + file + ": its last moments are damaged, and stay so: 2\n");
  // What came before it and what came after it is there.
  Output({"extract", file + "@first", Path("first.ksi")});
  Output({"extract", file + "@last", Path("last.ksi")});
  const harness::Result check = Run({"check", file});
  EXPECT_EQ(check.status, 1);
  EXPECT_NE(check.out.find("@2026-11-21T09:00:03Z: damaged: "), std::string::npos) << check.out;
}

}  // namespace
}  // namespace ksi
#endif
