// /proc/slabinfo: one line for each slab cache.
#include <string>
#include <string_view>

#include "knvlibs/linux/heaps/slab_cache.h"
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

constexpr std::string_view kFile = "/proc/slabinfo";

bool TakeNumber(std::string_view& line, uint64_t& number) {
  return ParseNumber(TakeWord(line), number);
}

// "dentry  25410 28854  192  21  1 : tunables 0 0 0 : slabdata 1374 1374 0": objects in use and in
// all, an object's size, objects and pages of a slab; then the tuning; slabs in use and in all.
bool ParseLine(std::string_view line, SlabCache& cache) {
  uint64_t unused = 0;
  cache.name = TakeWord(line);
  return !cache.name.empty() && TakeNumber(line, cache.activeObjects) &&
         TakeNumber(line, cache.objects) && TakeNumber(line, cache.objectSize) &&
         TakeNumber(line, unused) && TakeNumber(line, cache.pagesPerSlab) &&
         TakeWord(line) == ":" && TakeWord(line) == "tunables" && TakeNumber(line, unused) &&
         TakeNumber(line, unused) && TakeNumber(line, unused) && TakeWord(line) == ":" &&
         TakeWord(line) == "slabdata" && TakeNumber(line, unused) &&
         TakeNumber(line, cache.slabs) && TakeNumber(line, unused);
}

}  // namespace

Status ReadSlabinfo(const LinuxHost& host, std::vector<SlabCache>& caches) {
  std::string content;
  const Status status = host.Read(kFile, content);
  if (status != kOk) return status;

  caches.clear();
  Lines lines(content);
  std::string_view line;
  if (!lines.Next(line) || !line.starts_with("slabinfo - version: 2.")) {
    return NotUnderstood(kFile, 1);
  }
  while (lines.Next(line)) {
    if (line.starts_with('#')) continue;
    if (!ParseLine(line, caches.emplace_back())) return NotUnderstood(kFile, lines.Number());
  }
  return kOk;
}

}  // namespace ksi
