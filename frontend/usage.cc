#include "frontend/usage.h"

#include <cstdio>

namespace tally {
namespace {

// sic: C2
constexpr OptionUsage kOptions[] = {
    {'v', "-v, --verbose", "Describe report header labels"},
    {'s', "-s  --cSelect <mask>", "Column selection filter"},
    {'q', "-q  --csvMode", "Display output as CSV, not as table"},
    {'g', "-g, --gid <groupID>", "Start scheduler group ID"},
    {'l', "-l, --level <# levels>", "Levels of hierarchy to display"},
    {'u', "-u, --unit <unit type>", "Display unit"},
    {'i', "-i, --iFilter <mask>", "Inclusion filter"},
    {'e', "-e, --eFilter <mask>", "Exclusion filter"},
    {'t', "-t, --tags", "Display a tag summary"},
};

// Those that every report takes.
constexpr char kCommonOptions[] = "vsq";

constexpr FlagUsage kGroupFlags[] = {
    {"pre", "Predefined group"},
    {"lf", "Leaf group"},
    {"vm", "VM"},
    {"uw", "User world"},
    {"sys", "System world"},
    {"tw", "Test world"},
    {"pr", "Protected group"},
    {"sd", "Self-destruct group"},
    {"np", "Non-presistent group"},
    {"ke", "Kernel memory group"},
    {"ug", "User created group"},
    {"co", "Container group"},
    {"sc", "Sub-container group"},
    {"vmm", "VMM Sub-container group"},
    {"usr", "UW Sub-container group"},
};

constexpr FlagUsage kUwTypes[] = {
    {"uw", "Stand-alone UW"},
    {"vm", "VM-based UW"},
};

constexpr ReportUsage kReports[] = {
    {"group-stats", "gluiet", true, "group flags", kGroupFlags},
    {"vm-stats", "glu", true},
    {"uw-stats", "gluie", true, "UW types", kUwTypes},
    {"buddy-stats", nullptr},
    {"pshare-stats", "u", true},
    {"pshareHint-stats", "u", true},
    {"swap-stats", "glu", true},
    {"comp-stats", "u", true},
    {"lpool-stats", ""},
    {"heap-stats", "U", true},
    {"guest-stats", "glu", true},
    {"zip-stats", "glu", true},
    {"lpage-stats", "glu", true},
    {"asyncremap-stats", "gu", true},
    {"pmem-stats", "l", true},
};

// The -u that has bytes, too.
constexpr OptionUsage kUnitOrBytes = {'U', "-u, --unit <unit type>", "Display unit {b,*kb,mb,pg}"};

void PrintOption(const OptionUsage& option) {
  std::printf("      %-26s%s\n", option.synopsis, option.description);
}

void PrintOptions(const char* letters) {
  for (; *letters != '\0'; ++letters) {
    if (*letters == kUnitOrBytes.letter) PrintOption(kUnitOrBytes);
    for (const OptionUsage& option : kOptions) {
      if (option.letter == *letters) PrintOption(option);
    }
  }
}

void PrintReport(const ReportUsage& report) {
  std::printf("\n   '%s' report options\n", report.name);
  if (*report.options == '\0') std::puts("       none");
  PrintOptions(report.options);
  if (report.unitNote) {
    std::puts("      Note 1: Unit type must be one of the following: mb, kb, pg.");
  }
  if (report.flagKind == nullptr) return;
  std::printf(
      "      Note 2: A filter mask must be a string comprising of a ':' separated list of %s.\n"
      "      Note 3: Supported %s:\n",
      report.flagKind, report.flagKind);
  for (const FlagUsage& flag : report.flags) {
    std::printf("                 %-15s%s\n", flag.name, flag.meaning);
  }
}

}  // namespace

std::span<const OptionUsage> OptionUsages() { return kOptions; }

std::span<const ReportUsage> ReportUsages() { return kReports; }

void PrintUsage(const char* programName) {
  std::printf(
      "Usage: %s [-hf] [-c <cacheFile>] -r <reportType> [report specific options]\n"
      "   -h, --help                Show this message\n"
      "   -f, --force               Continue even if version check fails\n"
      "   -c, --cache <cacheFile>   Use KSI cache file\n"
      "\n"
      "   Supported report types:\n",
      programName);
  for (const ReportUsage& report : kReports) std::printf("      %s\n", report.name);
  std::puts("\n   Options for all reports:");
  PrintOptions(kCommonOptions);
  std::puts(
      "      Note 1: The column selection must be a string comprising of a ':' separated list of "
      "column names.");
  for (const ReportUsage& report : kReports) {
    if (report.options != nullptr) PrintReport(report);
  }
}

}  // namespace tally
