#include "framework/display_unit.h"

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_records.h>
#include "framework/name_list.h"

namespace tally {

Status ParseDisplayUnit(const char* text, bool allowBytes, DisplayUnit& unit) {
  if (text == nullptr) {
    unit = DisplayUnit::kb;
    return kSuccess;
  }
  for (const UnitName& name : kUnitNames) {
    if (!SameName(text, name.word) || (name.unit == DisplayUnit::b && !allowBytes)) continue;
    unit = name.unit;
    return kSuccess;
  }
  Warning("Invalid unit specified. Choose from {mb, kb, pg%s}\n", allowBytes ? ", b" : "");
  return kBadParameter;
}

const char* UnitTitle(DisplayUnit unit) {
  for (const UnitName& name : kUnitNames) {
    if (name.unit == unit) return name.title;
  }
  return "";
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
