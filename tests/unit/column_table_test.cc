#include "framework/column_table.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace tally {
namespace {

constexpr ColumnDesc kEnd = {};

ColumnDesc Numbers(const char* name, uint8_t width) {
  return {name, "A number", width, "Lu", 1, 0, 1};
}

ColumnDesc Texts(const char* name, uint8_t width) { return {name, "A text", width, "s", 0, 0, 1}; }

// What `print` writes to standard output.
template <class Print>
std::string Printed(Print print) {
  testing::internal::CaptureStdout();
  print();
  return testing::internal::GetCapturedStdout();
}

std::string Row(const std::vector<ColumnDesc>& table, const std::vector<Cell>& cells) {
  return Printed([&] { PrintRow(table.data(), false, false, cells); });
}

std::string TotalRow(const std::vector<ColumnDesc>& table, const std::vector<Cell>& cells) {
  return Printed([&] { PrintRow(table.data(), false, true, cells); });
}

std::string CsvRow(const std::vector<ColumnDesc>& table, const std::vector<Cell>& cells) {
  return Printed([&] { PrintRow(table.data(), true, false, cells); });
}

std::string CsvTotalRow(const std::vector<ColumnDesc>& table, const std::vector<Cell>& cells) {
  return Printed([&] { PrintRow(table.data(), true, true, cells); });
}

std::string Selected(const std::vector<ColumnDesc>& table) {
  return std::string(FormatSelectedColumns(table.data()).text());
}

TEST(MaskContains, ComparesWordsInAnyCase) {
  EXPECT_TRUE(MaskContains("name:consumed", "name"));
  EXPECT_TRUE(MaskContains("name:CONSUMED", "consumed"));
  EXPECT_TRUE(MaskContains("NaMe", "nAmE"));
  EXPECT_FALSE(MaskContains("name:consumed", "nam"));
  EXPECT_FALSE(MaskContains("name:consumed", "name:consumed"));
  EXPECT_FALSE(MaskContains("bogus", "name"));
}

TEST(MaskContains, PassesOverEmptyWords) {
  EXPECT_TRUE(MaskContains(":::name:::free", "free"));
  EXPECT_FALSE(MaskContains("", "name"));
  EXPECT_FALSE(MaskContains(":::", "name"));
  EXPECT_FALSE(MaskContains(":::", ""));
}

TEST(MaskContains, SeesTheFirst128CharactersOnly) {
  const std::string filler(123, 'x');
  EXPECT_TRUE(MaskContains(filler + ":name", "name"));
  EXPECT_FALSE(MaskContains(filler + "x:name", "name"));
  EXPECT_TRUE(MaskContains(filler + "x:name", "nam"));
  EXPECT_TRUE(MaskContains(filler + ":names", "name"));
  EXPECT_FALSE(MaskContains(std::string(128, 'x') + ":name", "name"));
}

TEST(ApplyColumnSelection, HidesWhatTheMaskDoesNotHold) {
  std::vector<ColumnDesc> table = {Numbers("gid", 8), Numbers("a", 8), Numbers("b", 8), kEnd};
  table[0].fixed = 1;
  ApplyColumnSelection(table.data(), "B:bogus");
  EXPECT_EQ(Selected(table), "gid:b");
}

TEST(ApplyColumnSelection, NeverShowsAHiddenColumn) {
  std::vector<ColumnDesc> table = {Numbers("a", 8), Numbers("b", 8), kEnd};
  table[1].selected = 0;
  ApplyColumnSelection(table.data(), "a:b");
  EXPECT_EQ(Selected(table), "a");
  ApplyColumnSelection(table.data(), nullptr);
  EXPECT_EQ(Selected(table), "a");
}

TEST(ApplyColumnSelection, WidensEveryColumnToItsName) {
  std::vector<ColumnDesc> table = {Numbers("longerName", 3), Numbers("hidden", 2),
                                   Numbers("wide", 20), kEnd};
  table[1].selected = 0;
  ApplyColumnSelection(table.data(), nullptr);
  EXPECT_EQ(table[0].width, 10);
  EXPECT_EQ(table[1].width, 6);
  EXPECT_EQ(table[2].width, 20);
}

TEST(ApplyColumnSelection, KeepsEightBitsOfALength) {
  const std::string name(259, 'n');
  std::vector<ColumnDesc> table = {Numbers(name.c_str(), 10), kEnd};
  ApplyColumnSelection(table.data(), nullptr);
  EXPECT_EQ(table[0].width, 3);
}

TEST(FormatSelectedColumns, NamesAllSomeOrNone) {
  std::vector<ColumnDesc> table = {Numbers("a", 8), Numbers("b", 8), Numbers("c", 8), kEnd};
  EXPECT_EQ(Selected(table), "(all)");
  table[1].selected = 0;
  EXPECT_EQ(Selected(table), "a:c");
  table[0].selected = 0;
  EXPECT_EQ(Selected(table), "c");
  table[2].selected = 0;
  EXPECT_EQ(Selected(table), "(none)");
  EXPECT_EQ(Selected({kEnd}), "(all)");
}

TEST(PrintDashes, DrawsALineAsWideAsTheTable) {
  std::vector<ColumnDesc> table = {Numbers("a", 3), Numbers("b", 2), Numbers("c", 1), kEnd};
  EXPECT_EQ(Printed([&] { PrintDashes(table.data(), false); }), "--------\n");
  table[1].selected = 0;
  EXPECT_EQ(Printed([&] { PrintDashes(table.data(), false); }), "-----\n");
  EXPECT_EQ(Printed([&] { PrintDashes(table.data(), true); }), "");
  EXPECT_EQ(Printed([&] { PrintDashes(&kEnd, false); }), "\n");
}

TEST(PrintHeader, PutsLabelsRightAligned) {
  std::vector<ColumnDesc> table = {Numbers("a", 3), Numbers("hide", 4), Texts("c", 2), kEnd};
  table[1].selected = 0;
  EXPECT_EQ(Printed([&] { PrintHeader(table.data(), false); }), "  a  c\n");
  EXPECT_EQ(Printed([&] { PrintHeader(table.data(), true); }), "a,c\n");
  EXPECT_EQ(Printed([&] { PrintHeader(&kEnd, false); }), "\n");
}

TEST(PrintHeader, TakesTheRoomOfALongLabelFromTheNext) {
  const std::vector<ColumnDesc> table = {Numbers("label", 3), Numbers("b", 4), kEnd};
  EXPECT_EQ(Printed([&] { PrintHeader(table.data(), false); }), "label  b\n");
}

TEST(PrintRow, PrintsEachConversion) {
  const std::vector<ColumnDesc> table = {{"lu", "", 21, "Lu", 1, 0, 1},
                                         {"ld", "", 21, "Ld", 1, 0, 1},
                                         {"u", "", 11, "u", 1, 0, 1},
                                         {"d", "", 12, "d", 1, 0, 1},
                                         {"c", "", 2, "c", 1, 0, 1},
                                         {"s", "", 5, "s", 1, 0, 1},
                                         kEnd};
  EXPECT_EQ(Row(table, {UINT64_MAX, int64_t{-1}, UINT32_MAX, -1, 'y', "text"}),
            " 18446744073709551615                    -1  4294967295           -1  y  text\n");
  EXPECT_EQ(Row(table, {uint64_t{0}, INT64_MIN, 0U, INT32_MIN, 'n', ""}),
            "                    0  -9223372036854775808           0  -2147483648  n      \n");
  EXPECT_EQ(CsvRow(table, {UINT64_MAX, INT64_MIN, UINT32_MAX, INT32_MAX, 'y', "a text"}),
            "18446744073709551615,-9223372036854775808,4294967295,2147483647,y,a text\n");
}

TEST(PrintRow, ShowsTheLow32BitsOfA32BitColumn) {
  const std::vector<ColumnDesc> table = {
      {"u", "", 1, "u", 1, 0, 1}, {"d", "", 1, "d", 1, 0, 1}, kEnd};
  EXPECT_EQ(CsvRow(table, {uint64_t{0x1'0000'0007}, uint64_t{0xffff'ffff}}), "7,-1\n");
}

TEST(PrintRow, PassesOverHiddenCells) {
  std::vector<ColumnDesc> table = {Numbers("a", 3), Numbers("b", 3), Texts("c", 3), kEnd};
  table[0].selected = 0;
  EXPECT_EQ(Row(table, {1, 2, "z"}), "  2   z\n");
  EXPECT_EQ(CsvRow(table, {1, 2, "z"}), "2,z\n");
  table[1].selected = 0;
  table[2].selected = 0;
  EXPECT_EQ(Row(table, {1, 2, "z"}), "\n");
  EXPECT_EQ(CsvRow(table, {1, 2, "z"}), "\n");
  EXPECT_EQ(Row({kEnd}, {}), "\n");
}

TEST(PrintRow, LeavesUnsummableCellsOfATotalRowBlank) {
  const std::vector<ColumnDesc> table = {Texts("t", 4), Numbers("a", 3), Texts("u", 2),
                                         Numbers("b", 3), kEnd};
  EXPECT_EQ(TotalRow(table, {"x", 1, "y", 2}), "       1      2\n");
  EXPECT_EQ(CsvTotalRow(table, {"x", 1, "y", 2}), ",1,,2\n");
}

TEST(PrintRow, HidesBeforeItBlanks) {
  std::vector<ColumnDesc> table = {Texts("t", 4), Texts("u", 2), Numbers("b", 3), kEnd};
  table[0].selected = 0;
  EXPECT_EQ(TotalRow(table, {"x", "y", 2}), "     2\n");
  EXPECT_EQ(CsvTotalRow(table, {"x", "y", 2}), ",2\n");
}

TEST(PrintRow, TakesTheRoomOfAWideValueFromTheNext) {
  const std::vector<ColumnDesc> table = {Numbers("a", 10), Numbers("b", 10), Numbers("c", 5), kEnd};
  EXPECT_EQ(Row(table, {123456789012, 7, 8}), "123456789012        7     8\n");
}

TEST(PrintRow, CarriesOnOverSeveralColumns) {
  const std::vector<ColumnDesc> table = {Numbers("a", 3), Numbers("b", 3), Numbers("c", 3),
                                         Numbers("d", 3), kEnd};
  // 8 characters in 3 carry 5. The next is printed with width -2 and carries 4, the next with -1
  // and carries 2, which the last one gives back.
  EXPECT_EQ(Row(table, {12345678, 1, 2, 3}), "12345678 1  2 3\n");
}

TEST(PrintRow, GivesRoomBackInABlankCell) {
  const std::vector<ColumnDesc> table = {Numbers("a", 3), Texts("t", 4), Numbers("b", 3), kEnd};
  EXPECT_EQ(TotalRow(table, {12345, "x", 6}), "12345      6\n");
}

TEST(PrintRow, JustifiesLeftWhenTheCarryExceedsTheWidth) {
  const std::vector<ColumnDesc> table = {Texts("a", 3), Numbers("b", 4), Numbers("c", 5), kEnd};
  // 10 characters in 3 carry 7: the next is printed with width -3 and carries 6, the last with -1.
  EXPECT_EQ(Row(table, {"0123456789", 1, 2}), "0123456789 1   2\n");
}

TEST(PrintRow, CountsTheCarryInEightBits) {
  const std::vector<ColumnDesc> table = {Texts("a", 4), Numbers("b", 6), Numbers("c", 5), kEnd};
  // 260 in 4 are 256 too many, which is no carry.
  const std::string wide(260, 'x');
  EXPECT_EQ(Row(table, {wide.c_str(), 1, 2}), wide + "      1     2\n");
  // 259 in 4 carry 255, so that the next is printed with width 6 - 255 and carries 242.
  const std::string almost(259, 'x');
  EXPECT_EQ(Row(table, {almost.c_str(), 1, 2}),
            almost + " 1" + std::string(248, ' ') + " 2" + std::string(236, ' ') + "\n");
}

TEST(PrintRow, HasNoCarryInCsv) {
  const std::vector<ColumnDesc> table = {Texts("a", 1), Numbers("b", 1), kEnd};
  const std::string wide(5000, 'x');
  EXPECT_EQ(CsvRow(table, {wide.c_str(), 1}), wide + ",1\n");
}

TEST(PrintColumnDescriptions, DescribesTheShownColumns) {
  std::vector<ColumnDesc> table = {Numbers("a", 3), Numbers("hidden", 3),
                                   Texts("aNameOfMoreThanTwentyCharacters", 3), kEnd};
  table[1].selected = 0;
  EXPECT_EQ(Printed([&] { PrintColumnDescriptions(table.data()); }),
            "Description of report header labels:\n"
            "                   a: A number\n"
            "aNameOfMoreThanTwentyCharacters: A text\n");
}

}  // namespace
}  // namespace tally
