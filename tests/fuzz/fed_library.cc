#include "tests/fuzz/fed_library.h"

#include <cstdio>
#include <cstdlib>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include "tests/fuzz/feed.h"

struct KSI_ParamList {
  size_t capacity;
  std::vector<std::variant<uint64_t, std::string>> entries;
  uint16_t node = 0;  // whose instances these are
  bool mayBeLeft = false;
};

namespace fuzz {
namespace {

constexpr uint32_t kFailure = 0xbad0001;
constexpr uint32_t kNotFound = 0xbad0003;
constexpr uint32_t kBadParamType = 0xbad0084;
constexpr uint32_t kTooManyElements = 0xbad00b4;

// A walk over the groups ends because there are no more entries in a run than these.
constexpr size_t kMostEntries = 512;
constexpr size_t kMostEntriesOfList = 12;

enum Id : uint16_t {
  kNone,
#define FUZZ_ID(name, record, keys, entries, listKeys, meaning) k_##name,
  KSI_NODES(FUZZ_ID)
#undef FUZZ_ID
};

// By identifier.
constexpr size_t kRecordSizes[] = {0,
#define FUZZ_SIZE(name, record, keys, entries, listKeys, meaning) KSI_SIZE_##record,
                                   KSI_NODES(FUZZ_SIZE)
#undef FUZZ_SIZE
};

struct State {
  Feed feed;
  size_t entries = 0;
  std::set<const KSI_ParamList*> lists;
};

std::optional<State> state;

[[noreturn]] void Misuse(const char* what) {
  std::fprintf(stderr, "misuse of the library: %s\n", what);
  std::abort();
}

Feed& TheFeed() {
  if (!state) Misuse("a call outside of a run");
  return state->feed;
}

KSI_ParamList& Checked(KSI_ParamList* list) {
  if (!state || !state->lists.contains(list)) Misuse("a list that is none");
  return *list;
}

// Most calls succeed, so that an input reaches far. Those after its end fail: a report goes on for
// as long as a kernel has something to tell.
uint32_t TakeStatus() {
  if (TheFeed().Empty()) return kFailure;
  const uint8_t byte = TheFeed().Byte();
  if (byte < 0xf0) return 0;
  return byte == 0xff ? TheFeed().Number<uint32_t>() : kFailure + (byte & 0x0f);
}

size_t RecordSizeOf(uint16_t node) {
  if (node == kNone || node >= std::size(kRecordSizes)) Misuse("no such node");
  return kRecordSizes[node];
}

KSI_ParamList* NewList(int version, int capacity) {
  if (version != 1 || capacity < 0) Misuse("a list of a bad version or capacity");
  if (TheFeed().Byte() == 0xff) return nullptr;
  auto* list = new KSI_ParamList{static_cast<size_t>(capacity), {}, kNone};
  state->lists.insert(list);
  return list;
}

uint32_t Add(KSI_ParamList* handle, std::variant<uint64_t, std::string> entry) {
  KSI_ParamList& list = Checked(handle);
  if (const uint32_t status = TakeStatus()) return status;
  if (list.entries.size() == list.capacity) return kTooManyElements;
  list.entries.push_back(std::move(entry));
  return 0;
}

void TakeEntries(uint16_t node, KSI_ParamList& list) {
  Feed& feed = TheFeed();
  const bool numbers =
      node == k_sched_groups_members_groups || node == k_sched_groups_members_memClients;
  for (size_t count = feed.Byte() % (kMostEntriesOfList + 1); count > 0; --count) {
    if (++state->entries > kMostEntries) return;
    const uint8_t form = feed.Byte();
    if (form == 0xff ? !numbers : numbers) {
      list.entries.emplace_back(form % 2 == 0 ? feed.Byte() : feed.Number<uint64_t>());
    } else {
      list.entries.emplace_back(feed.Text(form % 100));
    }
  }
}

uint32_t TakeList(uint16_t node, KSI_ParamList* keys, KSI_ParamList** out) {
  RecordSizeOf(node);
  if (keys != nullptr) Checked(keys);
  if (const uint32_t status = TakeStatus()) return status;
  auto* list = new KSI_ParamList{kMostEntries, {}, node};
  state->lists.insert(list);
  TakeEntries(node, *list);
  *out = list;
  return 0;
}

template <class Kind>
uint32_t ReadEntry(KSI_ParamList* handle, uint32_t index, const Kind** out) {
  KSI_ParamList& list = Checked(handle);
  if (const uint32_t status = TakeStatus()) return status;
  if (index >= list.entries.size()) return kNotFound;
  *out = std::get_if<Kind>(&list.entries[index]);
  return *out == nullptr ? kBadParamType : 0;
}

}  // namespace

FedLibrary::FedLibrary(std::span<const uint8_t> answers) {
  state.emplace(State{Feed(answers), 0, {}});
}

FedLibrary::~FedLibrary() {
  for (const KSI_ParamList* list : state->lists) {
    if (!list->mayBeLeft) Misuse("a list was not destroyed");
    delete list;
  }
  state.reset();
}

}  // namespace fuzz

