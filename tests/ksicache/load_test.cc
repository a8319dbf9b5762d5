// load, alone and with what dump writes.
#include <array>
#include <random>

#include "tests/ksicache/ksicache_fixture.h"

namespace ksi {
namespace {

// Every node with records of any bytes: what dump writes and load reads has to be all of it.
TEST_F(Ksicache, DumpAndLoadLoseNothing) {
  std::mt19937_64 random(7);
  {
    ksicache::CacheWriter writer(Path("a.ksi"), false);
    for (const Node& node : Catalogue()) {
      for (uint64_t variant = 0; variant < 6; ++variant) {
        const std::array<std::string, 3> texts = {"plain", "\xc3\xa9t\xc3\xa9 \"\\\n\x1b",
                                                  "\xff\x80 not UTF-8"};
        const auto keysFor = [&](const Keying& keying) {
          Keys keys;
          for (keys.count = 0; keys.count < keying.Count(); ++keys.count) {
            keys.at[keys.count] = {KindOf(keying.at[keys.count]),
                                   variant % 2 == 0 ? INT64_MIN + static_cast<int64_t>(variant)
                                                    : static_cast<int64_t>(variant),
                                   texts[variant % 3]};
          }
          return keys;
        };
        // Nodes without keys have but one reading, those with a text key three.
        const auto skip = [&](const Keying& keying) {
          return variant > 0 &&
                 (keying.Count() == 0 || (variant > 2 && KindOf(keying.at[0]) == KeyKind::kText));
        };
        if (node.HasValue() && !skip(node.valueKeys)) {
          std::vector<std::byte> record(node.recordSize);
          for (std::byte& byte : record) {
            byte = variant == 1 ? std::byte{0xff} : static_cast<std::byte>(random());
            if (variant >= 2 && random() % 2 == 0) byte = std::byte{0};
          }
          if (variant == 3) {
            writer.AddFailure(node, Kind::kValue, keysFor(node.valueKeys), 0xbad00c3);
          } else {
            writer.AddValue(node, keysFor(node.valueKeys), record);
          }
        }
        if (node.HasList() && !skip(node.listKeys)) {
          const bool numbers = KindOf(node.entries) == KeyKind::kNumber;
          if (variant == 5) {
            writer.AddFailure(node, Kind::kList, keysFor(node.listKeys), 0xffffffff);
          } else {
            writer.AddList(node, keysFor(node.listKeys),
                           numbers ? NumberList({UINT64_MAX, 5, 0, 5, 1ull << 63})
                                   : TextList({texts[2], "", texts[1], texts[0], texts[0]}));
          }
        }
      }
    }
    CacheFile::Capture capture = TestCapture();
    capture.host = "\xfe\"host\"";
    capture.signature = "00112233445566778899aabbccddeeff";
    writer.Commit(capture);
  }
  const std::string first = Output({"dump", "--json", Path("a.ksi")});
  WriteContent(Path("a.json"), first);
  EXPECT_EQ(Output({"load", Path("a.json"), Path("b.ksi")}), "");
  const std::string second = Output({"dump", "--json", Path("b.ksi")});
  EXPECT_TRUE(first == second);
  EXPECT_EQ(Output({"dump", Path("a.ksi")}), Output({"dump", Path("b.ksi")}));
  // And the same through the library: the readings are equal in the file.
  sqlite3* handle = nullptr;
  ASSERT_EQ(sqlite3_open(Path("a.ksi").c_str(), &handle), SQLITE_OK);
  const Database database(handle);
  const std::string attach = "ATTACH '" + Path("b.ksi") + "' AS b";
  ASSERT_EQ(sqlite3_exec(handle, attach.c_str(), nullptr, nullptr, nullptr), SQLITE_OK);
  for (const std::string table : {"capture", "node", "reading", "instance"}) {
    Statement rows;
    const std::string sql = "SELECT (SELECT count(*) FROM main." + table +
                            "), count(*) FROM "
                            "(SELECT * FROM main." +
                            table + " INTERSECT SELECT * FROM b." + table + ")";
    ASSERT_EQ(rows.Prepare(handle, sql.c_str()), SQLITE_OK);
    ASSERT_EQ(rows.Step(), SQLITE_ROW);
    EXPECT_GT(rows.Number(0), 0) << table;
    EXPECT_EQ(rows.Number(0), rows.Number(1)) << table;
  }
}

TEST_F(Ksicache, LoadFillsInWhatMayBeLeftOut) {
  WriteContent(Path("a.json"),
               JsonWith(R"({"node":"memory/comprehensive","keys":[],"value":{"total":5}})"));
  Output({"load", Path("a.json"), Path("a.ksi")});
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
  const std::string dump = Output({"dump", "--json", Path("a.ksi")});
  EXPECT_NE(dump.find("\"signature\": \"" + std::string(kDefinitions.signature)), dump.npos);
  EXPECT_NE(dump.find(R"("value":{"total":5,"managedByMemMap":0,)"), dump.npos);
}

TEST_F(Ksicache, LoadNamesWhatIsWrongAndWhere) {
  const std::string flags = R"({"node":"sched/groups/groupFlags","keys":[4],)";
  const std::string where = "readings[0]: sched/groups/groupFlags [4]: ";
  ExpectRefused("{",
                "parse error at line 1, column 2: syntax error while parsing object key - "
                "unexpected end of input; expected string literal");
  ExpectRefused("[]", "is not the JSON of a cache file: it has no \"ksiCache\"");
  ExpectRefused(R"({"ksiCache":2})", "ksiCache: is not 1");
  ExpectRefused(R"({"ksiCache":1,"extra":2})", "\"extra\" is no member of a cache file");
  ExpectRefused(R"({"ksiCache":1,"ksiCache":1})", "\"ksiCache\" is given twice in one object");
  ExpectRefused(R"({"ksiCache":1,"taken":"2026-11-21T10:00:00Z","readings":[]})", "has no host");
  ExpectRefused(R"({"ksiCache":1,"host":"h","readings":[]})", "has no taken");
  ExpectRefused(R"({"ksiCache":1,"host":"h","taken":"2026-11-21T10:00:00Z"})", "has no readings");
  ExpectRefused(R"({"ksiCache":1,"host":"h","taken":"today","readings":[]})",
                "taken: is not as it is in a cache file");
  for (const std::string taken :
       {"2026-13-41T99:00:00Z", "2026-02-29T10:00:00Z", "2026-11-21T24:00:00Z",
        "2026-11-21 10:00:00Z", " 026-11-21T10:00:00Z", "2026-11-21T10:00:00z"}) {
    ExpectRefused(R"({"ksiCache":1,"host":"h","taken":")" + taken + R"(","readings":[]})",
                  "taken: is no date and time");
  }
  ExpectRefused(JsonWith("5"), "readings[0]: is not an object");
  ExpectRefused(JsonWith("[{}]"), "readings[0]: is not an object");
  ExpectRefused(JsonWith("{}"), "readings[0]: has no \"node\"");
  ExpectRefused(JsonWith(R"({"node":"sched/nothing"})"),
                "readings[0]: there is no node sched/nothing");
  ExpectRefused(JsonWith(R"({"node":"system/heaps"})"),
                "readings[0]: system/heaps: has no \"keys\"");
  ExpectRefused(JsonWith(R"({"node":"system/heaps","keys":[]})"),
                "readings[0]: system/heaps: has no \"value\", \"instances\" or \"status\"");
  ExpectRefused(JsonWith(R"({"node":"system/heaps","keys":[],"value":{}})"),
                "readings[0]: system/heaps []: the node has no value");
  ExpectRefused(JsonWith(R"({"node":"memory/memInfo","keys":[],"instances":[]})"),
                "readings[0]: memory/memInfo []: the node has no instances");
  ExpectRefused(JsonWith(R"({"node":"memory/memInfo","keys":[1],"value":{}})"),
                "readings[0]: memory/memInfo [1]: keys: the node takes 0");
  ExpectRefused(JsonWith(R"({"node":"memory/memNodes","keys":["0"],"value":{}})"),
                "readings[0]: memory/memNodes [\"0\"]: keys[0] (memory node): is not a whole "
                "number of 64 bits");
  ExpectRefused(JsonWith(R"({"node":"system/heaps/stats","keys":["a\u0000b"],"value":{}})"),
                "readings[0]: system/heaps/stats [\"a\\u0000b\"]: keys[0] (heap): holds a NUL");
  ExpectRefused(JsonWith(flags + R"("value":{},"status":"0xbad0003"})"),
                "readings[0]: has both value and status");
  ExpectRefused(JsonWith(flags + R"("answer":{}})"),
                "readings[0]: \"answer\" is no member of a reading");
  ExpectRefused(JsonWith(flags + R"("value":{"groupFlags":-1}})"),
                where + "value.groupFlags: is not an unsigned whole number of 32 bits");
  ExpectRefused(JsonWith(flags + R"("value":{"groupFlags":4294967296}})"),
                where + "value.groupFlags: is not an unsigned whole number of 32 bits");
  ExpectRefused(JsonWith(flags + R"("value":{"groupFlags":1.5}})"),
                where + "value.groupFlags: is not an unsigned whole number of 32 bits");
  ExpectRefused(JsonWith(flags + R"("value":{"flags":1}})"),
                where + "value.flags: the record has no such field");
  ExpectRefused(JsonWith(flags + R"("value":{"groupFlags":1,"groupFlags":2}})"),
                "readings[0]: \"groupFlags\" is given twice in one object");
  ExpectRefused(JsonWith(flags + R"("value":5})"), where + "value: is not an object");
  ExpectRefused(JsonWith(flags + R"("status":"0x0"})"),
                where + "status: is not a failure such as \"0xbad0003\"");
  ExpectRefused(JsonWith(flags + R"("status":"0xzz"})"),
                where + "status: is not a failure such as \"0xbad0003\"");
  ExpectRefused(JsonWith(flags + R"("value":{}},)" + flags + R"("value":{}})"),
                "readings[1]: sched/groups/groupFlags [4]: is given twice");
  ExpectRefused(
      JsonWith(R"({"node":"sched/groups/groupTag","keys":[1],"value":{"text":"123456789"}})"),
      "readings[0]: sched/groups/groupTag [1]: value.text: is longer than 8 bytes");
  ExpectRefused(
      JsonWith(R"({"node":"sched/groups/groupTag","keys":[1],"value":{"text":{"hex":"0g"}}})"),
      "readings[0]: sched/groups/groupTag [1]: value.text.hex: is not a string of "
      "hexadecimal digits (0-9, a-f)");
  ExpectRefused(
      JsonWith(R"({"node":"sched/groups/members/groups","keys":[1],"instances":[1,"x"]})"),
      "readings[0]: sched/groups/members/groups [1]: instances[1]: is not a whole "
      "number of 64 bits");
  ExpectRefused(JsonWith(R"({"node":"system/heaps","keys":[],"instances":[")" +
                         std::string(5000, 'x') + R"("]})"),
                "readings[0]: system/heaps []: a text is longer than 4096 bytes");
  ExpectFailure({"load", Path("none.json"), Path("a.ksi")},
                Path("none.json") + ": No such file or directory");
}

