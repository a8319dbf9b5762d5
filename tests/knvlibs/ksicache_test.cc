// ksicache from its command line to its exit status.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <spawn.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstring>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "knvlibs/cache_source.h"
#include "tests/harness/program.h"
#include "tests/knvlibs/cache_fixture.h"
#include "tests/knvlibs/host_tree.h"

namespace ksi {
namespace {

class Ksicache : public testing::Test {
 protected:
  static harness::Program Command(const std::vector<std::string>& args) {
    harness::Program program;
    program.path = KSICACHE_PROGRAM;
    program.args = {"ksicache"};
    program.args.insert(program.args.end(), args.begin(), args.end());
    program.environment = harness::OwnEnvironment();
    return program;
  }

  static harness::Result Run(const std::vector<std::string>& args) {
    return harness::RunProgram(Command(args));
  }

  // Runs and expects success without diagnostics; gives the output.
  static std::string Output(const std::vector<std::string>& args) {
    const harness::Result result = Run(args);
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.err, "");
    return result.out;
  }

  // Runs and expects it to fail with this message and no output.
  static void ExpectFailure(const std::vector<std::string>& args, const std::string& message,
                            int status = 1) {
    const harness::Result result = Run(args);
    EXPECT_EQ(result.status, status);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err,
              "ksicache: " + message + (status == 2 ? "\nTry 'ksicache --help'.\n" : "\n"));
  }

  std::string Path(std::string_view name) const { return directory_.Path(name); }

  // The JSON of a cache file with these readings.
  static std::string JsonWith(const std::string& readings) {
    return R"({"ksiCache":1,"host":"h","taken":"2026-11-21T10:00:00Z","readings":[)" + readings +
           "]}";
  }

  // Expects `load` to refuse JSON with a message that starts with the file's name, and to leave
  // nothing behind.
  void ExpectRefused(const std::string& json, const std::string& message) {
    WriteContent(Path("bad.json"), json);
    ExpectFailure({"load", Path("bad.json"), Path("bad.ksi")}, Path("bad.json") + ": " + message);
    EXPECT_EQ(access(Path("bad.ksi").c_str(), F_OK), -1);
  }

  TestDirectory directory_;
};

TEST_F(Ksicache, HelpAndVersion) {
  EXPECT_EQ(Output({"--help"}).find("Usage: ksicache capture FILE"), 0u);
  EXPECT_EQ(Output({"-h"}), Output({"dump", "--help"}));
  EXPECT_EQ(Output({"--version"}), "ksicache " KSICACHE_VERSION "\n");
}

TEST_F(Ksicache, WrongCommandLines) {
  ExpectFailure({}, "which command?", 2);
  ExpectFailure({"melt", "x"}, "there is no command melt", 2);
  ExpectFailure({"info"}, "info takes one file", 2);
  ExpectFailure({"info", "a", "b"}, "info takes one file", 2);
  ExpectFailure({"check"}, "check takes one file", 2);
  ExpectFailure({"capture"}, "capture takes one file", 2);
  ExpectFailure({"dump"}, "dump takes a file", 2);
  ExpectFailure({"load", "a"}, "load takes a JSON file and a cache file", 2);
  ExpectFailure({"info", "--force", "x"}, "info does not take that option", 2);
  ExpectFailure({"load", "--root", "/", "a", "b"}, "load does not take that option", 2);
  ExpectFailure({"info", "--fast", "x"}, "unknown or incomplete option --fast", 2);
  ExpectFailure({"capture", "x", "--root"}, "unknown or incomplete option --root", 2);
}

TEST_F(Ksicache, FilesThatCannotBeRead) {
  ExpectFailure({"info", Path("none")}, Path("none") + ": no such file");
  ExpectFailure({"dump", Path("")}, Path("") + ": is a directory");
  ExpectFailure({"check", "/dev/null"}, "/dev/null: not a cache file");
  WriteSmallHost(Path("host.ksi"));
  RunSql(Path("host.ksi"), "CREATE VIEW v AS SELECT 1");
  ExpectFailure({"check", Path("host.ksi")},
                Path("host.ksi") + ": damaged: it has more than the tables of a cache file");
  RunSql(Path("host.ksi"), "PRAGMA user_version = 9");
  ExpectFailure({"info", Path("host.ksi")}, Path("host.ksi") + ": made by a newer version");
}

