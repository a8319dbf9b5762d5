#include "framework/display_unit.h"

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_records.h>
#include "framework/name_list.h"

namespace tally {

Status ParseDisplayUnit(const char* text, bool allowBytes, DisplayUnit& unit) {
  if (text == nullptr || SameName(text, "kb")) {
    unit = DisplayUnit::kb;
  } else if (SameName(text, "mb")) {
    unit = DisplayUnit::mb;
  } else if (SameName(text, "pg")) {
    unit = DisplayUnit::pg;
  } else if (allowBytes && SameName(text, "b")) {
    unit = DisplayUnit::b;
  } else {
    Warning("Invalid unit specified. Choose from {mb, kb, pg%s}\n", allowBytes ? ", b" : "");
    return kBadParameter;
  }
  return kSuccess;
}

const char* UnitTitle(DisplayUnit unit) {
  switch (unit) {
    case DisplayUnit::mb:
      return "MB";
    case DisplayUnit::kb:
      return "KB";
    case DisplayUnit::b:
      return "Bytes";
    default:
      return "Page (4K)";
  }
}

uint64_t ShiftKilobytes(uint64_t kilobytes, DisplayUnit unit) {
  switch (unit) {
    case DisplayUnit::mb:
      return kilobytes >> 10;
    case DisplayUnit::kb:
      return kilobytes;
    case DisplayUnit::pg:
      return kilobytes >> 2;
    case DisplayUnit::b:
      return kilobytes << 10;
  }
  return 0;
}

uint64_t FromKilobytes(uint64_t kilobytes, DisplayUnit unit) {
  return kilobytes == KSI_NO_VALUE ? KSI_NO_VALUE : ShiftKilobytes(kilobytes, unit);
}

// sic: C8
uint64_t FromPages(uint64_t pages, DisplayUnit unit) { return ShiftKilobytes(pages * 4, unit); }

uint64_t FromBytes(uint64_t bytes, DisplayUnit unit) {
  return unit == DisplayUnit::b ? bytes : ShiftKilobytes(bytes >> 10, unit);
}

}  // namespace tally
