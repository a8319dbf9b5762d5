#include "framework/table_sink.h"

#include <cstdio>
#include <ctime>
#include <string>

namespace tally {

void TableSink::Begin(const Heading& heading) {
  TextSink::Begin(heading);
  PrintTitleBlock();
  Rule();
  PrintHeader(table(), false);
  Rule();
}

void TableSink::PrintTitleBlock() const {
  const ReportFrame& frame = *heading().frame;
  const auto print = [&frame](const char* label, std::string_view value) {
    std::printf("   %-*s : %.*s\n", frame.labelWidth, label, static_cast<int>(value.size()),
                value.data());
  };
  const std::time_t now = std::time(nullptr);
  std::printf("\n %s: %s", frame.title, std::ctime(&now));
  std::printf(" %s\n", std::string(static_cast<size_t>(frame.ruleLength), '-').c_str());
  for (const Setting& setting : heading().settings) print(setting.label, setting.value);
  print("Selected columns", FormatSelectedColumns(table()).text());
  std::putchar('\n');
}

}  // namespace tally
