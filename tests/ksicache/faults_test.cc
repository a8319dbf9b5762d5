// capture and load, while the system fails them one call at a time. Nothing ends with a signal, and
// what does not go as ever is told. The file is whole, or what stood there stands there still; and
// nothing else lies beside it.
//
// A run tries some calls of each kind. FULL_SWEEP=1 in the environment tries all, which takes long.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "tests/knvlibs/host_tree.h"
#include "tests/ksicache/ksicache_fixture.h"

// A sanitizer has functions of its own in these places.
#ifndef TALLY_SANITIZED

namespace ksi {
namespace {

struct Writing {
  const char* name;
  const char* command;
  bool replaces = false;
  const char* refused = "";  // what the file system refuses to files without a name
};

constexpr Writing kWritings[] = {
    {.name = "Capture", .command = "capture"},
    {.name = "CaptureReplaces", .command = "capture", .replaces = true},
    {.name = "Load", .command = "load"},
    {.name = "LoadReplaces", .command = "load", .replaces = true},
    {.name = "LoadWithoutUnnamed", .command = "load", .refused = "openat"},
    {.name = "LoadReplacesWithoutLinks", .command = "load", .replaces = true, .refused = "linkat"},
};

void PrintTo(const Writing& writing, std::ostream* stream) { *stream << writing.name; }

// One of each kind, with longer names than a string holds without memory of its own.
constexpr const char* kReadings = R"(
    {"node":"sched/groups/groupName","keys":[4],"value":{"text":"a group with a long name"}},
    {"node":"sched/groups/groupFlags","keys":[4],"status":"0xbad0003"},
    {"node":"sched/groups/members/groups","keys":[0],"instances":[4,5,6,7,8,9,10,11,12]},
    {"node":"system/heaps","keys":[],"instances":["main",{"hex":"ff80ff80ff80ff80ff80"},"modules"]},
    {"node":"system/heaps/stats","keys":["a heap with a long name"],"value":{"size":5}})";

constexpr const char* kOld = "precious";

class WritingFaults : public Ksicache, public testing::WithParamInterface<Writing> {
 protected:
  void SetUp() override {
    words_ = {"capture", "--root", RecordedHost("kvm-two-nodes"), Path("a.ksi")};
    if (GetParam().command == std::string("load")) {
      WriteContent(source_.Path("a.json"), JsonWith(kReadings));
      words_ = {"load", source_.Path("a.json"), Path("a.ksi")};
    }
    if (GetParam().replaces) words_.emplace_back("--force");
  }

  harness::Result RunWith(const std::string& variable) {
    std::filesystem::remove(Path("a.ksi"));
    if (GetParam().replaces) WriteContent(Path("a.ksi"), kOld);
    harness::Program program = Command(words_);
    program.environment.emplace_back("LD_PRELOAD=" TALLY_FAIL_NTH
                                     ":" KSICACHE_WITHOUT_UNNAMED_FILES);
    program.environment.push_back(std::string("REFUSED=") + GetParam().refused);
    program.environment.push_back(variable);
    return harness::RunProgram(program);
  }

  // The file that was made, without the time at which it was.
  std::string Made() const {
    std::string content = FileContent(Path("a.ksi"));
    std::unique_ptr<CacheFile> file;
    if (CacheFile::Open(Path("a.ksi").c_str(), &file) != kOk) return content;
    const std::string& taken = file->GetCapture().taken;
    const size_t at = content.find(taken);
    return at == std::string::npos ? content : content.erase(at, taken.size());
  }

  // How often each kind of call is made.
  std::map<std::string, uint64_t> Counts() {
    const std::string file = source_.Path("counts");
    const harness::Result whole = RunWith("FAIL_COUNTS=" + file);
    EXPECT_EQ(whole.status, 0) << whole.err;
    EXPECT_EQ(whole.err, "");
    made_ = Made();
    std::istringstream lines(FileContent(file));
    std::map<std::string, uint64_t> counts;
    std::string kind;
    for (uint64_t count = 0; lines >> kind >> count;) counts[kind] = count;
    return counts;
  }

  // What stood there before, whatever that was.
  bool IsAsBefore() const {
    return GetParam().replaces ? FileContent(Path("a.ksi")) == kOld
                               : !std::filesystem::exists(Path("a.ksi"));
  }

  // A capture may lack what could not be read: that is in the file and on the lines about it.
  bool IsCaptureWithFailures(const harness::Result& result) const {
    return GetParam().command == std::string("capture") &&
           (result.out.find("\nfailed  ") != std::string::npos ||
            result.out.find("\nleft out  ") != std::string::npos) &&
           Run({"check", Path("a.ksi")}).status == 0;
  }

