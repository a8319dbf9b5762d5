#include "knvlibs/linux/host/figure.h"

#include <gtest/gtest.h>

#include <type_traits>

namespace ksi {
namespace {

constexpr Figure kUntold = std::nullopt;

// What would make a wrong sum does not compile.
template <class A, class B>
concept CanAdd = requires(A a, B b) {
  a + b;
};
static_assert(!CanAdd<Figure, Figure> && !CanAdd<Figure, uint64_t>);
static_assert(!std::is_convertible_v<Figure, uint64_t>);

TEST(FigureTest, WhatIsMadeOfAnUntoldPartCannotBeTold) {
  EXPECT_EQ(SumOf({1, 2, 3}), 6u);
  EXPECT_EQ(SumOf({}), 0u);
  EXPECT_EQ(SumOf({1, kUntold, 3}), kUntold);
  EXPECT_EQ(DifferenceOf(5, 3), 2u);
  EXPECT_EQ(DifferenceOf(3, 5), 0u);
  EXPECT_EQ(DifferenceOf(kUntold, 0), kUntold);
  EXPECT_EQ(DifferenceOf(5, kUntold), kUntold);
  EXPECT_EQ(ProductOf(5, 4), 20u);
  EXPECT_EQ(ProductOf(kUntold, 4), kUntold);
  EXPECT_EQ(QuotientOf(7, 2), 3u);
  EXPECT_EQ(QuotientOf(kUntold, 2), kUntold);
}

TEST(FigureTest, WhatHasNoRoomCannotBeTold) {
  EXPECT_EQ(SumOf({UINT64_MAX, 0}), UINT64_MAX);
  EXPECT_EQ(SumOf({UINT64_MAX, 1}), kUntold);
  EXPECT_EQ(ProductOf(uint64_t{1} << 63, 1), uint64_t{1} << 63);
  EXPECT_EQ(ProductOf(uint64_t{1} << 63, 2), kUntold);
}

TEST(FigureTest, AFieldIsAllOnesForWhatItCannotTell) {
  EXPECT_EQ(FieldOf(7), 7u);
  EXPECT_EQ(FieldOf(kUntold), UINT64_MAX);
  EXPECT_EQ(FieldOf<uint32_t>(UINT32_MAX - 1), UINT32_MAX - 1);
  EXPECT_EQ(FieldOf<uint32_t>(uint64_t{UINT32_MAX} + 1), UINT32_MAX);
  EXPECT_EQ(FieldOf<uint8_t>(kUntold), UINT8_MAX);
  EXPECT_EQ(FieldOf<int32_t>(INT32_MAX), INT32_MAX);
  EXPECT_EQ(FieldOf<int32_t>(uint64_t{INT32_MAX} + 1), -1);
  EXPECT_EQ(FieldOf<int64_t>(kUntold), -1);
}

}  // namespace
}  // namespace ksi
