// info and dump.
#include <sys/stat.h>

#include <regex>
#include <string>

#include <knvlibs/ksi_status.h>
#include "knvlibs/source.h"
#include "tests/ksicache/ksicache_fixture.h"

namespace ksi {
namespace {

TEST_F(Ksicache, FilesThatCannotBeRead) {
  ExpectFailure({"info", Path("none")}, Path("none") + ": No such file or directory");
  ExpectFailure({"dump", Path("")}, Path("") + ": Is a directory");
  ASSERT_EQ(mkfifo(Path("pipe").c_str(), 0600), 0);
  ExpectFailure({"info", Path("pipe")}, Path("pipe") + ": is not a regular file");
  ExpectFailure({"check", "/dev/null"}, "/dev/null: is not a regular file");
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
  const std::string size = std::to_string(FileContent(Path("host.ksi")).size());
  EXPECT_EQ(Output({"info", Path("host.ksi")}),
            "file       " + Path("host.ksi") +
                "\nhost       test.example.org\ntaken      2026-11-21T10:00:00Z\nsize       " +
                size + " bytes, schema 1\nbuilt      " + std::string(kDefinitions.built) +
                "\nsignature  " + own +
                "\nvalues     8\nlists      5, with 6 instances\nabsent     0\n"
                "refused    1: sched/groups/groupName [9] (0xbad005a Permission denied)\n"
                "failed     1: sched/groups/members/groups [9] (0xbad000a I/O error)\n");
  const std::string other = "00112233445566778899aabbccddeeff";
  RunSql(Path("host.ksi"), "UPDATE capture SET signature = '" + other + "'");
  EXPECT_NE(Output({"info", Path("host.ksi")})
                .find("signature  " + other + ", not " + own + " of this version\n"),
            std::string::npos);
}

TEST_F(Ksicache, InfoTellsTheSizeOfACaptureAskedForByItsTime) {
  WriteSmallHost(Path("host.ksi"));
  const std::string all = Output({"info", Path("host.ksi")});
  const std::string head = "file       " + Path("host.ksi");
  ASSERT_TRUE(all.starts_with(head + "\n"));
  // And its age.
  const std::string last = std::regex_replace(Output({"info", Path("host.ksi@last")}),
                                              std::regex("\nage        [0-9d :]{8,}\n"), "\n");
  EXPECT_EQ(last, head + "@last" + all.substr(head.size()));
}

TEST_F(Ksicache, InfoTellsFailedReadsApart) {
  WriteSmallHost(Path("host.ksi"));
  const std::string update = "UPDATE reading SET answer = NULL, status = ";
  RunSql(Path("host.ksi"),
         update + std::to_string(KSI_STATUS_NOT_FOUND) + " WHERE key1 = 0; " + update +
             std::to_string(KSI_STATUS_NO_HANDLER) + " WHERE key1 = ''; " + update +
             std::to_string(KSI_STATUS_READ_ERROR) + " WHERE key1 = 7 OR key1 = 9");
  const std::string info = Output({"info", Path("host.ksi")});
  EXPECT_NE(info.find("values     2\nlists      1, with 2 instances\nabsent     6\nrefused    0\n"
                      "failed     6: sched/groups/groupName [7] (0xbad000b Read error), "
                      "sched/groups/groupFlags [7] (0xbad000b Read error), "
                      "sched/groups/members/groups [7] (0xbad000b Read error) and 3 more\n"),
            info.npos)
      << info;
}

TEST_F(Ksicache, InfoBelievesNoCountOfADamagedFile) {
  WriteSmallHost(Path("host.ksi"));
  RunSql(Path("host.ksi"),
         "UPDATE reading SET answer = 9223372036854775807 WHERE typeof(answer) = 'integer'");
  EXPECT_NE(
      Output({"info", Path("host.ksi")}).find("lists      5, with 9223372036854775807 instances\n"),
      std::string::npos);
}

TEST_F(Ksicache, InfoShowsTheGoodOnesOfSeveralFiles) {
  WriteSmallHost(Path("host.ksi"));
  const std::string one = Output({"info", Path("host.ksi")});
  EXPECT_EQ(Output({"info", Path("host.ksi"), Path("host.ksi")}), one + "\n" + one);
  const harness::Result result = Run({"info", Path("none"), Path("host.ksi"), "/dev/null"});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.out, one);
  EXPECT_EQ(result.err,
            "ksicache: " + Path("none") +
                ": No such file or directory\nksicache: /dev/null: is not a regular file\n");
}

// Each page in turn is no longer one of a tree.
TEST_F(Ksicache, NothingShowsADamagedFileAsAWholeOne) {
  const std::string file = Path("host.ksi");
  WriteSmallHost(file);
  const std::string good = FileContent(file);
  constexpr size_t kPageSize = 4096;
  ASSERT_GT(good.size(), 3 * kPageSize);
  for (size_t page = kPageSize; page < good.size(); page += kPageSize) {
    std::string bad = good;
    bad[page] = 1;
    WriteContent(file, bad);
    for (const std::vector<std::string>& command :
         {std::vector<std::string>{"dump", file}, {"dump", "--json", file}, {"check", file}}) {
      const harness::Result result = Run(command);
      EXPECT_EQ(result.status, 1) << command[0] << " " << page;
      EXPECT_NE(result.err + (command[0] == "check" ? result.out : ""), "") << page;
    }
  }
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
  const auto expect = [this](const std::string& name, const std::string& message) {
    ExpectFailure({"dump", Path("host.ksi"), "system/heaps", name}, message, 2);
  };
  expect("system/piles", "there is no node system/piles; is it system/heaps?");
  expect("groupname", "there is no node groupname; is it sched/groups/groupName?");
  expect("sched/group/groupFlags",
         "there is no node sched/group/groupFlags; is it sched/groups/groupFlags?");
  // A third of it may be wrong: changed, left out or put in.
  expect("graapNaye", "there is no node graapNaye; is it sched/groups/groupName?");
  expect("memorStat", "there is no node memorStat; is it sched/groups/stats/memoryStats?");
  expect("memInfoxyz", "there is no node memInfoxyz; is it memory/memInfo?");
  expect("memInfowxyz", "there is no node memInfowxyz");
  expect("zzz", "there is no node zzz");
  expect("", "there is no node ");
  expect(std::string(1000, 'x'), "there is no node " + std::string(1000, 'x'));
}

TEST_F(Ksicache, DumpNamesTheNodesBelowAName) {
  WriteSmallHost(Path("host.ksi"));
  for (const char* name : {"sched/groups/stats", "sched/groups/stats/"}) {
    const harness::Result result = Run({"dump", Path("host.ksi"), name});
    EXPECT_EQ(result.status, 2);
    EXPECT_EQ(result.out, "");
    EXPECT_EQ(result.err,
              "ksicache: sched/groups/stats is no node, but below it are\n"
              "  sched/groups/stats/capacity\n"
              "  sched/groups/stats/memoryStats\n");
  }
  // What is both is a node.
  EXPECT_EQ(Output({"dump", Path("host.ksi"), "memory/pmem/volumes"}), "\nmemory/pmem/volumes\n");
}

TEST_F(Ksicache, DumpEscapesWhatATerminalMightObey) {
  WriteSmallHost(Path("host.ksi"));
  RunSql(Path("host.ksi"),
         "UPDATE instance SET entry = CAST(x'1b5b6dc29be280aeff' AS TEXT) "
         "WHERE position = 0 AND key1 = ''; "
         "UPDATE instance SET entry = CAST(x'c3a9e2808bf3a08081c29b' AS TEXT) "
         "WHERE position = 1 AND key1 = ''");
  EXPECT_EQ(Output({"dump", Path("host.ksi"), "system/heaps"}),
            "\nsystem/heaps\n    {\"hex\":\"1b5b6dc29be280aeff\"}\n"
            "    \xc3\xa9\\xe2\\x80\\x8b\\xf3\\xa0\\x80\\x81\\xc2\\x9b\n");
  const std::string json = Output({"dump", "--json", Path("host.ksi"), "system/heaps"});
  EXPECT_NE(json.find("\"instances\":[{\"hex\":\"1b5b6dc29be280aeff\"},"
                      "\"\xc3\xa9\\u200b\\udb40\\udc01\\u009b\"]}"),
            json.npos)
      << json;
  // Nothing is lost by it.
  WriteContent(Path("host.json"), json);
  Output({"load", Path("host.json"), Path("again.ksi")});
  EXPECT_EQ(Output({"dump", "--json", Path("again.ksi")}), json);
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

}  // namespace
}  // namespace ksi