  void ExpectSoundEnd(const std::string& fault) {
    const harness::Result result = RunWith("FAIL=" + fault);
    EXPECT_TRUE(result.status == 0 || result.status == 1) << fault << ": " << result.status;
    const std::vector<std::string> names = directory_.Names();
    ASSERT_TRUE(names.empty() || names == std::vector<std::string>{"a.ksi"})
        << fault << "\n"
        << result.err << names.back();
    if (result.status == 0) {
      EXPECT_TRUE(Made() == made_) << fault << "\n" << result.out << result.err;
    } else {
      EXPECT_NE(result.err.find("ksicache: "), std::string::npos) << fault << "\n" << result.out;
      EXPECT_TRUE(IsAsBefore() || Made() == made_ || IsCaptureWithFailures(result))
          << fault << "\n"
          << result.out << result.err;
    }
  }

  const TestDirectory source_;
  std::vector<std::string> words_;
  std::string made_;
};

TEST_P(WritingFaults, LeaveTheFileWholeOrAsItWas) {
  const std::map<std::string, uint64_t> counts = Counts();
  ASSERT_GT(counts.at("malloc"), 1000u);
  for (const char* kind : {"open", "write", "stat", "chmod", "fsync", "rename"}) {
    ASSERT_GT(counts.at(kind), 0u) << kind;
  }
  const uint64_t tries = std::getenv("FULL_SWEEP") == nullptr ? 5 : UINT64_MAX;
  for (const auto& [kind, count] : counts) {
    const uint64_t stride = std::max<uint64_t>(1, count / tries);
    for (uint64_t n = 1; n <= count; n += stride) {
      const std::string fault = kind + ":" + std::to_string(n);
      ASSERT_NO_FATAL_FAILURE(ExpectSoundEnd(fault));
      ASSERT_NO_FATAL_FAILURE(ExpectSoundEnd(fault + "+"));
    }
  }
}

// A file that is whole is never called damaged for want of memory.
TEST_F(Ksicache, CheckTellsWantOfMemoryAsSuch) {
  const TestDirectory source;
  WriteContent(source.Path("a.json"), JsonWith(kReadings));
  Output({"load", source.Path("a.json"), Path("a.ksi")});
  harness::Program program = Command({"check", Path("a.ksi")});
  program.environment.emplace_back("LD_PRELOAD=" TALLY_FAIL_NTH);
  program.environment.emplace_back();
  program.environment.back() = "FAIL_COUNTS=" + source.Path("counts");
  EXPECT_EQ(harness::RunProgram(program).status, 0);
  std::istringstream counts(FileContent(source.Path("counts")));
  std::string kind;
  uint64_t count = 0;
  while (kind != "malloc" && counts >> kind >> count) {
  }
  ASSERT_GT(count, 100u);
  for (uint64_t n = 1; n <= count; ++n) {
    program.environment.back() = "FAIL=malloc:" + std::to_string(n);
    const harness::Result result = harness::RunProgram(program);
    EXPECT_EQ(result.out, "") << n;
    EXPECT_TRUE(result.status == 0 ? result.err.empty() : result.status == 1) << n;
    if (result.status == 0) continue;
    EXPECT_TRUE(result.err == "ksicache: out of memory\n" ||
                result.err == "ksicache: " + Path("a.ksi") + ": out of memory\n")
        << n << ": " << result.err;
  }
}

// What is wrong is told even when there is no more memory to word it.
TEST_F(Ksicache, WithoutMemoryErrorsAreTold) {
  harness::Program program = Command({"info", Path("none.ksi")});
  program.environment.emplace_back("LD_PRELOAD=" TALLY_FAIL_NTH);
  program.environment.emplace_back();
  const std::string whole = "ksicache: " + Path("none.ksi") + ": No such file or directory\n";
  harness::Result result;
  for (int n = 1; result.err != whole; ++n) {
    program.environment.back() = "FAIL=malloc:" + std::to_string(n) + "+";
    result = harness::RunProgram(program);
    EXPECT_EQ(result.status, 1) << n;
    ASSERT_TRUE(result.err == whole || result.err == "ksicache: out of memory\n")
        << n << ": " << result.err;
  }
}

INSTANTIATE_TEST_SUITE_P(Commands, WritingFaults, testing::ValuesIn(kWritings),
                         [](const auto& writing) { return writing.param.name; });

}  // namespace
}  // namespace ksi

#endif
