// Reads with keys, against a library of this program's own.
#include "framework/param_list.h"

#include <gtest/gtest.h>

#include <cstdarg>
#include <cstdio>
#include <string>

struct KSI_ParamList {};

namespace {

// What was asked of the library, and what was said; `failing` is the call that fails.
struct Library {
  std::string calls;
  std::string warnings;
  std::string failing;
  KSI_ParamList keys;
  KSI_ParamList instances;

  tally::Status Call(const std::string& call) {
    calls += (calls.empty() ? "" : " ") + call;
    return call.starts_with(failing) && !failing.empty() ? 0xbad0003 : 0;
  }
};

Library library;

}  // namespace

extern "C" {

KSI_ParamList* KSI_ParamListCreate(int version, int capacity) {
  const std::string call =
      "Create(" + std::to_string(version) + "," + std::to_string(capacity) + ")";
  return library.Call(call) == 0 ? &library.keys : nullptr;
}

uint32_t KSI_ParamListAddInt(KSI_ParamList* /*list*/, uint64_t value) {
  return library.Call("AddInt(" + std::to_string(value) + ")");
}

uint32_t KSI_ParamListAddString(KSI_ParamList* /*list*/, const char* text) {
  return library.Call(std::string("AddString(") + text + ")");
}

void KSI_ParamListRemoveLastParam(KSI_ParamList* /*list*/) { library.Call("RemoveLast"); }

void KSI_ParamListDestroy(KSI_ParamList* list) {
  library.Call(list == &library.keys ? "Destroy(keys)" : "Destroy(instances)");
}

uint32_t KSI_Get(uint16_t node, KSI_ParamList* /*keys*/, void* buffer, size_t size) {
  const tally::Status status =
      library.Call("Get(" + std::to_string(node) + "," + std::to_string(size) + ")");
  if (status == 0) *static_cast<uint32_t*>(buffer) = 42;
  return status;
}

uint32_t KSI_GetInstanceListAlloc(uint16_t node, KSI_ParamList* /*keys*/, KSI_ParamList** list) {
  const tally::Status status = library.Call("List(" + std::to_string(node) + ")");
  if (status == 0) *list = &library.instances;
  return status;
}

uint32_t KSI_GetInstanceListAllocHint(uint16_t node, KSI_ParamList* /*keys*/, uint32_t hint,
                                      KSI_ParamList** list) {
  const tally::Status status =
      library.Call("List(" + std::to_string(node) + "," + std::to_string(hint) + ")");
  if (status == 0) *list = &library.instances;
  return status;
}

void Warning(const char* format, ...) {
  char text[256];
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(text, sizeof text, format, arguments);
  va_end(arguments);
  library.warnings += text;
}
}

namespace tally {
namespace {

constexpr ReaderTexts kTexts = {
    .create = {Style::plain, "Create failure"},
    .firstKey = {Style::code, "First failure"},
    .secondKey = {Style::message, "Second failure"},
    .read = {Style::message, "Read failure"},
};

class ParamLists : public testing::Test {
 protected:
  void SetUp() override { library = {}; }

