// The operations of the interface, through the library as programs meet it.
#include <gtest/gtest.h>

#include <climits>
#include <cstring>
#include <string>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include <knvlibs/ksi_status.h>
#include "tests/knvlibs/cache_fixture.h"

namespace {

// A list destroyed with its owner.
class List {
 public:
  explicit List(int capacity = 4) : handle_(KSI_ParamListCreate(1, capacity)) {}
  explicit List(KSI_ParamList* handle) : handle_(handle) {}
  ~List() { KSI_ParamListDestroy(handle_); }
  List(const List&) = delete;
  List& operator=(const List&) = delete;

  operator KSI_ParamList*() const { return handle_; }  // NOLINT: implicit, as in the calls

 private:
  KSI_ParamList* handle_;
};

int64_t NumberAt(KSI_ParamList* list, uint32_t index) {
  int64_t number = 0;
  EXPECT_EQ(KSI_ParamListGetInt64(list, index, &number), 0u);
  return number;
}

std::string TextAt(KSI_ParamList* list, uint32_t index) {
  const char* text = "";
  EXPECT_EQ(KSI_ParamListGetString(list, index, &text), 0u);
  return text;
}

TEST(ParamList, KeepsNumbersAndTextsInOrder) {
  List list(3);
  EXPECT_EQ(KSI_ParamListAddInt(list, UINT64_MAX), 0u);
  EXPECT_EQ(KSI_ParamListAddString(list, "heap"), 0u);
  EXPECT_EQ(KSI_ParamListAddInt(list, 0x500000007), 0u);
  EXPECT_EQ(KSI_ParamListUsedCount(list), 3u);
  EXPECT_EQ(NumberAt(list, 0), -1);
  EXPECT_EQ(TextAt(list, 1), "heap");
  uint32_t low = 0;
  EXPECT_EQ(KSI_ParamListGetUInt32(list, 2, &low), 0u);
  EXPECT_EQ(low, 7u);
}

TEST(ParamList, HoldsAsManyEntriesAsItsCapacity) {
  List list(2);
  EXPECT_EQ(KSI_ParamListAddInt(list, 1), 0u);
  EXPECT_EQ(KSI_ParamListAddInt(list, 2), 0u);
  EXPECT_EQ(KSI_ParamListAddInt(list, 3), KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(KSI_ParamListAddString(list, "x"), KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(KSI_ParamListUsedCount(list), 2u);
  KSI_ParamListRemoveLastParam(list);
  EXPECT_EQ(KSI_ParamListAddString(list, "x"), 0u);
  EXPECT_EQ(TextAt(list, 1), "x");

  List none(0);
  ASSERT_NE(static_cast<KSI_ParamList*>(none), nullptr);
  EXPECT_EQ(KSI_ParamListAddInt(none, 1), KSI_STATUS_TOO_MANY_ELEMENTS);
}

TEST(ParamList, ReadsFailByKindAndIndexAndLeaveTheOutput) {
  List list;
  ASSERT_EQ(KSI_ParamListAddInt(list, 5), 0u);
  ASSERT_EQ(KSI_ParamListAddString(list, "x"), 0u);
  int64_t number = 77;
  uint32_t low = 78;
  const char* text = "before";
  EXPECT_EQ(KSI_ParamListGetInt64(list, 1, &number), KSI_STATUS_BAD_PARAM_TYPE);
  EXPECT_EQ(KSI_ParamListGetUInt32(list, 1, &low), KSI_STATUS_BAD_PARAM_TYPE);
  EXPECT_EQ(KSI_ParamListGetString(list, 0, &text), KSI_STATUS_BAD_PARAM_TYPE);
  EXPECT_EQ(KSI_ParamListGetInt64(list, 2, &number), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(KSI_ParamListGetUInt32(list, UINT32_MAX, &low), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(KSI_ParamListGetString(list, 2, &text), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(number, 77);
  EXPECT_EQ(low, 78u);
  EXPECT_STREQ(text, "before");
}

TEST(ParamList, IsNotMadeOfBadArguments) {
  EXPECT_EQ(KSI_ParamListCreate(0, 2), nullptr);
  EXPECT_EQ(KSI_ParamListCreate(2, 2), nullptr);
  EXPECT_EQ(KSI_ParamListCreate(1, -1), nullptr);
  EXPECT_EQ(KSI_ParamListCreateAndAllocateParams(1, 2, SIZE_MAX), nullptr);
  EXPECT_EQ(KSI_ParamListCreateAndAllocateParams(1, INT_MIN, 8), nullptr);
}

TEST(ParamList, SurvivesMissingListsAndOutputs) {
  List list;
  ASSERT_EQ(KSI_ParamListAddInt(list, 5), 0u);
  int64_t number = 0;
  EXPECT_EQ(KSI_ParamListAddInt(nullptr, 1), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_ParamListAddString(nullptr, "x"), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_ParamListAddString(list, nullptr), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_ParamListGetInt64(nullptr, 0, &number), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_ParamListGetInt64(list, 0, nullptr), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_ParamListGetUInt32(list, 0, nullptr), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_ParamListGetString(list, 0, nullptr), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_ParamListUsedCount(nullptr), 0u);
  KSI_ParamListRemoveLastParam(nullptr);
  KSI_ParamListDestroy(nullptr);
  KSI_ParamListRemoveLastParam(list);
  KSI_ParamListRemoveLastParam(list);  // empty already
  EXPECT_EQ(KSI_ParamListUsedCount(list), 0u);
}

TEST(ParamList, TextsStayWhereTheyAreWhileTheListGrows) {
  List list(INT_MAX);
  ASSERT_EQ(KSI_ParamListAddString(list, "first"), 0u);
  const char* first = nullptr;
  ASSERT_EQ(KSI_ParamListGetString(list, 0, &first), 0u);
  const std::string large(100000, 'x');
  for (int i = 0; i < 1000; ++i) ASSERT_EQ(KSI_ParamListAddString(list, "another"), 0u);
  ASSERT_EQ(KSI_ParamListAddString(list, large.c_str()), 0u);
  EXPECT_STREQ(first, "first");
  EXPECT_EQ(TextAt(list, 1001), large);
  for (int i = 0; i < 1001; ++i) KSI_ParamListRemoveLastParam(list);
  EXPECT_STREQ(first, "first");
}

TEST(ParamList, RoomForTextIsTakenAndGivenBack) {
  List list(KSI_ParamListCreateAndAllocateParams(1, 10, 8));
  EXPECT_EQ(KSI_ParamListAddString(list, "abc"), 0u);
  EXPECT_EQ(KSI_ParamListAddString(list, "abcd"), KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(KSI_ParamListAddString(list, "abc"), 0u);
  EXPECT_EQ(KSI_ParamListAddInt(list, 1), 0u);
  KSI_ParamListRemoveLastParam(list);
  KSI_ParamListRemoveLastParam(list);
  EXPECT_EQ(KSI_ParamListAddString(list, "xyz"), 0u);
  EXPECT_EQ(TextAt(list, 0), "abc");
  EXPECT_EQ(TextAt(list, 1), "xyz");
}

TEST(Text, IsCopiedUpToItsSize) {
  char buffer[5] = {'-', '-', '-', '-', '-'};
  EXPECT_EQ(Str_Strcpy(buffer, "abcdefgh", 4), buffer);
  EXPECT_EQ(std::string(buffer, 5), std::string("abc\0-", 5));
  EXPECT_EQ(Str_Strcpy(buffer, "", 4), buffer);
  EXPECT_STREQ(buffer, "");
  buffer[0] = 'k';
  EXPECT_EQ(Str_Strcpy(buffer, "abc", 0), buffer);
  EXPECT_EQ(buffer[0], 'k');
  buffer[1] = 'l';
  EXPECT_EQ(Str_Strcpy(buffer, nullptr, 1), buffer);
  EXPECT_EQ(std::string(buffer, 2), std::string("\0l", 2));
}

TEST(Diagnostic, IsTheFormattedTextAndNothingElse) {
  testing::internal::CaptureStderr();
  Warning("%s: %u", "read", 7u);
  EXPECT_EQ(testing::internal::GetCapturedStderr(), "read: 7");
}

// Reads of the small host of the fixture.
class Reads : public testing::Test {
 protected:
  void SetUp() override {
    ksi::WriteSmallHost(directory_.Path("host.ksi"));
    ASSERT_EQ(KSI_UseCache(directory_.Path("host.ksi").c_str(), 0), 0u);
  }

  ksi::TestDirectory directory_;
};

TEST_F(Reads, TakeAKeyedValue) {
  List keys;
  ASSERT_EQ(KSI_ParamListAddInt(keys, 7), 0u);
  KSI_GroupName name = {};
  EXPECT_EQ(KSI_Get(KSI_NODE_sched_groups_groupName, keys, &name, sizeof name), 0u);
  EXPECT_STREQ(name.text, "web");
}

TEST_F(Reads, TakeAValueWithoutKeys) {
  KSI_Comprehensive memory = {};
  EXPECT_EQ(KSI_Get(KSI_NODE_memory_comprehensive, nullptr, &memory, sizeof memory), 0u);
  EXPECT_EQ(memory.total, 4096u);
  const List empty;
  memory = {};
  EXPECT_EQ(KSI_Get(KSI_NODE_memory_comprehensive, empty, &memory, sizeof memory), 0u);
  EXPECT_EQ(memory.total, 4096u);
}

TEST_F(Reads, RefuseMisuseAndLeaveTheBuffer) {
  List keys;
  char buffer[512];
  std::memset(buffer, 0x5a, sizeof buffer);
  const std::string before(buffer, sizeof buffer);
  const uint16_t name = KSI_NODE_sched_groups_groupName;
  EXPECT_EQ(KSI_Get(0, nullptr, buffer, 64), KSI_STATUS_INVALID_NODE);
  EXPECT_EQ(KSI_Get(999, nullptr, buffer, 64), KSI_STATUS_INVALID_NODE);
  EXPECT_EQ(KSI_Get(KSI_NODE_system_heaps, nullptr, buffer, 64), KSI_STATUS_NO_HANDLER);
  EXPECT_EQ(KSI_Get(name, nullptr, buffer, 64), KSI_STATUS_BAD_PARAM_COUNT);
  EXPECT_EQ(KSI_Get(name, keys, buffer, 64), KSI_STATUS_BAD_PARAM_COUNT);
  ASSERT_EQ(KSI_ParamListAddString(keys, "7"), 0u);
  EXPECT_EQ(KSI_Get(name, keys, buffer, 64), KSI_STATUS_BAD_PARAM_TYPE);
  EXPECT_EQ(KSI_Get(KSI_NODE_memory_comprehensive, keys, buffer, 96), KSI_STATUS_BAD_PARAM_COUNT);
  KSI_ParamListRemoveLastParam(keys);
  ASSERT_EQ(KSI_ParamListAddInt(keys, 7), 0u);
  EXPECT_EQ(KSI_Get(name, keys, buffer, 63), KSI_STATUS_LENGTH_MISMATCH);
  EXPECT_EQ(KSI_Get(name, keys, buffer, 65), KSI_STATUS_LENGTH_MISMATCH);
  EXPECT_EQ(KSI_Get(name, keys, buffer, 0), KSI_STATUS_LENGTH_MISMATCH);
  EXPECT_EQ(KSI_Get(name, keys, nullptr, 64), KSI_STATUS_BAD_PARAM);
  KSI_ParamListRemoveLastParam(keys);
  ASSERT_EQ(KSI_ParamListAddInt(keys, 8), 0u);
  EXPECT_EQ(KSI_Get(name, keys, buffer, 64), KSI_STATUS_NOT_FOUND);
  KSI_ParamListRemoveLastParam(keys);
  ASSERT_EQ(KSI_ParamListAddInt(keys, 9), 0u);
  EXPECT_EQ(KSI_Get(name, keys, buffer, 64), KSI_STATUS_PERMISSION_DENIED);
  EXPECT_EQ(std::string(buffer, sizeof buffer), before);
}

TEST_F(Reads, MakeAListOfInstances) {
  List keys;
  ASSERT_EQ(KSI_ParamListAddInt(keys, 0), 0u);
  KSI_ParamList* handle = nullptr;
  ASSERT_EQ(KSI_GetInstanceListAlloc(KSI_NODE_sched_groups_members_groups, keys, &handle), 0u);
  const List groups(handle);
  EXPECT_EQ(KSI_ParamListUsedCount(groups), 2u);
  EXPECT_EQ(NumberAt(groups, 0), 9);
  EXPECT_EQ(NumberAt(groups, 1), 7);
}

TEST_F(Reads, HintsDoNotLimitAndAreNotTrusted) {
  for (const uint32_t hint : {0u, 1u, UINT32_MAX}) {
    KSI_ParamList* handle = nullptr;
    ASSERT_EQ(KSI_GetInstanceListAllocHint(KSI_NODE_system_heaps, nullptr, hint, &handle), 0u);
    const List heaps(handle);
    EXPECT_EQ(KSI_ParamListUsedCount(heaps), 2u);
    EXPECT_EQ(TextAt(heaps, 0), "main");
    EXPECT_EQ(TextAt(heaps, 1), "");
  }
}

TEST_F(Reads, FillAListMadeBefore) {
  const List heaps(KSI_ParamListCreateAndAllocateParams(1, 99, 12672));
  EXPECT_EQ(KSI_GetInstanceList(KSI_NODE_system_heaps, nullptr, heaps), 0u);
  EXPECT_EQ(KSI_ParamListUsedCount(heaps), 2u);

  const List small(1);
  EXPECT_EQ(KSI_GetInstanceList(KSI_NODE_system_heaps, nullptr, small),
            KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(KSI_ParamListUsedCount(small), 0u);

  const List tight(KSI_ParamListCreateAndAllocateParams(1, 99, 5));
  EXPECT_EQ(KSI_GetInstanceList(KSI_NODE_system_heaps, nullptr, tight),
            KSI_STATUS_TOO_MANY_ELEMENTS);
  EXPECT_EQ(KSI_ParamListUsedCount(tight), 0u);
}

TEST_F(Reads, OfListsFailAndLeaveTheOutput) {
  List keys;
  ASSERT_EQ(KSI_ParamListAddInt(keys, 9), 0u);
  auto* const before = reinterpret_cast<KSI_ParamList*>(&keys);
  KSI_ParamList* handle = before;
  const uint16_t groups = KSI_NODE_sched_groups_members_groups;
  EXPECT_EQ(KSI_GetInstanceListAlloc(groups, keys, &handle), KSI_STATUS_IO_ERROR);
  EXPECT_EQ(KSI_GetInstanceListAlloc(groups, nullptr, &handle), KSI_STATUS_BAD_PARAM_COUNT);
  EXPECT_EQ(KSI_GetInstanceListAlloc(0, keys, &handle), KSI_STATUS_INVALID_NODE);
  EXPECT_EQ(KSI_GetInstanceListAlloc(KSI_NODE_sched_groups_groupName, keys, &handle),
            KSI_STATUS_NO_HANDLER);
  EXPECT_EQ(KSI_GetInstanceListAllocHint(groups, keys, 5, &handle), KSI_STATUS_IO_ERROR);
  EXPECT_EQ(handle, before);
  EXPECT_EQ(KSI_GetInstanceListAlloc(groups, keys, nullptr), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_GetInstanceList(groups, keys, nullptr), KSI_STATUS_BAD_PARAM);
  const List list;
  ASSERT_EQ(KSI_ParamListAddInt(list, 4), 0u);
  EXPECT_EQ(KSI_GetInstanceList(groups, keys, list), KSI_STATUS_IO_ERROR);
  EXPECT_EQ(KSI_ParamListUsedCount(list), 1u);
}

TEST_F(Reads, UseTheFileNamedLast) {
  const std::string other = directory_.Path("other.ksi");
  {
    ksicache::CacheWriter writer(other, false);
    KSI_Comprehensive memory = {};
    memory.total = 1;
    writer.AddValue(ksi::NodeAt("memory/comprehensive"), {}, ksi::BytesOf(memory));
    writer.Commit(ksi::TestCapture());
  }
  ASSERT_EQ(KSI_UseCache(other.c_str(), 0), 0u);
  KSI_Comprehensive memory = {};
  EXPECT_EQ(KSI_Get(KSI_NODE_memory_comprehensive, nullptr, &memory, sizeof memory), 0u);
  EXPECT_EQ(memory.total, 1u);

  // One that cannot be used changes nothing.
  EXPECT_EQ(KSI_UseCache(directory_.Path("none").c_str(), 0), KSI_STATUS_NOT_FOUND);
  EXPECT_EQ(KSI_UseCache(nullptr, 0), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_UseCache(directory_.Path("host.ksi").c_str(), 1), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_Get(KSI_NODE_memory_comprehensive, nullptr, &memory, sizeof memory), 0u);
  EXPECT_EQ(memory.total, 1u);
}

TEST_F(Reads, SignatureOfAFileIsComparedWithTheLibrarys) {
  char built[KSI_BUILD_DATE_SIZE] = {};
  const char* own = nullptr;
  EXPECT_EQ(KSI_CheckSig(built, sizeof built, &own), 0u);
  EXPECT_EQ(std::string(built).size(), 20u);
  EXPECT_STREQ(built, own);

  ksi::RunSql(directory_.Path("host.ksi"),
              "UPDATE capture SET signature = '00112233445566778899aabbccddeeff', "
              "built = 'Jan 02 2003 04:05:06'");
  ASSERT_EQ(KSI_UseCache(directory_.Path("host.ksi").c_str(), 0), 0u);
  own = nullptr;
  EXPECT_EQ(KSI_CheckSig(built, sizeof built, &own), KSI_STATUS_CHECKSUM_MISMATCH);
  EXPECT_STREQ(built, "Jan 02 2003 04:05:06");
  ASSERT_NE(own, nullptr);
  EXPECT_EQ(own, ksi::kDefinitions.built);

  char small[5] = {'#', '#', '#', '#', '#'};
  EXPECT_EQ(KSI_CheckSig(small, 4, &own), KSI_STATUS_CHECKSUM_MISMATCH);
  EXPECT_EQ(std::string(small, 5), std::string("Jan\0#", 5));
  EXPECT_EQ(KSI_CheckSig(nullptr, 21, &own), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_CheckSig(built, 0, &own), KSI_STATUS_BAD_PARAM);
  EXPECT_EQ(KSI_CheckSig(built, 21, nullptr), KSI_STATUS_BAD_PARAM);
}

}  // namespace