TEST_F(Ksicache, InfoTellsWhatAFileIs) {
  WriteSmallHost(Path("host.ksi"));
  const std::string own(kDefinitions.signature);
  const std::string info = Output({"info", Path("host.ksi")});
  EXPECT_NE(info.find("host       test.example.org\ntaken      2026-11-21T10:00:00Z\n"), info.npos);
  EXPECT_NE(info.find("signature  " + own +
                      "\nvalues     8\nlists      5 of 6 instances\n"
                      "failed     2\n"),
            info.npos)
      << info;
  const std::string other = "00112233445566778899aabbccddeeff";
  RunSql(Path("host.ksi"), "UPDATE capture SET signature = '" + other + "'");
  EXPECT_NE(Output({"info", Path("host.ksi")})
                .find("signature  " + other + ", not " + own + " of this version\n"),
            std::string::npos);
}

TEST_F(Ksicache, DumpShowsDecodedFields) {
  WriteSmallHost(Path("host.ksi"));
  EXPECT_EQ(Output({"dump", Path("host.ksi"), "sched/memClients/remapTypes",
                    "sched/groups/groupName", "sched/groups/groupFlags"}),
            R"(
sched/groups/groupName [0]
    text  host

sched/groups/groupFlags [0]
    groupFlags                  0x64 bits

sched/groups/groupName [7]
    text  web

sched/groups/groupFlags [7]
    groupFlags                  0x6b bits

sched/groups/groupName [9]
    failed with 0xbad005a

sched/groups/groupFlags [9]
    groupFlags                  0x6d bits

sched/memClients/remapTypes [30]
    small
    large

sched/memClients/remapTypes [30] [large]
    added                    no value pages
    filtered                        0 pages
    prepared                        0 pages
    staged                          0 pages
    canceled                        0 pages
    remapped                        0 pages
    cUnprepared                     0 pages
    cPrepared                       0 pages
    cStaged                         0 pages

sched/memClients/remapTypes [30] [small]
    added                           5 pages
    filtered                        0 pages
    prepared                        0 pages
    staged                          0 pages
    canceled                        0 pages
    remapped                        0 pages
    cUnprepared                     0 pages
    cPrepared                       0 pages
    cStaged                         0 pages
)");
}

TEST_F(Ksicache, DumpAsJson) {
  WriteSmallHost(Path("host.ksi"));
  const std::string dump = Output({"dump", "--json", Path("host.ksi"), "sched/groups/groupName",
                                   "sched/groups/members/groups", "system/heaps"});
  EXPECT_EQ(dump.substr(dump.find("  \"readings\"")),
            R"(  "readings": [
    {"node":"sched/groups/groupName","keys":[0],"value":{"text":"host"}},
    {"node":"sched/groups/members/groups","keys":[0],"instances":[9,7]},
    {"node":"sched/groups/groupName","keys":[7],"value":{"text":"web"}},
    {"node":"sched/groups/members/groups","keys":[7],"instances":[]},
    {"node":"sched/groups/groupName","keys":[9],"status":"0xbad005a"},
    {"node":"sched/groups/members/groups","keys":[9],"status":"0xbad000a"},
    {"node":"system/heaps","keys":[],"instances":["main",""]}
  ]
}
)");
}

TEST_F(Ksicache, DumpNamesNodesThatThereAreNot) {
  WriteSmallHost(Path("host.ksi"));
  ExpectFailure({"dump", Path("host.ksi"), "system/heaps", "system/piles"},
                "there is no node system/piles", 2);
}

TEST_F(Ksicache, DumpGoesOnAfterWhatItCannotShow) {
  WriteSmallHost(Path("host.ksi"));
  RunSql(Path("host.ksi"),
         "UPDATE reading SET answer = zeroblob(3) WHERE key1 = 7 AND typeof(answer) = 'blob'; "
         "DELETE FROM instance WHERE key1 = 0 AND position = 0");
  const harness::Result result = Run({"dump", "--json", Path("host.ksi")});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err,
            "ksicache: sched/groups/members/groups [0]: is a list with gaps\n"
            "ksicache: sched/groups/groupName [7]: has 3 bytes, its record 64\n"
            "ksicache: sched/groups/groupFlags [7]: has 3 bytes, its record 4\n");
  EXPECT_NE(result.out.find(R"("keys":[9])"), result.out.npos);
}

