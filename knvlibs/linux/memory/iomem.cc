#include "knvlibs/linux/memory/iomem.h"

#include <string>

#include "knvlibs/linux/host/text.h"

namespace ksi {

Figure IomemSize(const LinuxHost& host, std::string_view name) {
  std::string content;
  if (host.Read("/proc/iomem", content) != kOk) return std::nullopt;

  // "  01000000-02209987 : Kernel code"
  bool isTold = false;
  Figure size = 0;
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    const std::string_view range = TakeWord(line);
    if (!TakePrefix(line, " : ") || line != name) continue;
    const size_t dash = range.find('-');
    uint64_t first = 0;
    uint64_t last = 0;
    if (dash == std::string_view::npos || !ParseHex(range.substr(0, dash), first) ||
        !ParseHex(range.substr(dash + 1), last) || last <= first) {
      return std::nullopt;
    }
    isTold = true;
    size = SumOf({size, last - first, 1});
  }
  return isTold ? size : std::nullopt;
}

}  // namespace ksi
