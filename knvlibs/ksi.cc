// The interface: checks what comes from outside, asks the source, and lets no exception out.
#pragma GCC visibility push(default)
#include <knvlibs/ksi.h>
#pragma GCC visibility pop

#include <sys/stat.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>
#include <memory>
#include <new>
#include <utility>

#include "knvlibs/handle.h"
#include "knvlibs/linux/linux_source.h"
#include "knvlibs/open_cache.h"
#include "knvlibs/param_list.h"
#include "knvlibs/source.h"

namespace ksi {
namespace {

// The source of the reads that name none: made on first use and never destroyed, because the
// process ends with it.
KSI_Source& CurrentSource() {
  static auto* const current = new KSI_Source(std::make_unique<LinuxSource>("/"));
  return *current;
}

KSI_Source& SourceOf(KSI_Source* handle) { return handle == nullptr ? CurrentSource() : *handle; }

void TellNoMemory() { Warning("out of memory\n"); }

// Runs one operation at the boundary.
template <class Operation>
Status Guarded(Operation&& operation) {
  try {
    return operation();
  } catch (const std::bad_alloc&) {
    TellNoMemory();
    return KSI_STATUS_NO_MEMORY;
  } catch (...) {
    return KSI_STATUS_FAILURE;
  }
}

Status TakeKeys(const ParamList* list, const Keying& keying, Keys* keys) {
  const size_t count = list == nullptr ? 0 : list->Count();
  if (count != keying.Count()) return KSI_STATUS_BAD_PARAM_COUNT;
  for (size_t i = 0; i < count; ++i) {
    Key& key = keys->at[i];
    key.kind = list->Kind(i);
    if (key.kind != KindOf(keying.at[i])) return KSI_STATUS_BAD_PARAM_TYPE;
    if (key.kind == KeyKind::kNumber) {
      key.number = static_cast<int64_t>(list->Number(i));
    } else {
      key.text = list->Text(i);
    }
  }
  keys->count = count;
  return kOk;
}

Status Get(KSI_Source* source, uint16_t id, const ParamList* list, void* buffer, size_t size) {
  const Node* node = FindNode(id);
  if (node == nullptr) return KSI_STATUS_INVALID_NODE;
  if (!node->HasValue()) return KSI_STATUS_NO_HANDLER;
  if (buffer == nullptr) return KSI_STATUS_BAD_PARAM;
  if (size != node->recordSize) return KSI_STATUS_LENGTH_MISMATCH;
  Keys keys;
  Status status = TakeKeys(list, node->valueKeys, &keys);
  if (status != kOk) return status;

  std::array<std::byte, kMaxRecordSize> record;
  std::memset(record.data(), 0, size);
  status = SourceOf(source).Ask(
      [&](Source& asked) { return asked.Value(*node, keys, Buffer(record).first(size)); });
  if (status == kOk) std::memcpy(buffer, record.data(), size);
  return status;
}

Status GetInstances(KSI_Source* source, uint16_t id, const ParamList* list, ParamList& instances) {
  const Node* node = FindNode(id);
  if (node == nullptr) return KSI_STATUS_INVALID_NODE;
  if (!node->HasList()) return KSI_STATUS_NO_HANDLER;
  Keys keys;
  const Status status = TakeKeys(list, node->listKeys, &keys);
  if (status != kOk) return status;
  return SourceOf(source).Ask(
      [&](Source& asked) { return asked.Instances(*node, keys, instances); });
}

Status GetInstanceListAlloc(KSI_Source* source, uint16_t id, const ParamList* keys, uint32_t hint,
                            ParamList** out) {
  if (out == nullptr) return KSI_STATUS_BAD_PARAM;
  // A hint is worth an allocation less, not the trust that so many will come.
  constexpr uint32_t kLargestHint = 4096;
  auto instances = std::make_unique<ParamList>(ParamList::kNoLimit);
  instances->Reserve(std::min(hint, kLargestHint));
  const Status status = GetInstances(source, id, keys, *instances);
  if (status == kOk) *out = instances.release();
  return status;
}

Status CheckSig(KSI_Source* source, char* buildBuffer, size_t size, const char** appBuild) {
  const bool matches = SourceOf(source).Ask([&](const Source& asked) {
    const Definitions kernel = asked.KernelDefinitions();
    Str_Strcpy(buildBuffer, kernel.built.data(), size);
    return kernel.signature == kDefinitions.signature;
  });
  if (buildBuffer == nullptr || size == 0 || appBuild == nullptr) return KSI_STATUS_BAD_PARAM;
  return matches ? kOk : KSI_STATUS_CHECKSUM_MISMATCH;
}

Status OpenHost(const char* root, std::unique_ptr<Source>* source) {
  struct stat directory;
  if (root == nullptr) root = "/";
  if (stat(root, &directory) != 0) return StatusOfErrno(errno);
  if (!S_ISDIR(directory.st_mode)) return StatusOfErrno(ENOTDIR);
  *source = std::make_unique<LinuxSource>(root);
  return kOk;
}

Status OpenSource(const char* fileName, std::unique_ptr<Source>* source) {
  if (fileName == nullptr) return KSI_STATUS_BAD_PARAM;
  return OpenCacheSource(fileName, source);
}

// Gives what `open` opens to the caller.
template <class Open>
Status OpenHandle(KSI_Source** handle, Open&& open) {
  return Guarded([&]() -> Status {
    if (handle == nullptr) return KSI_STATUS_BAD_PARAM;
    std::unique_ptr<Source> source;
    const Status status = open(&source);
    if (status == kOk) *handle = new KSI_Source(std::move(source));
    return status;
  });
}

constexpr int kParamListVersion = 1;

template <class Make>
ParamList* CreateList(int version, int capacity, Make&& make) {
  if (version != kParamListVersion || capacity < 0) return nullptr;
  try {
    return make(static_cast<size_t>(capacity));
  } catch (const std::bad_alloc&) {
    TellNoMemory();
    return nullptr;
  } catch (...) {
    return nullptr;
  }
}

// Reads entry `index` of `list` with `read` if it is there and of this kind.
template <class Out, class Read>
Status ReadEntry(const ParamList* list, uint32_t index, KeyKind kind, Out* out, Read&& read) {
  if (list == nullptr || out == nullptr) return KSI_STATUS_BAD_PARAM;
  if (index >= list->Count()) return KSI_STATUS_NOT_FOUND;
  if (list->Kind(index) != kind) return KSI_STATUS_BAD_PARAM_TYPE;
  *out = read();
  return kOk;
}

}  // namespace
}  // namespace ksi