TEST_F(Ksicache, OutputThatIsLostIsAnError) {
  WriteSmallHost(Path("host.ksi"));
  for (const char* command : {"dump", "info", "--help"}) {
    harness::Program program = Command({command, Path("host.ksi")});
    program.outPath = "/dev/full";
    const harness::Result result = harness::RunProgram(program);
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "ksicache: standard output: No space left on device\n");
  }
}

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

TEST_F(Ksicache, FilesAreReplacedOnlyByForce) {
  WriteContent(Path("a.json"), JsonWith(""));
  WriteContent(Path("a.ksi"), "precious");
  ExpectFailure({"load", Path("a.json"), Path("a.ksi")},
                Path("a.ksi") + ": exists already (--force replaces it)");
  ExpectFailure({"capture", Path("a.ksi")},
                Path("a.ksi") + ": exists already (--force replaces it)");
  EXPECT_EQ(FileContent(Path("a.ksi")), "precious");
  Output({"load", "--force", Path("a.json"), Path("a.ksi")});
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
  ExpectFailure({"load", "--force", Path("a.json"), Path("")}, Path("") + ": Is a directory");
  ExpectFailure({"load", Path("a.json"), Path("no/a.ksi")},
                Path("no/a.ksi") + ": No such file or directory");
  EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "a.ksi"}));
}

TEST_F(Ksicache, FilesGetTheRightsOfTheUmask) {
  WriteContent(Path("a.json"), JsonWith(""));
  const mode_t before = umask(027);
  Output({"load", Path("a.json"), Path("a.ksi")});
  umask(before);
  struct stat info;
  ASSERT_EQ(stat(Path("a.ksi").c_str(), &info), 0);
  EXPECT_EQ(info.st_mode & 0777, 0640u);
}

// Readings of many groups, larger than what the tests below allow.
std::string ManyGroups() {
  std::string readings;
  for (int i = 0; i < 2000; ++i) {
    readings += (i == 0 ? "" : ",") + std::string(R"({"node":"sched/groups/groupName","keys":[)") +
                std::to_string(i) + R"(],"value":{"text":"group"}})";
  }
  return readings;
}

TEST_F(Ksicache, FullDiskLosesNothingAndSaysSo) {
  WriteContent(Path("a.json"), JsonWith(ManyGroups()));
  const std::vector<std::string> commands[] = {
      {"load", "--force", Path("a.json"), Path("a.ksi")},
      {"capture", "--force", "--root", RecordedHost("kvm-two-nodes"), Path("a.ksi")},
  };
  for (const std::vector<std::string>& command : commands) {
    WriteContent(Path("a.ksi"), "precious");
    // A limit on the size of files is the full disk that every user can have.
    harness::Program program = Command(command);
    program.path = "/bin/sh";
    program.args = {"sh", "-c", "trap '' XFSZ; ulimit -f 40; exec \"$0\" \"$@\"", KSICACHE_PROGRAM};
    program.args.insert(program.args.end(), command.begin(), command.end());
    const harness::Result result = harness::RunProgram(program);
    EXPECT_EQ(result.status, 1) << command[0];
    EXPECT_NE(result.err.find("ksicache: " + Path("a.ksi") + ": cannot write: "), result.err.npos)
        << result.err;
    EXPECT_EQ(FileContent(Path("a.ksi")), "precious");
    EXPECT_EQ(directory_.Names(), (std::vector<std::string>{"a.json", "a.ksi"}));
  }
}

