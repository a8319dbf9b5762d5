// What tally exports and needs, and that the installed files work wherever they are put.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "tests/harness/hosts.h"
#include "tests/harness/tally.h"

namespace harness {
namespace {

namespace fs = std::filesystem;

// The output of a tool that must succeed.
std::string Tool(const std::vector<std::string>& words, const std::string& variable = "") {
  Program program;
  program.path = words[0];
  program.args = words;
  program.environment = OwnEnvironment();
  if (!variable.empty()) program.environment.push_back(variable);
  const Result result = RunProgram(program);
  EXPECT_EQ(result.status, 0) << words[0] << ": " << result.err;
  return result.out;
}

size_t Count(const std::string& text, const std::string& part) {
  size_t count = 0;
  for (size_t at = 0; (at = text.find(part, at)) != std::string::npos; at += part.size()) ++count;
  return count;
}

// The lines of `text` that contain `part`.
std::string Lines(const std::string& text, const std::string& part) {
  std::string lines;
  for (size_t at = 0; at < text.size();) {
    const size_t end = text.find('\n', at);
    const std::string line = text.substr(at, end - at);
    if (line.find(part) != std::string::npos) lines += line + "\n";
    at = end == std::string::npos ? text.size() : end + 1;
  }
  return lines;
}

Scenario Host() {
  Scenario scenario;
  AddHostMemory(scenario, {});
  return scenario;
}

TEST(Program, NeedsTheLibraryOnceAndFindsItBesideItself) {
  const std::string dynamic = Tool({TALLY_READELF, "-d", BuiltTally({}).path});
  const std::string needed = Lines(dynamic, "(NEEDED)");
  EXPECT_EQ(Count(needed, "[libknvlibs.so]"), 1U) << needed;
  EXPECT_EQ(Count(needed, "knvlibs"), 1U) << needed;
  EXPECT_NE(Lines(dynamic, "(RUNPATH)").find("$ORIGIN"), std::string::npos) << dynamic;
  EXPECT_EQ(Lines(dynamic, "(RPATH)"), "");
}

TEST(Program, ExportsTheStatusMessages) {
  const std::string symbols =
      Tool({TALLY_NM, "--dynamic", "--defined-only", "--print-size", BuiltTally({}).path});
  EXPECT_NE(Lines(symbols, "KNV_ReturnStatusToString").find(" T KNV_ReturnStatusToString\n"),
            std::string::npos);
  // 352 pointers.
  EXPECT_NE(Lines(symbols, "returnStatusStrs").find(" 0000000000000b00 "), std::string::npos)
      << Lines(symbols, "returnStatusStrs");
}

TEST(Program, UsesNoOtherOperationsThanTheInterface) {
  const std::string undefined =
      Tool({TALLY_NM, "--dynamic", "--undefined-only", BuiltTally({}).path});
  EXPECT_NE(Lines(undefined, "KSI_Get\n").size() + Lines(undefined, " KSI_Get").size(), 0U);
  EXPECT_EQ(Lines(undefined, "dlopen"), "");
  EXPECT_EQ(Lines(undefined, "getenv"), "");
}

TEST(Library, HasTheNameThatProgramsAreLinkedTo) {
  const fs::path library = fs::path(BuiltTally({}).path).parent_path() / "libknvlibs.so";
  EXPECT_NE(Tool({TALLY_READELF, "-d", library}).find("Library soname: [libknvlibs.so]"),
            std::string::npos);
}

TEST(Library, ServesThisMachine) {
  const Result result = RunProgram(BuiltTally({"-r", "comp-stats"}));
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_TRUE(result.out.starts_with("\n COMPREHENSIVE STATS: ")) << result.out;
  EXPECT_EQ(result.err, "");
}

#ifdef TALLY_HARDENED
// The programs and the library, each with a function of it.
struct Binary {
  const char* name;
  const char* function;
};

class Hardening : public testing::TestWithParam<Binary> {
 protected:
  std::string path_ = fs::path(BuiltTally({}).path).parent_path() / GetParam().name;
};

TEST_P(Hardening, MemoryIsNeverBothWrittenAndRun) {
  const std::string segments = Tool({TALLY_READELF, "--segments", "--wide", path_});
  EXPECT_EQ(Lines(segments, "RWE"), "");
  EXPECT_NE(Lines(segments, "GNU_STACK"), "");
}

TEST_P(Hardening, NothingOfTheLinkerStaysWritable) {
  EXPECT_NE(Lines(Tool({TALLY_READELF, "--segments", "--wide", path_}), "GNU_RELRO"), "");
  EXPECT_NE(Lines(Tool({TALLY_READELF, "--dynamic", path_}), "BIND_NOW"), "");
}

TEST_P(Hardening, StandsAnywhereInMemory) {
  EXPECT_NE(Lines(Tool({TALLY_READELF, "--file-header", path_}), "DYN"), "");
}

TEST_P(Hardening, StackIsGuarded) {
  EXPECT_NE(Lines(Tool({TALLY_NM, "--dynamic", "--undefined-only", path_}), "__stack_chk_fail"),
            "");
}

TEST_P(Hardening, ContainersCheckTheirIndexes) {
  EXPECT_NE(Lines(Tool({TALLY_NM, path_}), "__glibcxx_assert_fail"), "");
}

#ifdef TALLY_FORTIFIED
TEST_P(Hardening, CallsOfTheCLibraryAreChecked) {
  EXPECT_NE(Lines(Tool({TALLY_NM, "--dynamic", "--undefined-only", path_}), "_chk@"), "");
}
#endif

#ifdef TALLY_HAS_CF_PROTECTION
// The C library's start files have no such marks, so that the linker leaves the note of the whole
// file away: the functions themselves tell.
TEST_P(Hardening, FunctionsAreMarkedAsPlacesToJumpTo) {
  const std::string code =
      Tool({TALLY_OBJDUMP, std::string("--disassemble=") + GetParam().function, path_});
  EXPECT_NE(Lines(code, "endbr64"), "") << code;
}
#endif

INSTANTIATE_TEST_SUITE_P(All, Hardening,
                         testing::Values(Binary{"tally", "KNV_ReturnStatusToString"},
                                         Binary{"ksicache", "main"},
                                         Binary{"libknvlibs.so", "KSI_Get"}),
                         [](const testing::TestParamInfo<Binary>& binary) {
                           const std::string name = binary.param.name;
                           return name.substr(0, name.find('.'));
                         });
#endif

class Installed : public testing::Test {
 protected:
  void SetUp() override {
    std::string name = testing::TempDir() + "tally-install-XXXXXX";
    ASSERT_NE(mkdtemp(name.data()), nullptr);
    root_ = name;
    Tool({TALLY_CMAKE, "--install", TALLY_BUILD_DIRECTORY, "--prefix", "/usr"},
         "DESTDIR=" + root_.string());
  }

