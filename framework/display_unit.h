// The unit that memory figures are shown in.
#ifndef FRAMEWORK_DISPLAY_UNIT_H_
#define FRAMEWORK_DISPLAY_UNIT_H_

#include <cstdint>

#include "framework/status.h"

namespace tally {

enum class DisplayUnit : uint8_t { mb = 3, kb = 4, pg = 5, b = 6 };

// The units in the order of -u's complaint; the last one is for reports that have bytes.
struct UnitName {
  DisplayUnit unit;
  const char* word;   // of -u
  const char* title;  // in the title block
};
constexpr UnitName kUnitNames[] = {
    {DisplayUnit::mb, "mb", "MB"},
    {DisplayUnit::kb, "kb", "KB"},
    {DisplayUnit::pg, "pg", "Page (4K)"},
    {DisplayUnit::b, "b", "Bytes"},
};

// Reads the word of -u, in any case; no text means kb. `allowBytes`: "b" is a word too. An unknown
// word is kBadParameter, after its message.
[[nodiscard]] Status ParseDisplayUnit(const char* text, bool allowBytes, DisplayUnit& unit);

// The unit's name for the title block.
const char* UnitTitle(DisplayUnit unit);

// Turns a memory figure of one kind into `unit`. Fractions are dropped.
using Conversion = uint64_t (*)(uint64_t value, DisplayUnit unit);

// From kilobytes, shifting only.
uint64_t ShiftKilobytes(uint64_t kilobytes, DisplayUnit unit);

// From kilobytes; KSI_NO_VALUE stays.
uint64_t FromKilobytes(uint64_t kilobytes, DisplayUnit unit);

// From 4 KB pages. They become kilobytes first, so the two top bits are lost.
uint64_t FromPages(uint64_t pages, DisplayUnit unit);

// From bytes.
uint64_t FromBytes(uint64_t bytes, DisplayUnit unit);

}  // namespace tally

#endif  // FRAMEWORK_DISPLAY_UNIT_H_
