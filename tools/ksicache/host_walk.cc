#include "tools/ksicache/host_walk.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <optional>

#include <knvlibs/ksi_records.h>
#include "knvlibs/node_table.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/progress.h"

namespace ksicache {
namespace {

constexpr int64_t kRootGroup = 0;

// More memory nodes than any machine has.
constexpr uint32_t kMostMemNodes = 1024;

// Whether some node takes such keys.
bool IsKeying(const ksi::Keying& keying) {
  return std::ranges::any_of(ksi::Catalogue(), [&](const ksi::Node& node) {
    return node.HasValue() && node.valueKeys == keying;
  });
}

}  // namespace

ksi::Keying HostWalk::KeyingOf(const Object& object) {
  ksi::Keying keying;
  for (size_t i = 0; i < object.size(); ++i) keying.at[i] = object[i].instance;
  return keying;
}

ksi::Keys HostWalk::KeysOf(const Object& object) {
  ksi::Keys keys;
  for (const ObjectKey& key : object) {
    if (key.instance == ksi::Instance::kNone) break;
    keys.at[keys.count++] = {ksi::KindOf(key.instance), key.number, key.text};
  }
  return keys;
}

void HostWalk::Run(bool progress) {
  Find({});
  for (const std::string_view state : ksi::kMemoryStates) FindText(ksi::Instance::kState, state);
  FindNumber(ksi::Instance::kGroup, kRootGroup);
  std::optional<Progress> bar;
  if (progress) bar.emplace("capturing");
  size_t done = 0;
  while (!toRead_.empty()) {
    if (bar) bar->Show(done, done + toRead_.size());
    const Object object = std::move(toRead_.back());
    toRead_.pop_back();
    Read(object);
    ++done;
  }
}

void HostWalk::RequireFound() const {
  if (foundAnything_) return;
  const FailedReads& first = failures_.failed.Count() != 0    ? failures_.failed
                             : failures_.refused.Count() != 0 ? failures_.refused
                                                              : failures_.absent;
  throw Error("nothing of the host can be read; failed reads " + first.Text());
}

void HostWalk::Find(const Object& object) {
  if (found_.insert(object).second) toRead_.push_back(object);
}

void HostWalk::FindNumber(ksi::Instance instance, int64_t number) {
  Find({ObjectKey{instance, number, {}}});
}

void HostWalk::FindText(ksi::Instance instance, std::string_view text) {
  Find({ObjectKey{instance, 0, std::string(text)}});
}

void HostWalk::Read(const Object& object) {
  const ksi::Keying keying = KeyingOf(object);
  const ksi::Keys keys = KeysOf(object);
  for (const ksi::Node& node : ksi::Catalogue()) {
    if (node.HasValue() && node.valueKeys == keying) ReadValue(node, keys);
    if (node.HasList() && node.listKeys == keying) ReadList(node, keys, object);
  }
}

void HostWalk::ReadValue(const ksi::Node& node, const ksi::Keys& keys) {
  std::array<std::byte, ksi::kMaxRecordSize> buffer = {};
  const ksi::Buffer record = ksi::Buffer(buffer).first(node.recordSize);
  const ksi::Status status = host_.Value(node, keys, record);
  if (status != ksi::kOk) return AddFailure(node, ksi::Kind::kValue, keys, status);
  sink_.AddValue(node, keys, record);
  foundAnything_ = foundAnything_ ||
                   std::ranges::any_of(record, [](std::byte byte) { return byte != std::byte{0}; });
  FindInValue(node, record);
}

void HostWalk::ReadList(const ksi::Node& node, const ksi::Keys& keys, const Object& object) {
  HostLibrary::Instances instances;
  const ksi::Status status = host_.List(node, keys, &instances);
  if (status != ksi::kOk) return AddFailure(node, ksi::Kind::kList, keys, status);
  sink_.AddList(node, keys, instances.Entries());
  foundAnything_ = foundAnything_ || !instances.Entries().empty();
  FindInList(node, object, instances.Entries());
}

void HostWalk::AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys,
                          ksi::Status status) {
  sink_.AddFailure(node, kind, keys, status);
  failures_.Add(status, [&] { return NameOf(node.path, keys); });
}

// Objects that a value, and no list, leads to.
void HostWalk::FindInValue(const ksi::Node& node, ksi::Buffer record) {
  switch (ksi::IdOf(node)) {
    case ksi::node::sched_groups_groupLeaderID:
    case ksi::node::worldGroups_vmmLeaderID: {
      int32_t client = 0;
      std::memcpy(&client, record.data(), sizeof client);
      FindNumber(ksi::Instance::kClient, client);
      break;
    }
    case ksi::node::memory_memInfo: {
      KSI_MemInfo info;
      std::memcpy(&info, record.data(), sizeof info);
      for (uint32_t i = 0; i < info.numNodes && i < kMostMemNodes; ++i) {
        FindNumber(ksi::Instance::kMemNode, i);
      }
      break;
    }
    default:
      break;
  }
}

// An instance stands below the object that lists it, such as a client's remap type, or for itself,
// such as a group's child group.
void HostWalk::FindInList(const ksi::Node& node, const Object& object,
                          const std::vector<ksi::Key>& entries) {
  const size_t depth = node.listKeys.Count();
  ksi::Keying below = node.listKeys;
  if (depth < ksi::kMaxKeys) below.at[depth] = node.entries;
  const bool isBelow = !(below == node.listKeys) && IsKeying(below);
  // The last one found is read next, so the order is kept by going backwards.
  for (size_t i = entries.size(); i-- > 0;) {
    const ksi::Key& entry = entries[i];
    Object found;
    if (isBelow) found = object;
    found[isBelow ? depth : 0] = {node.entries, entry.number, std::string(entry.text)};
    Find(found);
    if (node.entries == ksi::Instance::kBuddy) FindMemNodeOf(entry.text);
  }
}

// A buddy's name holds the number of its memory node.
void HostWalk::FindMemNodeOf(std::string_view buddy) {
  constexpr size_t kNameSize = 15;
  if (!buddy.starts_with(KSI_BUDDY_PREFIX) || buddy.size() < KSI_BUDDY_NODE_AT) return;
  const std::string number(buddy.substr(0, kNameSize).substr(KSI_BUDDY_NODE_AT));
  const auto node = static_cast<uint32_t>(std::strtol(number.c_str(), nullptr, 10));
  FindNumber(ksi::Instance::kMemNode, node);
}

}  // namespace ksicache