  // Reads a record where `failing` is the call that fails.
  static Status Read(const KeyList& keys, const char* failing = "") {
    library = {};
    library.failing = failing;
    uint32_t record = 0;
    const Status status = ReadRecord(7, keys, kTexts, record);
    EXPECT_EQ(record, status == kSuccess ? 42U : 0U);
    return status;
  }
};

TEST_F(ParamLists, AreMadeOfTheKeys) {
  EXPECT_EQ(Read({.capacity = 1}), kSuccess);
  EXPECT_EQ(library.calls, "Create(1,1) Get(7,4) Destroy(keys)");
  EXPECT_EQ(Read({.capacity = 2, .first = 5U, .second = "vm"}), kSuccess);
  EXPECT_EQ(library.calls, "Create(1,2) AddInt(5) AddString(vm) Get(7,4) Destroy(keys)");
}

TEST_F(ParamLists, WidenSignedKeysWithTheirSign) {
  EXPECT_EQ(Read({.capacity = 1, .first = int32_t{-1}}), kSuccess);
  EXPECT_EQ(library.calls, "Create(1,1) AddInt(18446744073709551615) Get(7,4) Destroy(keys)");
  EXPECT_EQ(Read({.capacity = 1, .first = UINT32_MAX}), kSuccess);
  EXPECT_EQ(library.calls, "Create(1,1) AddInt(4294967295) Get(7,4) Destroy(keys)");
}

TEST_F(ParamLists, LoseTheirKeysWhereThatIsAsked) {
  EXPECT_EQ(Read({.capacity = 3, .first = "a", .second = "b", .removeKeys = true}), kSuccess);
  EXPECT_EQ(library.calls,
            "Create(1,3) AddString(a) AddString(b) Get(7,4) RemoveLast RemoveLast Destroy(keys)");
  EXPECT_EQ(Read({.capacity = 3, .first = "a", .removeKeys = true}, "Get"), 0xbad0003);
  EXPECT_EQ(library.calls, "Create(1,3) AddString(a) Get(7,4) RemoveLast Destroy(keys)");
}

TEST_F(ParamLists, FailWithTheWordsOfTheStep) {
  const KeyList keys = {.capacity = 2, .first = 5U, .second = "vm"};
  EXPECT_EQ(Read(keys, "Create"), kFailure);
  EXPECT_EQ(library.warnings, "Create failure\n");
  EXPECT_EQ(library.calls, "Create(1,2)");

  EXPECT_EQ(Read(keys, "AddInt"), 0xbad0003);
  EXPECT_EQ(library.warnings, "First failure, error code: 195887107\n");
  EXPECT_EQ(library.calls, "Create(1,2) AddInt(5) Destroy(keys)");

  EXPECT_EQ(Read(keys, "AddString"), 0xbad0003);
  EXPECT_EQ(library.warnings, "Second failure: Not found\n");
  EXPECT_EQ(library.calls, "Create(1,2) AddInt(5) AddString(vm) Destroy(keys)");

  EXPECT_EQ(Read(keys, "Get"), 0xbad0003);
  EXPECT_EQ(library.warnings, "Read failure: Not found\n");
  EXPECT_EQ(library.calls, "Create(1,2) AddInt(5) AddString(vm) Get(7,4) Destroy(keys)");
}

TEST_F(ParamLists, HoldInstancesUntilTheyGo) {
  {
    ParamList instances;
    EXPECT_EQ(ListInstances(9, nullptr, instances), kSuccess);
    EXPECT_EQ(instances.get(), &library.instances);
    EXPECT_EQ(library.calls, "List(9)");
  }
  EXPECT_EQ(library.calls, "List(9) Destroy(instances)");
}

TEST_F(ParamLists, ListWithKeysAndAHint) {
  {
    ParamList instances;
    EXPECT_EQ(ListInstances(9, {.capacity = 2, .first = 1U}, kTexts, instances, 30), kSuccess);
  }
  EXPECT_EQ(library.calls, "Create(1,2) AddInt(1) List(9,30) Destroy(keys) Destroy(instances)");

  library = {};
  library.failing = "List";
  ParamList instances;
  EXPECT_EQ(ListInstances(9, {.capacity = 2, .first = 1U}, kTexts, instances), 0xbad0003);
  EXPECT_EQ(instances, nullptr);
  EXPECT_EQ(library.warnings, "Read failure: Not found\n");
  EXPECT_EQ(library.calls, "Create(1,2) AddInt(1) List(9) Destroy(keys)");
}

TEST_F(ParamLists, SayNothingOfSuccessNorWhereNothingIsToSay) {
  EXPECT_EQ(kTexts.read.Of(kSuccess), kSuccess);
  EXPECT_EQ(Complaint{}.Of(kFailure), kFailure);
  EXPECT_EQ(library.warnings, "");
}

TEST_F(ParamLists, EndSomeWordsWithoutALine) {
  EXPECT_EQ((Complaint{Style::listNotMade, "memNode 3"}.Of(0xbad0014)), 0xbad0014);
  EXPECT_EQ((Complaint{Style::errorReading, "/memory/memNodes/3"}.Of(0xbad0003)), 0xbad0003);
  EXPECT_EQ(library.warnings,
            "The param list for memNode 3 could not be created: 0xbad0014"
            "Error 0xbad0003 while reading /memory/memNodes/3");
}

}  // namespace
}  // namespace tally