uint32_t KSI_UseCache(const char* fileName, int flags) {
  return ksi::Guarded([&]() -> ksi::Status {
    if (flags != 0) return KSI_STATUS_BAD_PARAM;
    std::unique_ptr<ksi::Source> source;
    const ksi::Status status = ksi::OpenSource(fileName, &source);
    if (status == ksi::kOk) ksi::CurrentSource().Become(std::move(source));
    return status;
  });
}

uint32_t KSI_CheckSig(char* buildBuffer, size_t size, const char** appBuild) {
  return KSI_SourceCheckSig(nullptr, buildBuffer, size, appBuild);
}

uint32_t KSI_Get(uint16_t node, struct KSI_ParamList* keys, void* buffer, size_t size) {
  return KSI_SourceGet(nullptr, node, keys, buffer, size);
}

uint32_t KSI_GetInstanceList(uint16_t node, struct KSI_ParamList* keys,
                             struct KSI_ParamList* list) {
  return ksi::Guarded([&]() -> ksi::Status {
    if (list == nullptr) return KSI_STATUS_BAD_PARAM;
    ksi::ParamList instances(ksi::ParamList::kNoLimit);
    const ksi::Status status = ksi::GetInstances(nullptr, node, keys, instances);
    return status == ksi::kOk ? list->Append(instances) : status;
  });
}

uint32_t KSI_GetInstanceListAlloc(uint16_t node, struct KSI_ParamList* keys,
                                  struct KSI_ParamList** list) {
  return KSI_SourceGetInstanceListAlloc(nullptr, node, keys, list);
}

uint32_t KSI_GetInstanceListAllocHint(uint16_t node, struct KSI_ParamList* keys, uint32_t hint,
                                      struct KSI_ParamList** list) {
  return ksi::Guarded([&] { return ksi::GetInstanceListAlloc(nullptr, node, keys, hint, list); });
}

uint32_t KSI_OpenHost(const char* root, struct KSI_Source** source) {
  return ksi::OpenHandle(
      source, [&](std::unique_ptr<ksi::Source>* opened) { return ksi::OpenHost(root, opened); });
}

uint32_t KSI_OpenCache(const char* fileName, struct KSI_Source** source) {
  return ksi::OpenHandle(source, [&](std::unique_ptr<ksi::Source>* opened) {
    return ksi::OpenSource(fileName, opened);
  });
}

void KSI_CloseSource(struct KSI_Source* source) { delete source; }

void KSI_RefreshSource(struct KSI_Source* source) {
  // Without the memory for the current source there is nothing that it could have kept.
  static_cast<void>(ksi::Guarded([&] {
    ksi::SourceOf(source).Ask([](ksi::Source& asked) { asked.Refresh(); });
    return ksi::kOk;
  }));
}

