#include "knvlibs/json.h"

#include <gtest/gtest.h>

namespace ksi {
namespace {

// Arrays in one another, a number in the innermost.
std::string Nested(size_t depth) { return std::string(depth, '[') + "1" + std::string(depth, ']'); }

TEST(JsonTest, ReadsWhatIsOneValueAndNothingElse) {
  const std::optional<Json> json =
      ParseJson(R"( {"a": [1, {"b": "x\"\u0041\n"}], "c": -1, "d": null, "e": true, "f": 1.5} )");
  ASSERT_TRUE(json);
  const Json* elements = FindMember(&*json, "a");
  ASSERT_NE(elements, nullptr);
  EXPECT_EQ(NumberOf(&elements->members[0].value), 1u);
  EXPECT_EQ(*TextOf(FindMember(&elements->members[1].value, "b")), "x\"A\n");
  for (const char* broken : {"", "{", "{\"a\"}", "[1,]", "{}x", "\"open", "\"\\q\"", "\"\\u12\"",
                             "tru", "{\"a\":1,}", "01", "\"\xff\"", "[1]]", "// none\n1"}) {
    EXPECT_FALSE(ParseJson(broken)) << broken;
  }
}

TEST(JsonTest, WhatIsOfAnotherKindIsNotThere) {
  const std::optional<Json> json = ParseJson(
      R"({"text": "7", "minus": -7, "half": 7.5, "large": 18446744073709551616, "list": [7]})");
  ASSERT_TRUE(json);
  for (const char* name : {"text", "minus", "half", "large", "list", "missing"}) {
    EXPECT_EQ(NumberOf(FindMember(&*json, name)), std::nullopt) << name;
  }
  EXPECT_EQ(TextOf(FindMember(&*json, "list")), nullptr);
  EXPECT_EQ(FindMember(FindMember(&*json, "list"), "x"), nullptr);
  EXPECT_EQ(FindMember(FindMember(&*json, "missing"), "x"), nullptr);
}

TEST(JsonTest, NestsSoDeepAndNoDeeper) {
  EXPECT_TRUE(ParseJson(Nested(32)));
  EXPECT_FALSE(ParseJson(Nested(34)));
  EXPECT_FALSE(ParseJson(Nested(100'000)));
  EXPECT_FALSE(ParseJson(std::string(100'000, '[')));
}

TEST(JsonTest, IsSoLongAndNoLonger) {
  const size_t kMegabyte = size_t{1} << 20;
  EXPECT_TRUE(ParseJson("\"" + std::string(kMegabyte - 2, 'x') + "\""));
  EXPECT_FALSE(ParseJson("\"" + std::string(kMegabyte - 1, 'x') + "\""));
}

}  // namespace
}  // namespace ksi
