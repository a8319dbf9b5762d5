#include "framework/name_list.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace tally {
namespace {

std::vector<std::string> Words(std::string_view list) {
  NameReader reader(list);
  std::vector<std::string> words;
  for (std::string_view word; reader.Next(word);) words.emplace_back(word);
  return words;
}

TEST(NameReader, GivesTheWordsBetweenColons) {
  EXPECT_EQ(Words("name:consumed:b"), (std::vector<std::string>{"name", "consumed", "b"}));
  EXPECT_EQ(Words("name"), std::vector<std::string>{"name"});
  EXPECT_EQ(Words(" a :b "), (std::vector<std::string>{" a ", "b "}));
}

TEST(NameReader, PassesOverEmptyWords) {
  EXPECT_EQ(Words("::a:::b::"), (std::vector<std::string>{"a", "b"}));
  EXPECT_TRUE(Words("").empty());
  EXPECT_TRUE(Words(":::").empty());
}

TEST(SameName, DiffersInNothingButCase) {
  EXPECT_TRUE(SameName("MemSize", "memsize"));
  EXPECT_FALSE(SameName("mem", "memSize"));
  EXPECT_FALSE(SameName("memSize", "mem"));
  EXPECT_TRUE(SameName("", ""));
}

TEST(NameWriter, JoinsWhatWasTaken) {
  NameWriter names;
  EXPECT_EQ(names.text(), "(all)");
  names.Put("a", true);
  EXPECT_EQ(names.text(), "(all)");
  names.Put("b", false);
  names.Put("c", true);
  EXPECT_EQ(names.text(), "a:c");
}

TEST(NameWriter, SaysThatNothingWasTaken) {
  NameWriter names;
  names.Put("a", false);
  EXPECT_EQ(names.text(), "(none)");
}

TEST(NameWriter, CutsWhatDoesNotFit) {
  const std::string name(400, 'n');
  NameWriter names;
  names.Put("first", false);
  for (int i = 0; i < 3; ++i) names.Put(name, true);
  EXPECT_EQ(names.text(), (name + ":" + name + ":" + name).substr(0, 1024));
  names.Put("more", true);
  EXPECT_EQ(names.text().size(), 1024U);
}

}  // namespace
}  // namespace tally