using namespace fuzz;

#define FUZZ_NODE(name, record, keys, entries, listKeys, meaning) \
  const uint16_t KSI_NODE_##name = k_##name;
KSI_NODES(FUZZ_NODE)
#undef FUZZ_NODE

uint32_t KSI_UseCache(const char* fileName, int flags) {
  if (fileName == nullptr || flags != 0) Misuse("KSI_UseCache");
  return TakeStatus();
}

uint32_t KSI_CheckSig(char* buildBuffer, size_t size, const char** appBuild) {
  if (size != 21) Misuse("KSI_CheckSig with another size");
  TheFeed().Fill({reinterpret_cast<uint8_t*>(buildBuffer), size});
  *appBuild = "Nov 21 2026 10:00:00";
  return TakeStatus();
}

uint32_t KSI_Get(uint16_t node, KSI_ParamList* keys, void* buffer, size_t size) {
  if (size == 0 || size != RecordSizeOf(node)) Misuse("KSI_Get with another size");
  if (keys != nullptr) Checked(keys);
  if (const uint32_t status = TakeStatus()) return status;
  TheFeed().Fill({static_cast<uint8_t*>(buffer), size});
  return 0;
}

uint32_t KSI_GetInstanceList(uint16_t node, KSI_ParamList* keys, KSI_ParamList* handle) {
  RecordSizeOf(node);
  if (keys != nullptr) Checked(keys);
  KSI_ParamList& list = Checked(handle);
  if (const uint32_t status = TakeStatus()) return status;
  KSI_ParamList taken{list.capacity, {}, node};
  TakeEntries(node, taken);
  if (list.entries.size() + taken.entries.size() > list.capacity) return kTooManyElements;
  for (auto& entry : taken.entries) list.entries.push_back(std::move(entry));
  return 0;
}

uint32_t KSI_GetInstanceListAlloc(uint16_t node, KSI_ParamList* keys, KSI_ParamList** list) {
  return TakeList(node, keys, list);
}

uint32_t KSI_GetInstanceListAllocHint(uint16_t node, KSI_ParamList* keys, uint32_t /*hint*/,
                                      KSI_ParamList** list) {
  return TakeList(node, keys, list);
}

KSI_ParamList* KSI_ParamListCreate(int version, int capacity) { return NewList(version, capacity); }

KSI_ParamList* KSI_ParamListCreateAndAllocateParams(int version, int capacity, size_t /*bytes*/) {
  return NewList(version, capacity);
}

uint32_t KSI_ParamListAddInt(KSI_ParamList* list, uint64_t value) { return Add(list, value); }

uint32_t KSI_ParamListAddString(KSI_ParamList* list, const char* text) {
  if (text == nullptr) Misuse("a string that is none");
  return Add(list, std::string(text));
}

void KSI_ParamListRemoveLastParam(KSI_ParamList* list) {
  auto& entries = Checked(list).entries;
  if (!entries.empty()) entries.pop_back();
}

uint32_t KSI_ParamListUsedCount(KSI_ParamList* list) {
  return static_cast<uint32_t>(Checked(list).entries.size());
}

uint32_t KSI_ParamListGetInt64(KSI_ParamList* list, uint32_t index, int64_t* out) {
  const uint64_t* number = nullptr;
  const uint32_t status = ReadEntry(list, index, &number);
  if (status == 0) *out = static_cast<int64_t>(*number);
  return status;
}

uint32_t KSI_ParamListGetUInt32(KSI_ParamList* list, uint32_t index, uint32_t* out) {
  const uint64_t* number = nullptr;
  const uint32_t status = ReadEntry(list, index, &number);
  if (status == 0) *out = static_cast<uint32_t>(*number);
  return status;
}

uint32_t KSI_ParamListGetString(KSI_ParamList* list, uint32_t index, const char** out) {
  const std::string* text = nullptr;
  const uint32_t status = ReadEntry(list, index, &text);
  if (status == 0) *out = text->c_str();
  // lpool-stats has always left the list of which it cannot read a name.
  if (status != 0 && list->node == k_memory_lpage_nodeList_vmPools) list->mayBeLeft = true;
  return status;
}

void KSI_ParamListDestroy(KSI_ParamList* list) {
  delete &Checked(list);
  state->lists.erase(list);
}

char* Str_Strcpy(char* destination, const char* source, size_t size) {
  if (size == 0) Misuse("Str_Strcpy into no room");
  std::snprintf(destination, size, "%s", source);
  return destination;
}
