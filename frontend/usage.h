// The usage text, and the tables that it is made of.
#ifndef FRONTEND_USAGE_H_
#define FRONTEND_USAGE_H_

#include <span>

namespace tally {

// An option of the reports, such as {'u', "-u, --unit <unit type>", "Display unit"}.
struct OptionUsage {
  char letter;
  const char* synopsis;
  const char* description;
};

// A word of -i and -e.
struct FlagUsage {
  const char* name;
  const char* meaning;
};

struct ReportUsage {
  const char* name;
  const char* options;  // its own ones, in the order of the text; null: it is only named
  bool unitNote = false;
  const char* flagKind = nullptr;  // what a word of -i and -e is; null: it has no such options
  std::span<const FlagUsage> flags = {};
};

// The options of all reports first.
std::span<const OptionUsage> OptionUsages();

// In the order of the text.
std::span<const ReportUsage> ReportUsages();

// Prints the usage text to standard output; `programName` is the word the program was started as.
void PrintUsage(const char* programName);

}  // namespace tally

#endif  // FRONTEND_USAGE_H_
