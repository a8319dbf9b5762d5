#include "framework/column.h"

#include <gtest/gtest.h>

#include <string>

namespace tally {
namespace {

struct Row {
  uint64_t memory;
  uint32_t times;
  int32_t balance;
  uint8_t share;
  uint8_t flag;
  const char* text;
};

constexpr auto kMemory = [](const Row& row) { return row.memory; };
constexpr auto kTimes = [](const Row& row) { return row.times; };
constexpr auto kBalance = [](const Row& row) { return row.balance; };
constexpr auto kShare = [](const Row& row) { return row.share; };
constexpr auto kFlag = [](const Row& row) { return row.flag; };
constexpr auto kText = [](const Row& row) { return row.text; };

// Each table is judged when it is compiled, as those of the reports are.
template <class... Columns>
consteval bool Sound(const Columns&... columns) {
  const Column<Row> table[] = {columns...};
  return IsSound(table);
}

static_assert(Sound(Kilobytes("memory", "", kMemory), Count("times", "", kTimes),
                    Text("text", "", kText).Total(kLabel), Flag("flag", "", kFlag)));

// Two columns of one name, which -s could not tell apart.
static_assert(!Sound(Count("times", "", kTimes), Count("times", "", kTimes)));
static_assert(!Sound(Count("times", "", kTimes), Count("TIMES", "", kTimes)));
// Names that -s or a line of CSV could not hold.
static_assert(!Sound(Count("", "", kTimes)));
static_assert(!Sound(Count("a:b", "", kTimes)));
static_assert(!Sound(Count("a,b", "", kTimes)));
static_assert(!Sound(Count("a\"b", "", kTimes)));
static_assert(!Sound(Count(nullptr, "", kTimes)));
// Labels that would not stay on their line.
static_assert(!Sound(Count("a\n", "", kTimes)));
static_assert(!Sound(Count("a\x1b", "", kTimes)));
static_assert(!Sound(Count("a\x7f", "", kTimes)));
static_assert(!Sound(Count("a\xe9", "", kTimes)));
static_assert(!Sound(Count("a", "one\ntwo", kTimes)));
static_assert(!Sound(Count("a", nullptr, kTimes)));
// A column without room.
static_assert(!Sound(Count("a", "", kTimes).Wide(0)));
static_assert(Sound(Count("a b~", "one two", kTimes).Wide(1)));
// Conversions that there are not, ...
static_assert(!Sound(Count("times", "", kTimes).As("ul")));
static_assert(!Sound(Count("times", "", kTimes).As("lu")));
static_assert(!Sound(Count("times", "", kTimes).As("x")));
static_assert(!Sound(Count("times", "", kTimes).As("")));
static_assert(!Sound(Count("times", "", kTimes).As(nullptr)));
// ... that are another type's, ...
static_assert(!Sound(Count("times", "", kTimes).As("s")));
static_assert(!Sound(Count("times", "", kTimes).As("c")));
static_assert(!Sound(Text("text", "", kText).As("Lu")));
static_assert(!Sound(Text("text", "", kText).As("c")));
static_assert(!Sound(Flag("flag", "", kFlag).As("u")));
// ... that have another sign, unless it is said, ...
static_assert(!Sound(Count("times", "", kTimes).As("d")));
static_assert(!Sound(Count("times", "", kTimes).As("Ld")));
static_assert(!Sound(Count("balance", "", kBalance).As("u")));
static_assert(!Sound(Count("balance", "", kBalance).As("Lu")));
static_assert(!Sound(Kilobytes("memory", "", kMemory).As("Ld")));
static_assert(Sound(Count("times", "", kTimes).AsSigned("d")));
static_assert(Sound(Kilobytes("memory", "", kMemory).AsSigned("Ld")));
static_assert(Sound(Count("balance", "", kBalance).AsUnsigned("Lu")));
static_assert(!Sound(Count("times", "", kTimes).AsSigned("u")));
static_assert(!Sound(Count("balance", "", kBalance).AsUnsigned("d")));
// ... or that would cut the figure.
static_assert(!Sound(Kilobytes("memory", "", kMemory).As("u")));
static_assert(!Sound(Kilobytes("memory", "", kMemory).AsSigned("d")));
static_assert(Sound(Count("times", "", kTimes).As("Lu")));
static_assert(Sound(Count("balance", "", kBalance).As("Ld")));
static_assert(Sound(Flag("flag", "", kFlag).As("s")));
// Totals that there cannot be.
static_assert(!Sound(Text("text", "", kText).Total(kSum)));
static_assert(!Sound(Count("times", "", kTimes).Total(kLabel)));

// Words of a number.
constexpr const char* kWords[] = {"good", "bad"};
static_assert(Sound(Text("text", "", kText).States(kWords)));
static_assert(!Sound(Count("times", "", kTimes).States(kWords)));

// A text is the row's own, not one that is gone when the column has it.
template <class Read>
constexpr bool kCanBeText = requires(Read read) {
  Text("text", "", read);
};
constexpr auto kMadeText = [](const Row& row) { return std::string(row.text); };
constexpr auto kOwnText = [](const Row& row) -> const auto& { return row.text; };
constexpr auto kView = [](const Row& row) { return std::string_view(row.text); };
static_assert(!kCanBeText<decltype(kMadeText)>);
static_assert(kCanBeText<decltype(kOwnText)>);
static_assert(kCanBeText<decltype(kView)>);
static_assert(kCanBeText<decltype(kText)>);

constexpr Column<Row> kColumns[] = {
    Kilobytes("memory", "Memory", kMemory),
    Count("times", "Times", kTimes).Wide(7).As("Lu").Total(kBlank).Fixed(),
    Flag("flag", "A flag", kFlag),
};

static_assert(PlaceOf(kColumns, "memory") == 0);
static_assert(PlaceOf(kColumns, "flag") == 2);

TEST(Column, HoldsItsDescription) {
  const ColumnDesc& memory = kColumns[0].desc;
  EXPECT_STREQ(memory.name, "memory");
  EXPECT_STREQ(memory.description, "Memory");
  EXPECT_EQ(memory.width, 10);
  EXPECT_STREQ(memory.conversion, "Lu");
  EXPECT_EQ(memory.summable, 1);
  EXPECT_EQ(memory.fixed, 0);
  EXPECT_EQ(memory.selected, 1);

  const ColumnDesc& times = kColumns[1].desc;
  EXPECT_EQ(times.width, 7);
  EXPECT_STREQ(times.conversion, "Lu");
  EXPECT_EQ(times.summable, 0);
  EXPECT_EQ(times.fixed, 1);
}

TEST(Column, IsPrintedAsItsFiguresTypeIs) {
  EXPECT_STREQ(Count("a", "", kMemory).desc.conversion, "Lu");
  EXPECT_STREQ(Count("a", "", kTimes).desc.conversion, "u");
  EXPECT_STREQ(Count("a", "", kBalance).desc.conversion, "d");
  EXPECT_STREQ(Count("a", "", kShare).desc.conversion, "u");
  EXPECT_STREQ(Kilobytes("a", "", kTimes).desc.conversion, "Lu");
  EXPECT_STREQ(Kilobytes("a", "", kBalance).desc.conversion, "Ld");
  EXPECT_STREQ(Flag("a", "", kFlag).desc.conversion, "c");
  EXPECT_STREQ(Text("a", "", kText).desc.conversion, "s");
}

TEST(Column, TakesItsFigureFromTheRow) {
  const Row row = {
      .memory = 4096, .times = 3, .balance = -2, .share = 1, .flag = 1, .text = "word"};
  EXPECT_EQ(kColumns[0].value(row).number(), 4096U);
  EXPECT_EQ(Count("a", "", kBalance).value(row).number(), UINT64_MAX - 1);
  EXPECT_EQ(Text("a", "", kText).value(row).text(), "word");
  EXPECT_EQ(kColumns[2].value(row).number(), 1U);
  EXPECT_EQ(kColumns[2].value(row).text(), "y");
}

TEST(Figure, HasNoValueWhenAllItsBitsAreOnes) {
  EXPECT_TRUE(Count("a", "", kMemory).figure.IsNone(UINT64_MAX));
  EXPECT_FALSE(Count("a", "", kMemory).figure.IsNone(UINT32_MAX));
  EXPECT_TRUE(Count("a", "", kTimes).figure.IsNone(UINT32_MAX));
  EXPECT_FALSE(Count("a", "", kTimes).figure.IsNone(UINT32_MAX - 1));
  EXPECT_TRUE(Count("a", "", kBalance).figure.IsNone(-1));
  EXPECT_TRUE(Count("a", "", kShare).figure.IsNone(UINT8_MAX));
  EXPECT_FALSE(Flag("a", "", kFlag).figure.IsNone(Cell::YesNo(true)));
  EXPECT_TRUE(Flag("a", "", kFlag).figure.IsNone(Cell::YesNo(true).KnownIf(false)));
  EXPECT_FALSE(Text("a", "", kText).figure.IsNone(Cell("")));
}

// What a column computes has a number in any case, and says whether it is true.
TEST(Column, KnowsWhatItComputes) {
  const auto cell = [](const auto& column, uint64_t memory, uint32_t times, uint8_t flag = 0) {
    return column.value({memory, times, 0, 0, flag, "word"});
  };
  const auto isNone = [&](const auto& column, uint64_t memory, uint32_t times, uint8_t flag = 0) {
    return column.figure.IsNone(cell(column, memory, times, flag));
  };
  constexpr auto kDifference = Kilobytes(
      "a", "", [](const Row& row) { return Known(row.memory) - Known(uint64_t{row.times}); });
  EXPECT_EQ(cell(kDifference, 9, 4).number(), 5U);
  EXPECT_FALSE(isNone(kDifference, 9, 4));
  EXPECT_EQ(cell(kDifference, UINT64_MAX, 4).number(), UINT64_MAX - 4);
  EXPECT_TRUE(isNone(kDifference, UINT64_MAX, 4));
  EXPECT_TRUE(isNone(kDifference, 2, 4));

  constexpr auto kSumOfBoth =
      Count("a", "", [](const Row& row) { return Known(row.times) + Known(uint32_t{7}); });
  EXPECT_STREQ(kSumOfBoth.desc.conversion, "u");
  EXPECT_EQ(cell(kSumOfBoth, 0, 4).number(), 11U);
  EXPECT_FALSE(isNone(kSumOfBoth, 0, 4));
  EXPECT_TRUE(isNone(kSumOfBoth, 0, UINT32_MAX));
  EXPECT_TRUE(isNone(kSumOfBoth, 0, UINT32_MAX - 1));

  constexpr auto kNarrow =
      Count("a", "", [](const Row& row) { return Cut<int32_t>(static_cast<int64_t>(row.memory)); });
  EXPECT_FALSE(isNone(kNarrow, INT32_MAX, 0));
  EXPECT_TRUE(isNone(kNarrow, uint64_t{INT32_MAX} + 1, 0));

  constexpr auto kWord = Text("a", "", [](const Row& row) {
    return Computed<const char*>{row.text, row.times != 0};
  });
  EXPECT_EQ(cell(kWord, 0, 0).text(), "word");
  EXPECT_TRUE(isNone(kWord, 0, 0));
  EXPECT_FALSE(isNone(kWord, 0, 1));
  EXPECT_TRUE(isNone(Flag("a", "", kFlag), 0, 0, UINT8_MAX));
  EXPECT_EQ(cell(Flag("a", "", kFlag), 0, 0, UINT8_MAX).text(), "y");
}

TEST(Figure, IsShownInTheUnit) {
  const auto shown = [](const Column<Row>& column, uint64_t figure, DisplayUnit unit) {
    return column.figure.Shown(figure, unit).number();
  };
  EXPECT_EQ(shown(Kilobytes("a", "", kMemory), 2048, DisplayUnit::mb), 2U);
  EXPECT_EQ(shown(Kilobytes("a", "", kMemory), UINT64_MAX, DisplayUnit::mb), UINT64_MAX);
  EXPECT_EQ(shown(Pages("a", "", kMemory), 3, DisplayUnit::kb), 12U);
  EXPECT_EQ(shown(Pages("a", "", kMemory), UINT64_MAX, DisplayUnit::kb), UINT64_MAX - 3);
  EXPECT_EQ(shown(Bytes("a", "", kMemory), 8191, DisplayUnit::pg), 1U);
  EXPECT_EQ(shown(Bytes("a", "", kMemory), 8191, DisplayUnit::b), 8191U);
  EXPECT_EQ(shown(Count("a", "", kMemory), 2048, DisplayUnit::mb), 2048U);
}

// What is not shown as it is takes a turn through Shown; nothing else may differ there.
TEST(Figure, KnowsWhenItIsShownAsItIs) {
  for (const DisplayUnit unit : {DisplayUnit::mb, DisplayUnit::kb, DisplayUnit::pg}) {
    for (const Column<Row>& column :
         {Column<Row>(Kilobytes("a", "", kMemory)), Column<Row>(Pages("a", "", kMemory)),
          Column<Row>(Bytes("a", "", kMemory)), Column<Row>(Count("a", "", kMemory))}) {
      if (!column.figure.IsShownAsItIs(unit)) continue;
      for (const uint64_t figure : {uint64_t{0}, uint64_t{4097}, UINT64_MAX}) {
        EXPECT_EQ(column.figure.Shown(figure, unit).number(), figure);
      }
    }
  }
  EXPECT_TRUE(Kilobytes("a", "", kMemory).figure.IsShownAsItIs(DisplayUnit::kb));
  EXPECT_FALSE(Kilobytes("a", "", kMemory).figure.IsShownAsItIs(DisplayUnit::mb));
}

}  // namespace
}  // namespace tally
