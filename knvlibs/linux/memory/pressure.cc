#include "knvlibs/linux/memory/pressure.h"

#include <string_view>

#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

// "12.34" in hundredths.
Figure HundredthsOf(std::string_view text) {
  const size_t point = text.find('.');
  uint64_t whole = 0;
  uint64_t part = 0;
  if (point == std::string_view::npos || text.size() != point + 3) return std::nullopt;
  if (!ParseNumber(text.substr(0, point), whole) || !ParseNumber(text.substr(point + 1), part)) {
    return std::nullopt;
  }
  return SumOf({ProductOf(whole, 100), part});
}

// "some avg10=0.12 avg60=0.05 avg300=0.01 total=123456"; false if it is not understood.
bool TakeLine(std::string_view line, Pressure& pressure) {
  const std::string_view kind = TakeWord(line);
  std::string_view average = TakeWord(line);
  if ((kind != "some" && kind != "full") || !TakePrefix(average, "avg10=")) return false;
  Figure& part = kind == "some" ? pressure.some : pressure.full;
  part = HundredthsOf(average);
  return part.has_value();
}

}  // namespace

Status ReadPressure(const LinuxHost& host, Pressure& pressure) {
  return ReadPressureFile(host, "/proc/pressure/memory", pressure);
}

Status ReadPressureFile(const LinuxHost& host, const std::string& file, Pressure& pressure) {
  std::string content;
  pressure = {};
  const Status status = host.ReadPiece(file, content);
  if (status == KSI_STATUS_PERMISSION_DENIED) host.TellDenied();
  if (status != kOk) return status == KSI_STATUS_NO_MEMORY ? status : kOk;
  Lines lines(content);
  std::string_view line;
  while (lines.Next(line)) {
    if (TakeLine(line, pressure)) continue;
    pressure = {};
    return host.NotUnderstoodOnce("pressure", file, lines.Number());
  }
  return kOk;
}

}  // namespace ksi
