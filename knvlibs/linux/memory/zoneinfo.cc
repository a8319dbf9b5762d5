#include "knvlibs/linux/memory/zoneinfo.h"

#include <string_view>

#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

constexpr std::string_view kFile = "/proc/zoneinfo";

struct Name {
  std::string_view text;
  uint64_t Zone::*figure;
};
constexpr Name kNames[] = {{"free", &Zone::free},       {"min", &Zone::min},
                           {"low", &Zone::low},         {"high", &Zone::high},
                           {"present", &Zone::present}, {"managed", &Zone::managed}};
constexpr unsigned kAllNames = (1u << std::size(kNames)) - 1;

// "Node 0, zone      DMA"
bool ParseHeading(std::string_view line, Zone& zone) {
  std::string_view number;
  if (!TakePrefix(line, "Node ")) return false;
  number = TakeWord(line);
  if (!number.ends_with(',')) return false;
  number.remove_suffix(1);
  if (!ParseNumber(number, zone.node) || TakeWord(line) != "zone") return false;
  zone.name = TakeWord(line);
  return !zone.name.empty() && TakeWord(line).empty();
}

}  // namespace

Status ReadZones(const LinuxHost& host, Zones& zones) {
  std::string content;
  const Status status = host.Read(kFile, content);
  if (status != kOk) return status;

  // A zone's own figures start at "  pages free" and end at "protection:". Before them the first
  // zone of a node has the figures of the node, after them come counters and per-CPU lists.
  enum class Place : uint8_t { kOutside, kBeforePages, kInPages };
  Place place = Place::kOutside;
  unsigned seen = 0;
  zones.clear();
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    if (line.starts_with("Node ")) {
      if (place != Place::kOutside || !ParseHeading(line, zones.emplace_back())) {
        return NotUnderstood(kFile, lines.Number());
      }
      place = Place::kBeforePages;
      seen = 0;
      continue;
    }
    if (place == Place::kOutside) continue;
    std::string_view name = TakeWord(line);
    if (place == Place::kBeforePages) {
      if (name != "pages") continue;
      place = Place::kInPages;
      name = TakeWord(line);
    }
    if (name == "protection:") {
      if (seen != kAllNames) return NotUnderstood(kFile, lines.Number());
      place = Place::kOutside;
      continue;
    }
    for (size_t i = 0; i < std::size(kNames); ++i) {
      if (name != kNames[i].text) continue;
      if (!ParseNumber(TakeWord(line), zones.back().*kNames[i].figure) || !TakeWord(line).empty()) {
        return NotUnderstood(kFile, lines.Number());
      }
      seen |= 1u << i;
    }
  }
  return place == Place::kOutside && !zones.empty() ? kOk : NotUnderstood(kFile, lines.Number());
}

}  // namespace ksi
