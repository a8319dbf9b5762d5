// What the library and its test double export: each name that the public headers give, and nothing
// that happens to be inside.
#include <gtest/gtest.h>

#include <fstream>
#include <regex>
#include <set>
#include <sstream>
#include <string>

#include <knvlibs/ksi_nodes.h>
#include "tests/harness/program.h"

namespace harness {
namespace {

using Names = std::set<std::string>;

// The dynamic symbols of a file, as nm's option `which` selects them.
Names Symbols(const std::string& file, const std::string& which) {
  Program nm;
  nm.path = TALLY_NM;
  nm.args = {TALLY_NM, "--dynamic", which, "--format=just-symbols", file};
  nm.environment = OwnEnvironment();
  const Result result = RunProgram(nm);
  EXPECT_EQ(result.status, 0) << result.err;
  std::istringstream lines(result.out);
  Names names;
  for (std::string line; std::getline(lines, line);) names.insert(line);
  return names;
}

Names Nodes() {
  return {
#define NODE(name, record, keys, entries, listKeys, meaning) "KSI_NODE_" #name,
      KSI_NODES(NODE)
#undef NODE
  };
}

// The operations that ksi.h declares.
Names Operations() {
  std::ifstream file(TALLY_HEADERS "/knvlibs/ksi.h");
  std::stringstream content;
  content << file.rdbuf();
  const std::string text =
      std::regex_replace(content.str(), std::regex(R"(/\*([^*]|\*(?!/))*\*/)"), "");
  const std::regex declaration(R"(\b((KSI|Str)_\w+|Warning)\()");
  Names names;
  for (std::sregex_iterator at(text.begin(), text.end(), declaration), end; at != end; ++at) {
    names.insert((*at)[1]);
  }
  return names;
}

Names Joined(Names names, const Names& more) {
  names.insert(more.begin(), more.end());
  return names;
}

TEST(Exports, OfTheLibraryAreThoseOfItsHeaders) {
  EXPECT_EQ(Symbols(TALLY_LIBRARY, "--defined-only"), Joined(Operations(), Nodes()));
}

// A library of another maker has no more than these.
TEST(Exports, OfTheDoubleAreWhatEveryLibraryHas) {
  Names others = {"time"};  // the clock that it sets
  for (const std::string& name : Symbols(TALLY_DOUBLE, "--defined-only")) {
    if (!Operations().contains(name) && !Nodes().contains(name)) others.insert(name);
  }
  EXPECT_EQ(others, Names{"time"});
  for (const std::string added : {"KSI_OpenHost", "KSI_SourceGet", "KSI_StatusText"}) {
    EXPECT_FALSE(Symbols(TALLY_DOUBLE, "--defined-only").contains(added)) << added;
  }
}

TEST(Exports, OfTheDoubleAreAllThatTheProgramNeeds) {
  const Names defined = Symbols(TALLY_DOUBLE, "--defined-only");
  const Names strong = Symbols(TALLY_PROGRAM, "--no-weak");  // it does without the others
  for (const std::string& name : Symbols(TALLY_PROGRAM, "--undefined-only")) {
    if (!strong.contains(name)) continue;
    if (Operations().contains(name) || Nodes().contains(name)) {
      EXPECT_TRUE(defined.contains(name)) << name;
    }
  }
}

}  // namespace
}  // namespace harness
