// What is shown of text from outside.
#include "tools/ksicache/printable.h"

#include <gtest/gtest.h>

#include <string>

namespace ksicache {
namespace {

TEST(Printable, PlainTextStaysAsItIs) {
  for (const char* text : {"", "plain \"text\" \\x1b ~", "\xc3\xa9t\xc3\xa9", "\xe2\x82\xac",
                           "\xf0\x9f\x90\xa7", "\xef\xbf\xbd"}) {
    EXPECT_EQ(Printable(text), text);
    EXPECT_EQ(PrintableJson(text), text);
  }
}

TEST(Printable, WhatATerminalMightObeyIsEscaped) {
  struct Case {
    std::string text;
    std::string bytes;
    std::string json;
  };
  const Case cases[] = {
      {std::string(1, '\0'), R"(\x00)", R"(\u0000)"},
      {"\n", R"(\x0a)", R"(\u000a)"},
      {"\x1b[2J", R"(\x1b[2J)", R"(\u001b[2J)"},
      {"\x7f", R"(\x7f)", R"(\u007f)"},
      {"\xc2\x9b"
       "2J",
       R"(\xc2\x9b2J)", R"(\u009b2J)"},
      {"a\xc2\xad"
       "b",
       R"(a\xc2\xadb)", R"(a\u00adb)"},
      {"\xd8\x9c", R"(\xd8\x9c)", R"(\u061c)"},
      {"\xe2\x80\x8b", R"(\xe2\x80\x8b)", R"(\u200b)"},
      {"\xe2\x80\xae", R"(\xe2\x80\xae)", R"(\u202e)"},
      {"\xe2\x81\xa9", R"(\xe2\x81\xa9)", R"(\u2069)"},
      {"\xef\xbb\xbf", R"(\xef\xbb\xbf)", R"(\ufeff)"},
      {"\xf3\xa0\x80\x81", R"(\xf3\xa0\x80\x81)", R"(\udb40\udc01)"},
  };
  for (const Case& each : cases) {
    EXPECT_EQ(Printable(each.text), each.bytes);
    EXPECT_EQ(PrintableJson(each.text), each.json);
    EXPECT_EQ(Printable(each.bytes), each.bytes);
  }
}

TEST(Printable, WhatIsNotUtf8IsEscapedByteByByte) {
  EXPECT_EQ(Printable("\xff\x80"), R"(\xff\x80)");
  EXPECT_EQ(Printable("\xc3"), R"(\xc3)");  // cut off
  EXPECT_EQ(PrintableJson("\xff\x80"), "\xff\x80") << "no character, and JSON has no bytes";
  EXPECT_EQ(Printable("\xe2\x82z"), R"(\xe2\x82z)");
  EXPECT_EQ(Printable("\xc1\x9b"), R"(\xc1\x9b)");  // too long for its character
  EXPECT_EQ(Printable("\xe0\x82\x9b"), R"(\xe0\x82\x9b)");
  EXPECT_EQ(Printable("\xf0\x82\x82\xac"), R"(\xf0\x82\x82\xac)");
  EXPECT_EQ(Printable("\xed\xa0\x80"), R"(\xed\xa0\x80)");          // half a pair
  EXPECT_EQ(Printable("\xf4\x90\x80\x80"), R"(\xf4\x90\x80\x80)");  // beyond the last
  EXPECT_EQ(Printable("\xf8\x88\x80\x80\x80"), R"(\xf8\x88\x80\x80\x80)");
}

}  // namespace
}  // namespace ksicache
