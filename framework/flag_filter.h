// Flag words: their names, the filters over them and their text.
#ifndef FRAMEWORK_FLAG_FILTER_H_
#define FRAMEWORK_FLAG_FILTER_H_

#include <cstdint>

#include "framework/name_list.h"
#include "framework/status.h"

namespace tally {

// A row of a flag table. A table ends with a null name.
struct FlagName {
  uint32_t bit;
  const char* name;
};

extern const FlagName groupFlagNames[];  // of scheduler groups
extern const FlagName uwTypeNames[];     // of user worlds: a part of the group flags

// Turns a ':'-separated list of flag names into a mask; no text means every flag, or for an
// exclusion filter none. An unknown name is kBadParameter after its message, with mask 0.
[[nodiscard]] Status ParseFlagFilter(const char* text, const FlagName* table, uint32_t& mask,
                                     bool isExclusion);

// The names of a mask's flags in table order, "(all)" or "(none)".
NameWriter FormatFlagMask(uint32_t mask, const FlagName* table);

// Which objects a report shows, by their flag words.
struct FlagFilter {
  uint32_t inclusionMask = UINT32_MAX;
  uint32_t exclusionMask = 0;

  bool Passes(uint32_t flags) const {
    return (flags & inclusionMask) != 0 && (flags & exclusionMask) == 0;
  }
};

}  // namespace tally

#endif  // FRAMEWORK_FLAG_FILTER_H_
