#include "framework/return_status.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <iterator>
#include <string>
#include <string_view>

namespace {

constexpr uint32_t kBase = 0xbad0000;

TEST(ReturnStatus, HasAMessageForEveryRow) {
  ASSERT_EQ(std::size(returnStatusStrs), 352U);
  for (const char* text : returnStatusStrs) {
    ASSERT_NE(text, nullptr);
    EXPECT_STRNE(text, "");
  }
}

// Rows from all over the table: one that is lost or put in moves those after it.
TEST(ReturnStatus, KeepsEveryMessageInItsRow) {
  const struct {
    uint32_t row;
    const char* text;
  } anchors[] = {
      {0, "Success"},
      {1, "Failure"},
      {3, "Not found"},
      {0x14, "Out of memory"},
      {0x3a, "Checksum mismatch"},
      {0x5a, "Permission denied"},
      {0x84, "Bad parameter type"},
      {0xb4, "Too many elements for list"},
      {0xc3, "No KSI handler found for the requested node"},
      {0xd8, "Invalid ksi node ID"},
      {0x100, "Device already has UID"},
      {0x122, "KSI data length mismatch"},
      {0x154, "Lock held by a transaction in progress"},
      {0x15f, "Generic service console error"},
  };
  for (const auto& [row, text] : anchors) EXPECT_STREQ(returnStatusStrs[row], text) << row;
}

// FNV-1a over all messages with their terminators. Whoever changes a message on purpose takes the
// new digest from the failure.
TEST(ReturnStatus, KeepsEveryByteOfEveryMessage) {
  uint64_t digest = 0xcbf29ce484222325;
  for (const std::string_view text : returnStatusStrs) {
    for (const char c : std::string(text) + '\0') {
      digest = (digest ^ static_cast<unsigned char>(c)) * 0x100000001b3;
    }
  }
  EXPECT_EQ(digest, 0x7da440aef6bcecdcU);
}

TEST(ReturnStatus, FindsRowsByStatusAndBySmallNumber) {
  EXPECT_STREQ(KNV_ReturnStatusToString(0), "Success");
  for (uint32_t row = 1; row < std::size(returnStatusStrs); ++row) {
    EXPECT_EQ(KNV_ReturnStatusToString(kBase + row), returnStatusStrs[row]) << row;
    EXPECT_EQ(KNV_ReturnStatusToString(row), returnStatusStrs[row]) << row;
  }
}

TEST(ReturnStatus, DoesNotKnowWhatLiesBetweenTheRows) {
  for (const uint32_t status : {352U, 0x10000U, kBase - 1, kBase, kBase + 352, 0x2bacffffU}) {
    EXPECT_STREQ(KNV_ReturnStatusToString(status), "Unknown status") << status;
  }
}

TEST(ReturnStatus, LeavesServiceConsoleStatusesOpaque) {
  for (const uint32_t status : {0x2bad0000U, 0x2bad0001U, 0x80000000U, 0xffffffffU}) {
    EXPECT_STREQ(KNV_ReturnStatusToString(status), "Opaque service console status") << status;
  }
}

}  // namespace
