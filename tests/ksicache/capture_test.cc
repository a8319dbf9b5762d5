// capture.
#include <sys/stat.h>

#include <algorithm>
#include <cstring>
#include <filesystem>
#include <map>
#include <sstream>
#include <string>
#include <utility>

#include "knvlibs/open_cache.h"
#include "tests/knvlibs/host_tree.h"
#include "tests/ksicache/ksicache_fixture.h"

namespace ksi {
namespace {

TEST_F(Ksicache, CaptureRecordsAHost) {
  const HostTree host;
  host.Write("/proc/sys/kernel/hostname", "recorded.example.org\n");
  host.Write("/proc/meminfo", "MemTotal: 1000 kB\n");
  const harness::Result result = Run({"capture", Path("a.ksi"), "--root", host.Root()});
  // A meminfo that lacks most is no healthy host's.
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.out.find(Path("a.ksi") + ": "), 0u);
  EXPECT_NE(result.out.find("\nfailed     3: sched/groups/stats/memoryStats [0] (0xbad0099 "),
            result.out.npos);
  EXPECT_NE(result.out.find(" of recorded.example.org\n"), result.out.npos) << result.out;
  // What the library says is told, and counted.
  const auto diagnostics = std::ranges::count(result.err, '\n');
  EXPECT_GT(diagnostics, 0);
  EXPECT_EQ(result.err.find("ksicache: /proc/meminfo: "), 0u) << result.err;
  // The superuser was refused nothing.
  const std::string word = "\nno value   figures without one may have been refused; diagnostics: ";
  EXPECT_NE(result.out.find(word + std::to_string(diagnostics) +
                            (geteuid() == 0 ? "\nfailed " : "\n           run it as root ")),
            result.out.npos)
      << result.out;
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
  std::unique_ptr<Source> cache;
  ASSERT_EQ(OpenCacheSource(Path("a.ksi").c_str(), &cache), kOk);
  LinuxSource host(root);
  EXPECT_EQ(HostText(*cache), HostText(host));
}

// Nothing fails for the library, but what is below cannot be known.
TEST_F(Ksicache, CaptureThatLeavesOutWhatCannotBeReadHasFailed) {
  const std::string root = Path("host");
  std::filesystem::copy(RecordedHost("kvm-two-nodes"), root,
                        std::filesystem::copy_options::recursive);
  const std::string file = "/sys/fs/cgroup/cgroup.controllers";
  std::filesystem::remove(root + file);
  std::filesystem::create_directory(root + file);
  const harness::Result result = Run({"capture", Path("a.ksi"), "--root", root});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: " + file +
                            ": Is a directory: what cannot be read is left out or has no value\n");
  EXPECT_EQ(result.out.find("\nfailed"), result.out.npos) << result.out;
  EXPECT_TRUE(
      result.out.ends_with("\nleft out   what could not be read: 0xbad0055 Is a directory\n"))
      << result.out;
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
}

TEST_F(Ksicache, CaptureThatLeavesOutWhatIsNotUnderstoodHasFailed) {
  const std::string root = Path("host");
  std::filesystem::copy(RecordedHost("kvm-two-nodes"), root,
                        std::filesystem::copy_options::recursive);
  std::filesystem::create_directory(root + "/proc/4000000");
  WriteContent(root + "/proc/4000000/status", "");
  const harness::Result result = Run({"capture", Path("a.ksi"), "--root", root});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.err, "ksicache: /proc/4000000/status: line 1 is not understood\n");
  EXPECT_EQ(result.out.find("\nfailed"), result.out.npos) << result.out;
  EXPECT_EQ(result.out.find("CAP_"), result.out.npos) << result.out;
  EXPECT_NE(result.out.find("\nleft out   what could not be read: 0xbad0099 "), result.out.npos)
      << result.out;
}

TEST_F(Ksicache, CaptureTellsWhatTheSuperuserIsRefused) {
  if (geteuid() != 0) GTEST_SKIP() << "only root can be without the rights of root";
  const std::string root = Path("host");
  std::filesystem::copy(RecordedHost("kvm-two-nodes"), root,
                        std::filesystem::copy_options::recursive);
  const std::string file = root + "/sys/fs/cgroup/cgroup.controllers";
  ASSERT_EQ(chmod(file.c_str(), 0), 0);
  harness::Program program = Command({"capture", Path("a.ksi"), "--root", root});
  const std::string ksicache = program.path;
  program.path = "/usr/bin/setpriv";
  if (access(program.path.c_str(), X_OK) != 0) GTEST_SKIP() << "setpriv is not installed";
  program.args[0] = ksicache;
  program.args.insert(program.args.begin(), {"setpriv", "--bounding-set=-all", "--inh-caps=-all"});
  const harness::Result result = harness::RunProgram(program);
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_EQ(result.err,
            "ksicache: /sys/fs/cgroup/cgroup.controllers: not permitted: all cgroups are left "
            "out\n");
  EXPECT_NE(result.out.find("diagnostics: 1\n           it needs CAP_SYS_PTRACE and "
                            "CAP_DAC_READ_SEARCH to read all\n"),
            result.out.npos)
      << result.out;
}

