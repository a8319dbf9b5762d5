#include "knvlibs/characters.h"

#include <gtest/gtest.h>

#include <string>

namespace ksi {
namespace {

TEST(Characters, AreShownUnlessTheyCommandTurnOrHide) {
  for (const char* shown :
       {" ", "~", "\xc2\xa0", "\xc3\xbc", "\xd7\x90", "\xe2\x82\xac", "\xef\xbf\xbd",
        "\xf0\x9f\x90\xa7", "\xcc\x81", "\xe1\x85\x9e", "\xe1\x85\xa1", "\xef\xb7\x8f",
        "\xef\xb7\xb0", "\xef\xb8\x90", "\xef\xbe\xa1", "\xf3\xa0\x87\xb0"}) {
    EXPECT_TRUE(IsShown(FirstOf(shown))) << shown;
    EXPECT_EQ(FirstOf(shown).size, std::string(shown).size());
  }
  for (const char* hidden : {"\x01", "\x1f", "\x7f", "\xc2\x80", "\xc2\x9b", "\xc2\x9f", "\xc2\xad",
                             "\xd8\x9c", "\xe1\xa0\x8e", "\xe2\x80\x8b", "\xe2\x80\x8f",
                             "\xe2\x80\xa8", "\xe2\x80\xae", "\xe2\x81\xa0", "\xe2\x81\xa6",
                             "\xe2\x81\xa9", "\xef\xbb\xbf", "\xef\xbf\xb9", "\xf3\xa0\x80\x81"}) {
    EXPECT_FALSE(IsShown(FirstOf(hidden))) << hidden;
    EXPECT_EQ(FirstOf(hidden).size, std::string(hidden).size());
  }
}

TEST(Characters, WithNoWidthAndThoseThatAreNoneAreNotShown) {
  for (const char* hidden :
       {"\xcd\x8f", "\xe1\x85\x9f", "\xe1\x85\xa0", "\xe1\x9e\xb4", "\xe1\x9e\xb5", "\xe1\xa0\x8b",
        "\xe1\xa0\x8f", "\xe3\x85\xa4", "\xef\xbe\xa0", "\xef\xb8\x80", "\xef\xb8\x8f",
        "\xf3\xa0\x84\x80", "\xf3\xa0\x87\xaf", "\xef\xb7\x90", "\xef\xb7\xaf", "\xef\xbf\xbe",
        "\xef\xbf\xbf", "\xf0\x9f\xbf\xbe", "\xf4\x8f\xbf\xbf"}) {
    EXPECT_FALSE(IsShown(FirstOf(hidden))) << hidden;
    EXPECT_EQ(FirstOf(hidden).size, std::string(hidden).size());
  }
}

TEST(Characters, ABadByteIsOneOfItsOwn) {
  for (const char* bad : {"\x80", "\x9b", "\xff", "\xc3", "\xe2\x82z", "\xc1\x9b", "\xe0\x82\x9b",
                          "\xed\xa0\x80", "\xf4\x90\x80\x80", "\xf8\x88\x80\x80\x80"}) {
    EXPECT_FALSE(IsShown(FirstOf(bad))) << bad;
    EXPECT_EQ(FirstOf(bad).size, 1u) << bad;
  }
}

TEST(Characters, StayWholeWhereATextIsCut) {
  EXPECT_EQ(CutAtCharacter("abc", 3), "abc");
  EXPECT_EQ(CutAtCharacter("abc", 2), "ab");
  EXPECT_EQ(CutAtCharacter("\xc3\xbc\xe2\x82\xac", 5), "\xc3\xbc\xe2\x82\xac");
  EXPECT_EQ(CutAtCharacter("\xc3\xbc\xe2\x82\xac", 4), "\xc3\xbc");
  EXPECT_EQ(CutAtCharacter("\xc3\xbc\xe2\x82\xac", 2), "\xc3\xbc");
  EXPECT_EQ(CutAtCharacter("\xf0\x9f\x90\xa7", 3), "");
}

}  // namespace
}  // namespace ksi
