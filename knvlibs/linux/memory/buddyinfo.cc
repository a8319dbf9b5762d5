#include "knvlibs/linux/memory/buddyinfo.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstdio>
#include <string>
#include <string_view>
#include <vector>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/memory/memory_nodes.h"
#include "knvlibs/linux/memory/zoneinfo.h"
#include "knvlibs/linux/reader_tables.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

constexpr std::string_view kFile = "/proc/buddyinfo";

// Readers of the list have room for so many names.
constexpr size_t kMaxBuddies = 99;

// How a zone is called in the name of its buddy: "memmap-", the memory node in two digits, '-' and
// this. A name has at most 15 characters. Low memory, which old devices need, starts with "lo" and
// ends in 'o', no other does.
struct ZoneName {
  std::string_view zone;
  const char* name;
};
constexpr ZoneName kZoneNames[] = {{"DMA", "lo"},       {"DMA32", "lo32o"},  {"Normal", "hi"},
                                   {"HighMem", "hi-h"}, {"Movable", "hi-m"}, {"Device", "hi-d"}};

const char* NameOfZone(std::string_view zone) {
  const auto* found = std::ranges::find(kZoneNames, zone, &ZoneName::zone);
  return found == std::end(kZoneNames) ? nullptr : found->name;
}

// Reads "Node 0, zone   Normal   2042   4237 ..." : free buffers of one page, two, four ...
bool ParseLine(std::string_view line, uint64_t& node, std::string_view& zone,
               std::vector<uint64_t>& free) {
  if (!TakePrefix(line, "Node ")) return false;
  std::string_view number = TakeWord(line);
  if (!number.ends_with(',')) return false;
  number.remove_suffix(1);
  if (!ParseNumber(number, node) || TakeWord(line) != "zone") return false;
  zone = TakeWord(line);
  free.clear();
  for (std::string_view word = TakeWord(line); !word.empty(); word = TakeWord(line)) {
    if (!ParseNumber(word, free.emplace_back())) return false;
  }
  return !free.empty() && free.size() < 64;
}

KSI_BuddyStats StatsOf(const std::vector<uint64_t>& free, uint64_t managed, uint64_t pageKB) {
  KSI_BuddyStats stats = {};
  // The size of a page among the sizes of the record.
  const auto first = static_cast<size_t>(std::countr_zero(pageKB / 4));
  std::array<uint64_t, KSI_BUDDY_SIZES> buffers = {};
  uint64_t freePages = 0;
  for (size_t order = 0; order < free.size(); ++order) {
    freePages += free[order] << order;
    // Larger buffers than the record knows count as several of its largest.
    const size_t last = KSI_BUDDY_SIZES - 1;
    const size_t size = std::min(first + order, last);
    buffers[size] += free[order] << (first + order - size);
  }
  for (size_t size = 0; size < buffers.size(); ++size) {
    stats.buffers[size].free = FieldOf<uint32_t>(buffers[size]);
  }
  // Linux does not keep the sizes of buffers in use.
  const uint64_t usedPages = Less(managed, freePages);
  stats.buffers[0].used = FieldOf<uint32_t>(usedPages << first);
  return stats;
}

Status ListBuddies(const LinuxHost& host, const Keys& /*keys*/, ParamList& instances) {
  const Buddies* buddies = nullptr;
  Status status = host.Kept().buddies.Get(host, buddies);
  if (status != kOk) return status;
  for (const Buddy& buddy : *buddies) {
    status = instances.AddText(buddy.name);
    if (status != kOk) return status;
  }
  return kOk;
}

Status ReadBuddy(const LinuxHost& host, const Keys& keys, KSI_BuddyStats& record) {
  const Buddies* buddies = nullptr;
  const Status status = host.Kept().buddies.Get(host, buddies);
  if (status != kOk) return status;
  const auto buddy = std::ranges::find(*buddies, keys[0].text, &Buddy::name);
  if (buddy == buddies->end()) return KSI_STATUS_NOT_FOUND;
  record = buddy->stats;
  return kOk;
}

constexpr Reader kReaders[] = {
    ListOf<node::system_buddy>(ListBuddies),
    ValueOf<node::system_buddy_comprehensive, ReadBuddy>(),
};

}  // namespace

constinit const ReaderTable kBuddyReaders = kReaders;

Status ReadBuddies(const LinuxHost& host, Buddies& buddies) {
  std::string content;
  const Zones* zones = nullptr;
  const MemoryNodes* nodes = nullptr;
  Status status = FindMemoryNodes(host, nodes);
  if (status == kOk) status = host.Read(kFile, content);
  if (status == kOk) status = host.Kept().zones.Get(host, zones);
  if (status != kOk) return status;

  Lines lines(content);
  std::string_view line;
  std::vector<uint64_t> free;
  while (lines.Next(line)) {
    if (buddies.size() == kMaxBuddies) {
      Warning("%s: more than %zu zones: the others are left out\n", kFile.data(), kMaxBuddies);
      host.Lose(KSI_STATUS_LIMIT_EXCEEDED);
      break;
    }
    uint64_t numaNode = 0;
    std::string_view zoneName;
    if (!ParseLine(line, numaNode, zoneName, free)) return NotUnderstood(kFile, lines.Number());
    const char* suffix = NameOfZone(zoneName);
    if (suffix == nullptr) return NotUnderstood(kFile, lines.Number());

    // Memory may have come or gone since the other files were read.
    const std::optional<size_t> node = nodes->Of(numaNode);
    const auto zone = std::ranges::find_if(
        *zones, [&](const Zone& z) { return z.node == numaNode && z.name == zoneName; });
    if (!node || zone == zones->end()) continue;

    std::array<char, 40> name;
    (void)std::snprintf(name.data(), name.size(), "memmap-%02zu-%s", *node, suffix);
    buddies.push_back({name.data(), StatsOf(free, zone->managed, host.PageKB())});
  }
  return lines.Number() > 0 ? kOk : NotUnderstood(kFile, 1);
}

}  // namespace ksi