uint32_t KSI_SourceCheckSig(struct KSI_Source* source, char* buildBuffer, size_t size,
                            const char** appBuild) {
  if (appBuild != nullptr) *appBuild = ksi::kDefinitions.built.data();
  return ksi::Guarded([&] { return ksi::CheckSig(source, buildBuffer, size, appBuild); });
}

uint32_t KSI_SourceGet(struct KSI_Source* source, uint16_t node, struct KSI_ParamList* keys,
                       void* buffer, size_t size) {
  return ksi::Guarded([&] { return ksi::Get(source, node, keys, buffer, size); });
}

uint32_t KSI_SourceGetInstanceListAlloc(struct KSI_Source* source, uint16_t node,
                                        struct KSI_ParamList* keys, struct KSI_ParamList** list) {
  return ksi::Guarded([&] { return ksi::GetInstanceListAlloc(source, node, keys, 0, list); });
}

uint32_t KSI_SourceOrigin(struct KSI_Source* source, int64_t* taken, char* host, size_t size) {
  return ksi::Guarded([&]() -> ksi::Status {
    if (taken == nullptr || (host != nullptr && size == 0)) return KSI_STATUS_BAD_PARAM;
    const auto origin =
        ksi::SourceOf(source).Ask([](const ksi::Source& asked) { return asked.GetOrigin(); });
    if (!origin) return KSI_STATUS_NOT_FOUND;
    *taken = origin->taken;
    if (host != nullptr) Str_Strcpy(host, origin->host.c_str(), size);
    return ksi::kOk;
  });
}

uint32_t KSI_SourceNextMoment(struct KSI_Source* source) {
  return ksi::Guarded([&] {
    return ksi::SourceOf(source).Ask([](ksi::Source& asked) { return asked.NextMoment(); });
  });
}

uint32_t KSI_SourceWalkStatus(struct KSI_Source* source) {
  return ksi::Guarded([&] {
    return ksi::SourceOf(source).Ask([](const ksi::Source& asked) { return asked.WalkStatus(); });
  });
}

uint32_t KSI_SourceLossStatus(struct KSI_Source* source) {
  return ksi::Guarded([&] {
    return ksi::SourceOf(source).Ask([](const ksi::Source& asked) { return asked.LossStatus(); });
  });
}

struct KSI_ParamList* KSI_ParamListCreate(int version, int capacity) {
  return ksi::CreateList(version, capacity, [](size_t room) { return new ksi::ParamList(room); });
}

struct KSI_ParamList* KSI_ParamListCreateAndAllocateParams(int version, int capacity,
                                                           size_t bytes) {
  // More than any host's names take, and little enough to ask for.
  constexpr size_t kMostBytes = size_t{1} << 30;
  if (bytes > kMostBytes) return nullptr;
  return ksi::CreateList(version, capacity,
                         [&](size_t room) { return new ksi::ParamList(room, bytes); });
}

uint32_t KSI_ParamListAddInt(struct KSI_ParamList* list, uint64_t value) {
  if (list == nullptr) return KSI_STATUS_BAD_PARAM;
  return ksi::Guarded([&] { return list->AddNumber(value); });
}

uint32_t KSI_ParamListAddString(struct KSI_ParamList* list, const char* text) {
  if (list == nullptr || text == nullptr) return KSI_STATUS_BAD_PARAM;
  return ksi::Guarded([&] { return list->AddText(text); });
}

void KSI_ParamListRemoveLastParam(struct KSI_ParamList* list) {
  if (list != nullptr) list->RemoveLast();
}

uint32_t KSI_ParamListUsedCount(struct KSI_ParamList* list) {
  return list == nullptr ? 0 : static_cast<uint32_t>(list->Count());
}

uint32_t KSI_ParamListGetInt64(struct KSI_ParamList* list, uint32_t index, int64_t* out) {
  return ksi::ReadEntry(list, index, ksi::KeyKind::kNumber, out,
                        [&] { return static_cast<int64_t>(list->Number(index)); });
}

uint32_t KSI_ParamListGetUInt32(struct KSI_ParamList* list, uint32_t index, uint32_t* out) {
  return ksi::ReadEntry(list, index, ksi::KeyKind::kNumber, out,
                        [&] { return static_cast<uint32_t>(list->Number(index)); });
}

uint32_t KSI_ParamListGetString(struct KSI_ParamList* list, uint32_t index, const char** out) {
  return ksi::ReadEntry(list, index, ksi::KeyKind::kText, out,
                        [&] { return list->Text(index).data(); });
}

void KSI_ParamListDestroy(struct KSI_ParamList* list) { delete list; }
