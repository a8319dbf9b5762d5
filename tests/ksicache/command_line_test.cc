// The command line of ksicache, its help and its output.
#include <cstring>

#include "tests/harness/golden.h"
#include "tests/ksicache/ksicache_fixture.h"

namespace ksi {
namespace {

TEST_F(Ksicache, HelpAndVersion) {
  EXPECT_EQ(Output({"--help"})
                .find("Usage: ksicache capture FILE [--force] [--mode MODE] [--root DIR]\n"),
            0u);
  EXPECT_EQ(Output({"-h"}), Output({"--help"}));
  EXPECT_EQ(Output({"--version"}), "ksicache " KSICACHE_VERSION "\n");
}

constexpr const char* kCommands[] = {"capture", "record", "moments", "extract", "join", "info",
                                     "dump",    "diff",   "export",  "page",    "load", "check"};

TEST_F(Ksicache, HelpSaysAll) {
  std::string text = Output({"--help"});
  for (const char* command : kCommands) {
    text += "\n" + Output({command, "--help"});
  }
  harness::ExpectGolden("ksicache/help.txt", text);
}

TEST_F(Ksicache, EachCommandHasItsHelp) {
  EXPECT_EQ(Output({"dump", "--help"}), R"(Usage: ksicache dump FILE [NODE...] [--json]

Shows what FILE holds, each field of each record with its unit, of all nodes or
of those named, such as sched/groups/groupName.

Options:
      --json  print JSON
  -h, --help  show this message
)");
  const std::string help = Output({"--help"});
  for (const std::string command : kCommands) {
    const std::string own = Output({"-h", command});
    const std::string usage = own.substr(0, own.find('\n')).substr(strlen("Usage: "));
    EXPECT_TRUE(usage.starts_with("ksicache " + command + " ")) << usage;
    EXPECT_NE(help.find(usage + "\n"), help.npos) << usage;
  }
}

TEST_F(Ksicache, HelpFitsAScreen) {
  std::string lines = Output({"--help"});
  for (const char* command : kCommands) lines += Output({"-h", command}) + Run({command}).err;
  for (size_t begin = 0, end = 0; (end = lines.find('\n', begin)) != lines.npos; begin = end + 1) {
    EXPECT_LE(end - begin, 80u) << lines.substr(begin, end - begin);
  }
  ExpectFailure({"record"},
                "not as in:\nUsage: ksicache record FILE [--every TIME] [--keep TIME] "
                "[--max-size SIZE]\n                       [--count N] [--mode MODE] [--root DIR]",
                2);
}

TEST_F(Ksicache, WrongCommandLines) {
  ExpectFailure({}, "which command?", 2);
  ExpectFailure({"melt", "x"}, "there is no command melt", 2);
  ExpectFailure({"info"}, "not as in: ksicache info FILE[@WHEN]...", 2);
  ExpectFailure({"check"}, "not as in: ksicache check FILE...", 2);
  ExpectFailure({"capture", "a", "b"},
                "not as in: ksicache capture FILE [--force] [--mode MODE] [--root DIR]", 2);
  ExpectFailure({"capture"},
                "not as in: ksicache capture FILE [--force] [--mode MODE] [--root DIR]", 2);
  ExpectFailure({"dump"}, "not as in: ksicache dump FILE [NODE...] [--json]", 2);
  ExpectFailure({"load", "a"}, "not as in: ksicache load JSON FILE [--force] [--mode MODE]", 2);
  ExpectFailure({"load", "a", "b", "c"},
                "not as in: ksicache load JSON FILE [--force] [--mode MODE]", 2);
  ExpectFailure({"info", "--force", "x"}, "info does not take --force", 2);
  ExpectFailure({"load", "--root", "/", "a", "b"}, "load does not take --root", 2);
  ExpectFailure({"record", "-"}, "a recording is a file, not standard output", 2);
  ExpectFailure({"record", "--every", "0s", "a"},
                "--every takes a time such as 5s, 10m, 6h or 7d: 0s", 2);
  ExpectFailure({"record", "--keep", "1w", "a"},
                "--keep takes a time such as 5s, 10m, 6h or 7d: 1w", 2);
  ExpectFailure({"record", "--max-size", "2", "a"}, "--max-size is at least 4M", 2);
  ExpectFailure({"record", "--max-size", "9999999T", "a"},
                "--max-size takes a size such as 500M or 2G: 9999999T", 2);
  ExpectFailure({"record", "--count", "-1", "a"}, "--count takes a number from 1 on: -1", 2);
  ExpectFailure({"moments", "--every", "1s", "a"}, "moments does not take --every", 2);
  ExpectFailure({"info", "--fast", "x"}, "unknown or incomplete option --fast", 2);
  ExpectFailure({"capture", "x", "--root"}, "unknown or incomplete option --root", 2);
  for (const char* mode : {"", "9", "1777", "u+r", "0640 "}) {
    ExpectFailure({"load", "a", "b", "--mode", mode},
                  "--mode takes up to 0777, in octal digits, such as 0640", 2);
  }
}

// What comes from outside reaches nobody's terminal as it is.
TEST_F(Ksicache, MessagesAreEscaped) {
  ExpectFailure({"\x1b[2J\xc2\x9b\n"}, R"(there is no command \x1b[2J\xc2\x9b\x0a)", 2);
  ExpectFailure({"info", "\xe2\x80\xae\xff"}, R"(\xe2\x80\xae\xff: No such file or directory)");
  ExpectFailure({std::string(9000, 'x')}, "there is no command " + std::string(8172, 'x') + "...",
                2);
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

}  // namespace
}  // namespace ksi