  void TearDown() override { fs::remove_all(root_); }

  // tally, installed; through its directory entry only, so that the tree may have been moved.
  Program Tally(const Args& args) const {
    Program program = BuiltTally(args);
    program.path = root_ / "usr/bin/tally";
    return program;
  }

  fs::path root_;
};

TEST_F(Installed, TallyFindsItsLibrary) {
  const Result result = RunProgram(Tally({"-r", "comp-stats", "-q"}));
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_TRUE(result.out.starts_with("total,discarded,")) << result.out;
  EXPECT_EQ(result.err, "");
}

TEST_F(Installed, TallyFindsItsLibraryAfterAMove) {
  fs::rename(root_ / "usr", root_ / "moved");
  Program program = Tally({"-r", "comp-stats", "-q"});
  program.path = root_ / "moved/bin/tally";
  const Result result = RunProgram(program);
  EXPECT_EQ(result.status, 0) << result.err;
}

TEST_F(Installed, LibraryPathPutsAnotherLibraryInPlace) {
  const TallyRun run = TryTally(Host(), {"-r", "comp-stats", "-q", "-s", "free"}, Tally({}));
  EXPECT_EQ(run.out, "free\n1011264\n");
  EXPECT_TRUE(run.problems.empty());
}

TEST_F(Installed, HeadersAndToolsAreWhereTheyAreExpected) {
  for (const char* header : {"ksi.h", "ksi_nodes.h", "ksi_records.h", "ksi_status.h"}) {
    EXPECT_TRUE(fs::exists(root_ / "usr/include/knvlibs" / header)) << header;
  }
  EXPECT_TRUE(fs::exists(root_ / "usr/bin/ksicache"));
}

TEST_F(Installed, KsicacheReadsThroughTheLibrary) {
  Program ksicache = BuiltTally({});
  ksicache.path = root_ / "usr/bin/ksicache";
  ksicache.args = {"ksicache", "capture", "-"};
  const Result result = RunProgram(ksicache);
  EXPECT_EQ(result.status, 0) << result.err;
  EXPECT_TRUE(result.out.starts_with("SQLite format 3"));
}

}  // namespace
}  // namespace harness