// Starts ksicache, which makes a temporary file beside `names` and then waits for what does not
// come; expects a signal to end it and to leave nothing but `names`. `diagnostics`, unless
// negative, is its standard error.
void ExpectNothingLeftBy(int signal, std::vector<std::string> words, int diagnostics,
                         const TestDirectory& directory, const std::vector<std::string>& names) {
  std::vector<char*> args;
  for (std::string& word : words) args.push_back(word.data());
  args.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  if (diagnostics >= 0) {
    posix_spawn_file_actions_adddup2(&actions, diagnostics, STDERR_FILENO);
  }
  pid_t process = 0;
  ASSERT_EQ(posix_spawn(&process, KSICACHE_PROGRAM, &actions, nullptr, args.data(), environ), 0);
  posix_spawn_file_actions_destroy(&actions);
  for (int i = 0; i < 1000 && directory.Names().size() == names.size(); ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
  }
  EXPECT_EQ(directory.Names().size(), names.size() + 1);
  ASSERT_EQ(kill(process, signal), 0);
  int status = 0;
  ASSERT_EQ(waitpid(process, &status, 0), process);
  EXPECT_TRUE(WIFSIGNALED(status));
  EXPECT_EQ(WTERMSIG(status), signal);
  EXPECT_EQ(directory.Names(), names);
}

TEST_F(Ksicache, SignalsLeaveNothingBehind) {
  // JSON that does not come.
  const std::string pipe = Path("pipe");
  ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
  const int writer = open(pipe.c_str(), O_RDWR | O_CLOEXEC);
  ASSERT_GE(writer, 0);
  for (const int signal : {SIGINT, SIGTERM}) {
    ExpectNothingLeftBy(signal, {"ksicache", "load", pipe, Path("a.ksi")}, -1, directory_,
                        {"pipe"});
  }
  close(writer);
}

TEST_F(Ksicache, SignalsLeaveNothingOfACapture) {
  // A diagnostic that nobody reads.
  const HostTree host;
  host.Write("/proc/meminfo", "MemTotal: 1000 kB\n");
  host.Write("/proc/buddyinfo", "no line of this file\n");
  std::array<int, 2> pipe = {};
  ASSERT_EQ(pipe2(pipe.data(), O_CLOEXEC | O_NONBLOCK), 0);
  const std::string page(4096, ' ');
  while (write(pipe[1], page.data(), page.size()) > 0) continue;
  ASSERT_EQ(fcntl(pipe[1], F_SETFL, 0), 0);
  for (const int signal : {SIGINT, SIGTERM}) {
    ExpectNothingLeftBy(signal, {"ksicache", "capture", "--root", host.Root(), Path("a.ksi")},
                        pipe[1], directory_, {});
  }
  close(pipe[0]);
  close(pipe[1]);
}

TEST_F(Ksicache, CheckFindsNothingInGoodFiles) {
  WriteSmallHost(Path("host.ksi"));
  EXPECT_EQ(Output({"check", Path("host.ksi")}), "");
}