#ifndef TALLY_SANITIZED  // which has functions of its own in these places
TEST_F(Ksicache, CaptureWhoseHostsNameCannotBeReadHasFailed) {
  const TestDirectory counts;
  const std::string root = counts.Path("host");
  std::filesystem::copy(RecordedHost("kvm-two-nodes"), root,
                        std::filesystem::copy_options::recursive);
  std::filesystem::create_directories(root + "/proc/sys/kernel");
  WriteContent(root + "/proc/sys/kernel/hostname", "web\n");
  harness::Program program = Command({"capture", Path("a.ksi"), "--root", root});
  program.environment.emplace_back("LD_PRELOAD=" TALLY_FAIL_NTH);
  program.environment.push_back("FAIL_COUNTS=" + counts.Path("counts"));
  ASSERT_EQ(harness::RunProgram(program).status, 0);
  std::istringstream lines(FileContent(counts.Path("counts")));
  std::map<std::string, uint64_t> calls;
  std::string kind;
  for (uint64_t count = 0; lines >> kind >> count;) calls[kind] = count;
  const std::string name = root + "/proc/sys/kernel/hostname: ";
  // The last file to be opened and read.
  for (const auto& [call, reason] :
       {std::pair("open", "Too many open files"), std::pair("read", "Input/output error")}) {
    std::filesystem::remove(Path("a.ksi"));
    program.environment.back() = std::string("FAIL=") + call + ":" + std::to_string(calls[call]);
    const harness::Result result = harness::RunProgram(program);
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.err, "ksicache: " + name + reason + "\n");
    EXPECT_NE(result.out.find(" of unknown\n"), result.out.npos) << result.out;
  }
}
#endif

TEST_F(Ksicache, CaptureAsksForNoMemoryNodeThatThereIsNot) {
  const HostTree host;
  host.Write("/proc/meminfo", "MemTotal: 1000 kB\n");
  host.Write("/sys/devices/system/node/has_memory", "0-11\n");
  host.Write("/proc/buddyinfo", "Node 11, zone Normal 1\n");
  host.Write(
      "/proc/zoneinfo",
      "Node 11, zone Normal\n  pages free 1\n min 1\n low 1\n high 1\n present 9\n managed 9\n"
      " protection: (0, 0)\n");
  Run({"capture", Path("a.ksi"), "--root", host.Root()});
  const std::string nodes = Output({"dump", "--json", Path("a.ksi"), "memory/memNodes"});
  EXPECT_NE(nodes.find(R"("keys":[11],"value")"), nodes.npos) << nodes;
  EXPECT_EQ(nodes.find(R"("keys":[12])"), nodes.npos) << nodes;
}

TEST_F(Ksicache, CaptureTakesNoOtherDirectoryForAHost) {
  ExpectFailure({"capture", Path("a.ksi"), "--root", Path("")},
                Path("") + ": is not the root of a Linux host: it has no proc/meminfo");
  EXPECT_TRUE(directory_.Names().empty());
}

TEST_F(Ksicache, CaptureTakesTheNameOfAHostFromAFileAlone) {
  const auto name = [this](const HostTree& host) {
    const harness::Result result =
        Run({"capture", "--force", Path("a.ksi"), "--root", host.Root()});
    const size_t at = result.out.find(" of ") + strlen(" of ");
    return result.out.substr(at, result.out.find('\n') - at);
  };
  const HostTree host;
  host.Write("/proc/meminfo", "MemTotal: 1000 kB\n");
  EXPECT_EQ(name(host), "unknown");
  for (const auto& [content, expected] :
       {std::pair("a", "a"), std::pair("a\nb\n", "a"), std::pair("\n", "unknown"),
        std::pair("\x1b]0;x\n", "\\x1b]0;x")}) {
    host.Write("/proc/sys/kernel/hostname", content);
    EXPECT_EQ(name(host), expected);
  }
  const std::string file = host.Root() + "/proc/sys/kernel/hostname";
  ASSERT_EQ(unlink(file.c_str()), 0);
  ASSERT_EQ(mkfifo(file.c_str(), 0600), 0);
  EXPECT_EQ(name(host), "unknown");

  // What lies outside of the recorded host is no name of it.
  ASSERT_EQ(unlink(file.c_str()), 0);
  const HostTree other;
  other.Write("/secret", "secret\n");
  ASSERT_EQ(symlink((other.Root() + "/secret").c_str(), file.c_str()), 0);
  EXPECT_EQ(name(host), "unknown");
  const harness::Result result = Run({"capture", "--force", Path("a.ksi"), "--root", host.Root()});
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.err.find("ksicache: " + file + ": leads out of the recorded tree\n"),
            std::string::npos)
      << result.err;
}

TEST_F(Ksicache, CaptureOfThisMachineIsAGoodFile) {
  const harness::Result result = Run({"capture", Path("a.ksi")});
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_EQ(Output({"check", Path("a.ksi")}), "");
}

}  // namespace
}  // namespace ksi