TEST_F(Ksicache, LoadTakesMembersInAnyOrder) {
  WriteContent(Path("a.json"),
               R"({"readings":[{"instances":[3,-1],"keys":[4],"node":"sched/groups/members/groups"},
                   {"status":"0xbad0003","node":"system/buddy","keys":[]},
                   {"instances":["b",{"hex":"ff"},""],"node":"system/heaps","keys":[]}],
                   "taken":"2026-11-21T10:00:00Z","host":"h","ksiCache":1})");
  Output({"load", Path("a.json"), Path("a.ksi")});
  EXPECT_EQ(Output({"dump", Path("a.ksi")}),
            "host       h\ntaken      2026-11-21T10:00:00Z\n\n"
            "sched/groups/members/groups [4]\n    3\n    -1\n\n"
            "system/buddy\n    failed with 0xbad0003\n\n"
            "system/heaps\n    b\n    {\"hex\":\"ff\"}\n    \n");
}

// Hostile JSON ends in a message, whatever there is of it.
TEST_F(Ksicache, LoadTakesNoMoreThanACacheFileHas) {
  const std::string many(60000, '[');
  ExpectRefused(many, "is nested too deeply");
  ExpectRefused(R"({"ksiCache":1,"readings":)" + many, "readings[0]: is nested too deeply");
  ExpectRefused(JsonWith(R"({"instances":)" + many), "readings[0]: is nested too deeply");
  ExpectRefused(JsonWith(R"({"value":[[[[[]]]]]})"), "readings[0]: has no \"node\"");
  ExpectRefused(JsonWith(R"({"value":[[[[[[]]]]]]})"), "readings[0]: is nested too deeply");
  std::string members;
  for (int i = 0; i < 257; ++i) members += (i == 0 ? "\"" : ",\"") + std::to_string(i) + "\":0";
  ExpectRefused("{" + members + "}", "has more than 256 members in one place");
  ExpectRefused(JsonWith(R"({"value":{)" + members + "}}"),
                "readings[0]: has more than 256 members in one place");
  ExpectRefused(R"({"ksiCache":1e999})", "number overflow parsing '1e999'");
  ExpectRefused(JsonWith(R"({"node":"\u001b[2J\u009b"})"),
                R"(readings[0]: there is no node \x1b[2J\xc2\x9b)");
}

TEST_F(Ksicache, LoadQuotesAHundredBytesOfWhatItRefuses) {
  const std::string longest(100, 'x');
  const std::string more = longest + "y";
  const std::string cut = longest + "...";
  ExpectRefused(R"({"ksiCache":1,")" + longest + R"(":2})",
                "\"" + longest + "\" is no member of a cache file");
  ExpectRefused(R"({"ksiCache":1,")" + more + R"(":2})",
                "\"" + cut + "\" is no member of a cache file");
  ExpectRefused(R"({")" + more + R"(":1,")" + more + R"(":1})",
                "\"" + cut + "\" is given twice in one object");
  ExpectRefused(JsonWith(R"({"node":")" + more + R"("})"), "readings[0]: there is no node " + cut);
  ExpectRefused(JsonWith(R"({")" + more + R"(":1})"),
                "readings[0]: \"" + cut + "\" is no member of a reading");
  ExpectRefused(JsonWith(R"({"node":"memory/memInfo","keys":[],"value":{")" + more + R"(":1}})"),
                "readings[0]: memory/memInfo []: value." + cut + ": the record has no such field");
  ExpectRefused(
      JsonWith(R"({"node":"memory/memInfo","keys":[")" + more + R"("],"value":{}})"),
      "readings[0]: memory/memInfo [\"" + longest.substr(2) + "...: keys: the node takes 0");
  ExpectRefused("{" + more,
                "parse error at line 1, column 2: syntax error while parsing object key - invalid "
                "literal; last read: '{x'; expected string literal");
  ExpectRefused("{\"" + more,
                "parse error at line 1, column 104: syntax error while parsing object key - "
                "invalid string: missing closing quote; last read: '\"" +
                    longest.substr(2) + "...");
}

TEST_F(Ksicache, LoadRefusesStatusesThatAreNone) {
  for (const char* status : {"", "0x", "0x-5", "0x 5", "0x+5", "bad0003", "0x1bad0003f", "0x5z"}) {
    ExpectRefused(
        JsonWith(R"({"node":"system/heaps","keys":[],"status":")" + std::string(status) + "\"}"),
        "readings[0]: system/heaps []: status: is not a failure such as \"0xbad0003\"");
  }
}

