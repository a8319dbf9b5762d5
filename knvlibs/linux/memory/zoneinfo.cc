#include "knvlibs/linux/memory/zoneinfo.h"

#include <algorithm>
#include <iterator>
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

// A zone's own figures start at "  pages free" and end at "protection:". Before them the first zone
// of a node has the figures of the node, after them come counters and the lists of each processor.
class ZoneParser {
 public:
  explicit ZoneParser(Zones& zones) : zones_(zones) {}

  // False if the line is not understood.
  bool Take(std::string_view line) {
    if (line.starts_with("Node ")) return TakeHeading(line);
    std::string_view name = TakeWord(line);
    if (place_ == Place::kOutside) return name != "count:" || TakeCount(line);
    if (place_ == Place::kBeforePages) {
      if (name != "pages") return true;
      place_ = Place::kInPages;
      name = TakeWord(line);
    }
    return name == "protection:" ? End() : TakeFigure(name, line);
  }

  // Whether all zones are whole.
  bool IsDone() const { return place_ == Place::kOutside && !zones_.empty(); }

 private:
  enum class Place : uint8_t { kOutside, kBeforePages, kInPages };

  bool TakeHeading(std::string_view line) {
    if (place_ != Place::kOutside || !ParseHeading(line, zones_.emplace_back())) return false;
    place_ = Place::kBeforePages;
    seen_ = 0;
    return true;
  }

  bool TakeFigure(std::string_view name, std::string_view line) {
    const auto* const known = std::ranges::find(kNames, name, &Name::text);
    if (known == std::end(kNames)) return true;
    seen_ |= 1u << (known - kNames);
    return ParseNumber(TakeWord(line), zones_.back().*known->figure) && TakeWord(line).empty();
  }

  bool TakeCount(std::string_view line) {
    uint64_t count = 0;
    if (zones_.empty() || !ParseNumber(TakeWord(line), count)) return false;
    zones_.back().perCpu += count;
    return TakeWord(line).empty();
  }

  bool End() {
    place_ = Place::kOutside;
    return seen_ == kAllNames;
  }

  Zones& zones_;
  Place place_ = Place::kOutside;
  unsigned seen_ = 0;  // a bit for each of kNames
};

}  // namespace

Status ReadZones(const LinuxHost& host, Zones& zones) {
  std::string content;
  const Status status = host.Read(kFile, content);
  if (status != kOk) return status;

  ZoneParser parser(zones);
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    if (!parser.Take(line)) return NotUnderstood(kFile, lines.Number());
  }
  return parser.IsDone() ? kOk : NotUnderstood(kFile, lines.Number());
}

}  // namespace ksi
