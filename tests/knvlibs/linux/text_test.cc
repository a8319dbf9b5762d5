#include "knvlibs/linux/host/text.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace ksi {
namespace {

TEST(TextTest, LinesAreNumberedFromOneAndTheLastNeedsNoNewline) {
  const struct {
    std::string text;
    std::vector<std::string> lines;
  } kCases[] = {{"", {}},
                {"\n", {""}},
                {"a", {"a"}},
                {"a\n", {"a"}},
                {"a\n\nb", {"a", "", "b"}},
                {std::string("a\0b\nc", 5), {std::string("a\0b", 3), "c"}}};
  for (const auto& [text, expected] : kCases) {
    std::vector<std::string> seen;
    Lines lines(text);
    std::string_view line;
    EXPECT_EQ(lines.Number(), 0u);
    while (lines.Next(line)) {
      seen.emplace_back(line);
      EXPECT_EQ(lines.Number(), seen.size());
    }
    EXPECT_EQ(seen, expected) << text;
    EXPECT_FALSE(lines.Next(line)) << "the end stays the end";
  }
}

TEST(TextTest, WordsArePartedByBlanks) {
  std::string_view text = " \tone  two\tthree ";
  EXPECT_EQ(TakeWord(text), "one");
  EXPECT_EQ(text, "  two\tthree ");
  EXPECT_EQ(TakeWord(text), "two");
  EXPECT_EQ(TakeWord(text), "three");
  EXPECT_EQ(TakeWord(text), "");
  EXPECT_EQ(text, "");
}

TEST(TextTest, APrefixIsTakenOrLeft) {
  std::string_view text = "VmFlags: rd";
  EXPECT_FALSE(TakePrefix(text, "VmFlag:"));
  EXPECT_EQ(text, "VmFlags: rd");
  EXPECT_TRUE(TakePrefix(text, "VmFlags:"));
  EXPECT_EQ(text, " rd");
  EXPECT_FALSE(TakePrefix(text, " rd "));
}

TEST(TextTest, NumbersAreWholeAndFit) {
  uint64_t number = 0;
  EXPECT_TRUE(ParseNumber("0", number));
  EXPECT_EQ(number, 0u);
  EXPECT_TRUE(ParseNumber("18446744073709551615", number));
  EXPECT_EQ(number, UINT64_MAX);
  for (const char* strange : {"", " 1", "1 ", "+1", "-1", "1.0", "0x1", "18446744073709551616"}) {
    number = 7;
    EXPECT_FALSE(ParseNumber(strange, number)) << strange;
    EXPECT_EQ(number, 7u) << strange;
  }
  EXPECT_TRUE(ParseHex("ffFFffffFFffffFF", number));
  EXPECT_EQ(number, UINT64_MAX);
  for (const char* strange : {"", "0x1", "g", "-1", "10000000000000000"}) {
    EXPECT_FALSE(ParseHex(strange, number)) << strange;
  }
}

TEST(TextTest, TerminalsGetNoCommands) {
  EXPECT_EQ(Printable(std::string("a\0\x1b[2J\x7f\n\t~", 10)), "a??[2J???~");
  EXPECT_EQ(Printable("gr\xc3\xbcn"), "gr\xc3\xbcn");
  EXPECT_EQ(Printable("a\xc2\x9b"
                      "2J\xe2\x80\xae\xe2\x80\x8bz"),
            "a?2J??z");
  EXPECT_EQ(Printable("\x9b"
                      "2J\xff\xe2\x82"),
            "?2J???");
}

}  // namespace
}  // namespace ksi