TEST_F(Ksicache, CheckSaysWhatIsWrongAndWhere) {
  const std::string file = Path("host.ksi");
  WriteSmallHost(file);
  const std::string good = FileContent(file);
  const auto expect = [&](const std::string& sql, const std::string& problem) {
    WriteContent(file, good);
    RunSql(file, sql);
    const harness::Result result = Run({"check", file});
    EXPECT_EQ(result.status, 1) << sql;
    EXPECT_EQ(result.out, file + ": " + problem + "\n");
    EXPECT_EQ(result.err, "");
  };
  const std::string flags = "(SELECT id FROM node WHERE path = 'sched/groups/groupFlags')";
  const std::string groups = "(SELECT id FROM node WHERE path = 'sched/groups/members/groups')";
  const std::string other = "00112233445566778899aabbccddeeff";
  expect(
      "UPDATE capture SET signature = '" + other + "'",
      "signature " + other + " is not " + std::string(kDefinitions.signature) + " of this version");
  expect("INSERT INTO node VALUES(700, 'sched/later', 'list')", "there is no node sched/later");
  expect("UPDATE reading SET answer = zeroblob(5) WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: has 5 bytes, its record 4");
  expect("UPDATE reading SET answer = 5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: has no record");
  expect("UPDATE reading SET status = -5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: has no good status");
  expect("UPDATE reading SET status = 5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: failed and has an answer");
  expect("UPDATE reading SET key1 = 'x' WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [x]: has keys that the node does not take");
  expect("UPDATE reading SET key2 = 5 WHERE key1 = 7 AND node = " + flags,
         "sched/groups/groupFlags [7]: has keys that the node does not take");
  expect("UPDATE reading SET node = 900 WHERE key1 = 7 AND node = " + flags,
         "node 900 [7]: is not in the table of nodes");
  expect("UPDATE reading SET answer = -2 WHERE key1 = 7 AND node = " + groups,
         "sched/groups/members/groups [7]: has no number of instances");
  expect("UPDATE reading SET answer = 1 WHERE key1 = 7 AND node = " + groups,
         "sched/groups/members/groups [7]: has 0 entries and says 1");
  expect(
      "UPDATE instance SET position = 2 WHERE key1 = 0 AND position = 1; UPDATE reading SET "
      "answer = 3 WHERE key1 = 0 AND answer = 2",
      "sched/groups/members/groups [0]: has entry 2 where entry 1 has to be");
  expect("UPDATE instance SET entry = 'x' WHERE key1 = 0 AND position = 1",
         "sched/groups/members/groups [0]: entry 1 is no number");
  expect("UPDATE instance SET entry = 5 WHERE key1 = 30 AND position = 1",
         "sched/memClients/remapTypes [30]: entry 1 is no text");
  expect("INSERT INTO instance VALUES(55, '', " + groups + ", 0, 1)",
         "1 entries belong to no list");

  // And what is wrong below the tables.
  std::string bad = good;
  bad[bad.size() - 4096 + 3] = 99;  // the number of cells of a page
  WriteContent(file, bad);
  const harness::Result result = Run({"check", file});
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.out + result.err, "");
}

TEST_F(Ksicache, CaptureRecordsAHost) {
  const HostTree host;
  host.Write("/proc/sys/kernel/hostname", "recorded.example.org\n");
  host.Write("/proc/meminfo", "MemTotal: 1000 kB\n");
  const harness::Result result = Run({"capture", Path("a.ksi"), "--root", host.Root()});
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_EQ(result.out.find(Path("a.ksi") + ": "), 0u);
  EXPECT_NE(result.out.find(" of recorded.example.org, "), result.out.npos) << result.out;
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
  // What cannot be read is recorded as such.
  const std::string dump = Output({"dump", "--json", Path("a.ksi"), "memory/comprehensive",
                                   "sched/globalStats/memory/stateTransitions"});
  EXPECT_NE(dump.find(R"({"node":"memory/comprehensive","keys":[],"status":"0xbad0003"})"),
            dump.npos)
      << dump;
  for (const char* state : {"high", "clear", "soft", "hard", "low"}) {
    EXPECT_NE(dump.find("\"keys\":[\"" + std::string(state) + "\"],\"value\":{\"up\":0,"),
              dump.npos)
        << state;
  }
  const std::string taken = dump.substr(dump.find("\"taken\": \"") + 10, 20);
  EXPECT_EQ(taken[10], 'T');
  EXPECT_EQ(taken[19], 'Z');
}

// A host answers from its capture as it does itself.
TEST_F(Ksicache, CaptureHasAllThatTheHostTells) {
  const std::string root = RecordedHost("kvm-two-nodes");
  const harness::Result result = Run({"capture", Path("a.ksi"), "--root", root});
  ASSERT_EQ(result.status, 0) << result.err;
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
  std::unique_ptr<CacheSource> cache;
  ASSERT_EQ(CacheSource::Open(Path("a.ksi").c_str(), &cache), kOk);
  LinuxSource host(root);
  EXPECT_EQ(HostText(*cache), HostText(host));
}

TEST_F(Ksicache, CaptureTakesNoOtherDirectoryForAHost) {
  ExpectFailure({"capture", Path("a.ksi"), "--root", Path("")},
                Path("") + ": is not the root of a Linux host: it has no proc/meminfo");
  EXPECT_TRUE(directory_.Names().empty());
}

TEST_F(Ksicache, CaptureOfThisMachineIsAGoodFile) {
  const harness::Result result = Run({"capture", Path("a.ksi")});
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
}

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
