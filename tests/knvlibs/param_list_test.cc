// Parameter lists behind the boundary: where texts lie, and what a list that fails keeps.
#include "knvlibs/param_list.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <vector>

namespace ksi {
namespace {

// The entries of a list, numbers in decimal.
std::vector<std::string> Entries(const KSI_ParamList& list) {
  std::vector<std::string> entries;
  for (size_t i = 0; i < list.Count(); ++i) {
    entries.push_back(list.Kind(i) == KeyKind::kNumber ? std::to_string(list.Number(i))
                                                       : std::string(list.Text(i)));
  }
  return entries;
}

using Texts = std::vector<std::string>;

TEST(ParamListText, KeepsEveryByteAndATerminator) {
  KSI_ParamList list(4);
  const std::string bytes("a\0b\xff", 4);
  ASSERT_EQ(list.AddText(bytes), kOk);
  ASSERT_EQ(list.AddText(""), kOk);
  EXPECT_EQ(list.Text(0), bytes);
  EXPECT_EQ(list.Text(0).data()[4], '\0');
  EXPECT_EQ(list.Text(1), "");
  EXPECT_EQ(list.Text(1).data()[0], '\0');
}

TEST(ParamListText, LiesWhereItLayWhateverComesAfterIt) {
  KSI_ParamList list(KSI_ParamList::kNoLimit);
  ASSERT_EQ(list.AddText("first"), kOk);
  const char* first = list.Text(0).data();
  const std::string large(size_t{1} << 20, 'x');
  ASSERT_EQ(list.AddText(large), kOk);
  ASSERT_EQ(list.AddText("after"), kOk);
  EXPECT_EQ(list.Text(0).data(), first);
  EXPECT_EQ(list.Text(1), large);
  EXPECT_EQ(list.Text(2), "after");
}

TEST(ParamListText, IsTakenAgainAfterARemoval) {
  KSI_ParamList list(KSI_ParamList::kNoLimit);
  const std::string large(size_t{1} << 20, 'x');
  for (int i = 0; i < 100; ++i) {
    ASSERT_EQ(list.AddText("small"), kOk);
    ASSERT_EQ(list.AddText(large), kOk);
    list.RemoveLast();
  }
  EXPECT_EQ(list.Count(), 100U);
  EXPECT_EQ(list.Text(99), "small");
  while (list.Count() > 0) list.RemoveLast();
  list.RemoveLast();
  EXPECT_EQ(list.Count(), 0U);
  ASSERT_EQ(list.AddText("again"), kOk);
  EXPECT_EQ(list.Text(0), "again");
}

TEST(ParamListRoom, IsForTextsAndTheirTerminators) {
  KSI_ParamList list(8, 6);
  EXPECT_EQ(list.AddText("12345"), kOk);
  EXPECT_EQ(list.AddText(""), KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(list.AddNumber(7), kOk);
  EXPECT_EQ(Entries(list), (Texts{"12345", "7"}));

  KSI_ParamList none(2, 0);
  EXPECT_EQ(none.AddText(""), KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(none.AddNumber(std::numeric_limits<uint64_t>::max()), kOk);
  EXPECT_EQ(none.Number(0), std::numeric_limits<uint64_t>::max());
}

TEST(ParamListAppend, AddsEntriesOfBothKinds) {
  KSI_ParamList from(2);
  ASSERT_EQ(from.AddNumber(7), kOk);
  ASSERT_EQ(from.AddText("seven"), kOk);
  KSI_ParamList to(3);
  ASSERT_EQ(to.AddText("before"), kOk);
  EXPECT_EQ(to.Append(from), kOk);
  EXPECT_EQ(Entries(to), (Texts{"before", "7", "seven"}));
  EXPECT_EQ(from.Count(), 2U);
}

TEST(ParamListAppend, AddsAllOrNothing) {
  KSI_ParamList from(3);
  ASSERT_EQ(from.AddText("one"), kOk);
  ASSERT_EQ(from.AddNumber(2), kOk);
  ASSERT_EQ(from.AddText("three"), kOk);

  KSI_ParamList full(3);
  ASSERT_EQ(full.AddText("before"), kOk);
  EXPECT_EQ(full.Append(from), KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(Entries(full), Texts{"before"});

  KSI_ParamList narrow(8, 12);  // "before" and "one", not "three"
  ASSERT_EQ(narrow.AddText("before"), kOk);
  EXPECT_EQ(narrow.Append(from), KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(Entries(narrow), Texts{"before"});
  EXPECT_EQ(narrow.AddText("free"), kOk);
}

}  // namespace
}  // namespace ksi