#ifndef TALLY_SANITIZED
// A sanitizer takes more memory than that for itself.
TEST_F(Ksicache, LoadWithoutMemoryLeavesNoFile) {
  std::string entries = "1";
  for (int i = 0; i < 3000000; ++i) entries += ",1";
  WriteContent(Path("a.json"),
               JsonWith(R"({"node":"sched/groups/members/groups","keys":[1],"instances":[)" +
                        entries + "]}"));
  harness::Program program = Command({});
  program.path = "/bin/sh";
  program.args = {
      "sh",           "-c",         "ulimit -v 40000; exec \"$0\" \"$@\"", KSICACHE_PROGRAM, "load",
      Path("a.json"), Path("a.ksi")};
  const harness::Result result = harness::RunProgram(program);
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: out of memory\n");
  EXPECT_EQ(directory_.Names(), std::vector<std::string>{"a.json"});
}
#endif

TEST_F(Ksicache, ExampleHostIsWhatDumpWrites) {
  const std::string json = TALLY_TESTS_DIRECTORY "/../examples/hypervisor.json";
  Output({"load", json, Path("a.ksi")});
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
  std::string dump = Output({"dump", "--json", Path("a.ksi")});
  // Build date and signature are the library's, so the example leaves them out.
  for (const char* member : {"  \"built\"", "  \"signature\""}) {
    const size_t at = dump.find(member);
    ASSERT_NE(at, dump.npos);
    dump.erase(at, dump.find('\n', at) + 1 - at);
  }
  EXPECT_TRUE(dump == FileContent(json));
}

}  // namespace
}  // namespace ksi
