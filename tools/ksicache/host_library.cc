#include "tools/ksicache/host_library.h"

#include <algorithm>
#include <array>
#include <cstring>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_status.h>
#include "knvlibs/cache_format.h"
#include "tools/ksicache/error.h"

// A host's own library may lack nodes, and calls that came later: they are null then.
#define WEAK(pragma) _Pragma(#pragma)
#define WEAK_NODE(name, record, keys, entries, listKeys, meaning) WEAK(weak KSI_NODE_##name)
KSI_NODES(WEAK_NODE)
#pragma weak KSI_OpenHost
#pragma weak KSI_CloseSource
#pragma weak KSI_SourceCheckSig
#pragma weak KSI_SourceGet
#pragma weak KSI_SourceGetInstanceListAlloc
#pragma weak KSI_SourceLossStatus

namespace ksicache {
namespace {

// The library's identifiers of the nodes of the catalogue, in its order.
#define ADDRESS(name, record, keys, entries, listKeys, meaning) &KSI_NODE_##name,
const uint16_t* const kIdentifiers[] = {KSI_NODES(ADDRESS)};

const uint16_t* IdentifierOf(const ksi::Node& node) { return kIdentifiers[ksi::IdOf(node) - 1]; }

// The keys as a list of the library; null if there are none.
ksi::Status MakeList(const ksi::Keys& keys, OwnedList* made) {
  if (keys.count == 0) return ksi::kOk;
  OwnedList list(KSI_ParamListCreate(1, static_cast<int>(keys.count)));
  if (list == nullptr) return KSI_STATUS_NO_MEMORY;
  for (size_t i = 0; i < keys.count; ++i) {
    const ksi::Key& key = keys[i];
    const ksi::Status status =
        key.kind == ksi::KeyKind::kNumber
            ? KSI_ParamListAddInt(list.get(), static_cast<uint64_t>(key.number))
            : KSI_ParamListAddString(list.get(), std::string(key.text).c_str());
    if (status != ksi::kOk) return status;
  }
  *made = std::move(list);
  return ksi::kOk;
}

ksi::Status ReadEntry(KSI_ParamList* list, uint32_t index, ksi::Key* entry) {
  if (entry->kind == ksi::KeyKind::kNumber) {
    return KSI_ParamListGetInt64(list, index, &entry->number);
  }
  const char* text = "";
  const ksi::Status status = KSI_ParamListGetString(list, index, &text);
  entry->text = text;
  const bool fits = entry->text.size() <= ksi::cache::kLongestText;
  return status == ksi::kOk && !fits ? KSI_STATUS_LENGTH_MISMATCH : status;
}

// A date as a cache file has it: characters that print.
std::string DateOf(std::string text) {
  text.resize(ksi::cache::kDateSize, ' ');
  std::ranges::replace_if(
      text, [](char c) { return c < ' ' || c > '~'; }, '?');
  return text;
}

}  // namespace

void HostLibrary::Close::operator()(KSI_Source* source) const { KSI_CloseSource(source); }

bool HostLibrary::OpensHosts() {
  return &KSI_OpenHost != nullptr && &KSI_CloseSource != nullptr &&
         &KSI_SourceCheckSig != nullptr && &KSI_SourceGet != nullptr &&
         &KSI_SourceGetInstanceListAlloc != nullptr;
}

HostLibrary::HostLibrary(const std::string* root) {
  if (root == nullptr) return;
  if (!OpensHosts()) {
    throw Error("this libknvlibs.so reads no host but its own: --root takes the one of tally");
  }
  KSI_Source* source = nullptr;
  const ksi::Status status = KSI_OpenHost(root->c_str(), &source);
  if (status != ksi::kOk) throw Error(*root + ": cannot be opened: " + StatusText(status));
  source_.reset(source);
}

ksi::Status HostLibrary::Value(const ksi::Node& node, const ksi::Keys& keys, ksi::Buffer record) {
  const uint16_t* id = IdentifierOf(node);
  if (id == nullptr) return KSI_STATUS_INVALID_NODE;
  OwnedList list;
  const ksi::Status status = MakeList(keys, &list);
  if (status != ksi::kOk) return status;
  if (source_ == nullptr) return KSI_Get(*id, list.get(), record.data(), record.size());
  return KSI_SourceGet(source_.get(), *id, list.get(), record.data(), record.size());
}

ksi::Status HostLibrary::List(const ksi::Node& node, const ksi::Keys& keys, Instances* instances) {
  const uint16_t* id = IdentifierOf(node);
  if (id == nullptr) return KSI_STATUS_INVALID_NODE;
  OwnedList list;
  ksi::Status status = MakeList(keys, &list);
  if (status != ksi::kOk) return status;
  KSI_ParamList* found = nullptr;
  status = source_ == nullptr
               ? KSI_GetInstanceListAlloc(*id, list.get(), &found)
               : KSI_SourceGetInstanceListAlloc(source_.get(), *id, list.get(), &found);
  if (status != ksi::kOk) return status;
  instances->list_.reset(found);
  const uint32_t count = KSI_ParamListUsedCount(found);
  for (uint32_t i = 0; i < count && status == ksi::kOk; ++i) {
    ksi::Key entry = {ksi::KindOf(node.entries), 0, {}};
    status = ReadEntry(found, i, &entry);
    instances->entries_.push_back(entry);
  }
  return status;
}

ksi::Status HostLibrary::LossStatus() {
  return &KSI_SourceLossStatus == nullptr ? ksi::kOk : KSI_SourceLossStatus(source_.get());
}

HostLibrary::Definitions HostLibrary::KernelDefinitions() {
  std::array<char, KSI_BUILD_DATE_SIZE> built = {};
  const char* ownBuilt = nullptr;
  const ksi::Status status =
      source_ == nullptr ? KSI_CheckSig(built.data(), built.size(), &ownBuilt)
                         : KSI_SourceCheckSig(source_.get(), built.data(), built.size(), &ownBuilt);
  return {status == ksi::kOk ? std::string(ksi::kDefinitions.signature)
                             : std::string(ksi::cache::kSignatureSize, '0'),
          DateOf({built.data(), strnlen(built.data(), built.size())})};
}

}  // namespace ksicache
