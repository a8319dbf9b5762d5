#include "tests/knvlibs/host_tree.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>

#include "knvlibs/catalogue.h"

namespace ksi {
namespace {

Keys KeysOf(KeyList list) {
  Keys keys;
  for (const auto& key : list) {
    Key& at = keys.at[keys.count++];
    if (const auto* number = std::get_if<int64_t>(&key)) {
      at.number = *number;
    } else {
      at.kind = KeyKind::kText;
      at.text = std::get<std::string>(key);
    }
  }
  return keys;
}

std::string TextOf(const Field& field, const std::byte* at) {
  if (field.type == FieldType::kText) {
    const char* text = reinterpret_cast<const char*>(at);
    return {text, strnlen(text, field.width)};
  }
  uint64_t figure = 0;
  std::memcpy(&figure, at, field.width);
  const uint64_t noValue = ~uint64_t{0} >> (64 - 8 * field.width);
  return figure == noValue ? "no value" : std::to_string(figure);
}

// Appends the figures of a record, or the status of the read that failed.
void AppendValue(Source& source, std::string_view path, KeyList keys, std::string* text) {
  std::string heading(path);
  for (const auto& key : keys) {
    const auto* number = std::get_if<int64_t>(&key);
    heading += " " + (number != nullptr ? std::to_string(*number) : std::get<std::string>(key));
  }
  *text += heading + "\n";

  const Node* node = FindNode(path);
  std::array<std::byte, kMaxRecordSize> record = {};
  const Status status = GetValue(source, path, keys, std::span(record).first(node->recordSize));
  if (status != kOk) {
    std::array<char, 32> line;
    (void)std::snprintf(line.data(), line.size(), "  status %#x\n", status);
    *text += line.data();
    return;
  }
  for (const Field& field : node->fields) {
    *text += std::string("  ") + field.name + ": " + TextOf(field, &record[field.offset]) + "\n";
  }
}

std::vector<std::string> Listed(Source& source, std::string_view path, KeyList keys) {
  std::vector<std::string> names;
  EXPECT_EQ(GetNames(source, path, keys, &names), kOk) << path;
  return names;
}

// Appends a record in one line without its zeros; nothing for one that is not there.
void AppendShort(Source& source, std::string_view path, KeyList keys, std::string_view indent,
                 std::string* text) {
  const Node* node = FindNode(path);
  std::array<std::byte, kMaxRecordSize> record = {};
  const Status status = GetValue(source, path, keys, std::span(record).first(node->recordSize));
  if (status == KSI_STATUS_NOT_FOUND) return;
  *text += indent;
  *text += "  " + std::string(path.substr(path.rfind('/') + 1)) + ":";
  if (status != kOk) {
    std::array<char, 32> words;
    std::snprintf(words.data(), words.size(), " status %#x", status);
    *text += words.data();
  }
  for (const Field& field : node->fields) {
    const std::string figure = TextOf(field, &record[field.offset]);
    if (figure != "0") *text += std::string(" ") + field.name + " " + figure;
  }
  *text += "\n";
}

void AppendClient(Source& source, int64_t client, const std::string& indent, std::string* text) {
  *text += indent + "  client " + std::to_string(client) + "\n";
  for (const std::string_view path :
       {"worldGroups/vmmLeaderID", "sched/memClients/tally/totalCommon",
        "sched/memClients/tally/uw", "sched/memClients/tally/vmm", "sched/memClients/tally/guest",
        "sched/memClients/swapInfo", "sched/memClients/memzipInfo", "memory/lpage/vmLPage"}) {
    AppendShort(source, path, {client}, indent + "  ", text);
  }
  EXPECT_EQ(Listed(source, "sched/memClients/remapTypes", {client}), std::vector<std::string>());
}

void AppendGroup(Source& source, int64_t group, const std::string& indent, std::string* text) {
  *text += indent + "group " + std::to_string(group) + "\n";
  for (const std::string_view path :
       {"sched/groups/groupName", "sched/groups/groupTag", "sched/groups/parentGroupID",
        "sched/groups/groupFlags", "sched/groups/groupLeaderID", "sched/groups/memAllocationInKB",
        "sched/groups/stats/capacity", "sched/groups/stats/memoryStats"}) {
    AppendShort(source, path, {group}, indent, text);
  }
  for (const int64_t client : GetIds(source, "sched/groups/members/memClients", {group})) {
    AppendClient(source, client, indent, text);
  }
  for (const int64_t child : GetIds(source, "sched/groups/members/groups", {group})) {
    AppendGroup(source, child, indent + "  ", text);
  }
}

}  // namespace

HostTree::HostTree() : root_((std::filesystem::temp_directory_path() / "hostXXXXXX").string()) {
  if (mkdtemp(root_.data()) == nullptr) std::abort();
  // Another user is to see what it may see.
  chmod(root_.c_str(), 0755);
}

HostTree::~HostTree() {
  std::error_code ignored;
  std::filesystem::remove_all(root_, ignored);
}

void HostTree::Write(std::string_view file, std::string_view content) const {
  const std::filesystem::path path = root_ + std::string(file);
  std::filesystem::create_directories(path.parent_path());
  std::ofstream(path) << content;
}

void HostTree::Lock(std::string_view file) const { chmod((root_ + std::string(file)).c_str(), 0); }

std::string RecordedHost(std::string_view name) {
  return std::string(TALLY_TESTS_DIRECTORY "/knvlibs/hosts/") + std::string(name);
}

Status GetValue(Source& source, std::string_view path, KeyList keys, std::span<std::byte> record) {
  return source.Value(*FindNode(path), KeysOf(keys), record);
}

Status GetNames(Source& source, std::string_view path, KeyList keys,
                std::vector<std::string>* names) {
  ParamList list(ParamList::kNoLimit);
  const Status status = source.Instances(*FindNode(path), KeysOf(keys), list);
  names->clear();
  for (size_t i = 0; i < list.Count(); ++i) names->emplace_back(list.Text(i));
  return status;
}

std::string HostText(Source& source) {
  std::string text;
  AppendValue(source, "memory/pshare/stats", {}, &text);
  AppendValue(source, "memory/memInfo", {}, &text);
  const std::vector<std::string> buddies = Listed(source, "system/buddy", {});
  for (const std::string& buddy : buddies) {
    AppendValue(source, "system/buddy/comprehensive", {buddy}, &text);
  }
  // One more than there are.
  for (int64_t node = 0; node < 3; ++node) {
    AppendValue(source, "memory/memNodes", {node}, &text);
    AppendValue(source, "memory/lpage/nodeList/psharePool", {node}, &text);
    std::vector<std::string> pools;
    if (GetNames(source, "memory/lpage/nodeList/vmPools", {node}, &pools) != kOk) break;
    for (const std::string& pool : pools) {
      AppendValue(source, "memory/lpage/nodeList/vmPools", {node, pool}, &text);
    }
  }
  for (const std::string& heap : Listed(source, "system/heaps", {})) {
    AppendValue(source, "system/heaps/stats", {heap}, &text);
  }
  for (const std::string& volume : Listed(source, "memory/pmem/volumes", {})) {
    AppendValue(source, "memory/pmem/volumes/info", {volume}, &text);
    AppendValue(source, "memory/pmem/volumes/regionStore/info", {volume}, &text);
    AppendValue(source, "memory/pmem/volumes/regionStore/isClean", {volume}, &text);
    for (const std::string& region :
         Listed(source, "memory/pmem/volumes/regionStore/regions", {volume})) {
      AppendValue(source, "memory/pmem/volumes/regionStore/regions/info", {volume, region}, &text);
    }
  }
  return text;
}

std::vector<int64_t> GetIds(Source& source, std::string_view path, KeyList keys) {
  ParamList list(ParamList::kNoLimit);
  EXPECT_EQ(source.Instances(*FindNode(path), KeysOf(keys), list), kOk) << path;
  std::vector<int64_t> ids;
  for (size_t i = 0; i < list.Count(); ++i) ids.push_back(static_cast<int64_t>(list.Number(i)));
  return ids;
}

std::string GroupsText(Source& source) {
  std::string text;
  AppendShort(source, "sched/globalStats/numVMs", {}, "", &text);
  AppendGroup(source, 0, "", &text);
  return text;
}

}  // namespace ksi
