// Printing one row of 32 columns: PrintRow against a baseline that formats each cell with printf,
// the format built for the cell as the column table states it. Both write the same bytes, which is
// checked before anything is measured, to /dev/null.

#include <benchmark/benchmark.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "bench/allocations.h"
#include "framework/column_table.h"

namespace {

using tally::Cell;
using tally::ColumnDesc;

constexpr size_t kColumns = 32;

// A table like that of group-stats: two texts, a few small numbers, the rest 64-bit amounts.
class Table {
 public:
  Table() {
    for (size_t i = 0; i < kColumns; ++i) {
      names_[i] = "column" + std::to_string(i);
      const char* conversion = i == 1 || i == 30 ? "s"
                               : i % 8 == 3      ? "d"
                               : i % 8 == 4      ? "Ld"
                                                 : "Lu";
      descs_[i] = {names_[i].c_str(), "", 10, conversion, 1, 0, 1};
      cells_[i] = *conversion == 's' ? Cell("a-machine-of-average-name") : Cell(1234567 * i);
    }
    descs_[1].width = descs_[30].width = 28;
  }

  const ColumnDesc* descs() const { return descs_.data(); }
  const std::array<Cell, kColumns>& cells() const { return cells_; }

 private:
  std::array<std::string, kColumns> names_;
  std::array<ColumnDesc, kColumns + 1> descs_{};
  std::array<Cell, kColumns> cells_;
};

// The baseline: a printf for each cell, its format made of the column's conversion as a table that
// states conversions invites to.
int PrintCell(const char* conversion, bool csvMode, int width, const Cell& cell) {
  char format[7];
  std::snprintf(format, sizeof format, csvMode ? "%%%s" : "%%*%s", conversion);
  const auto print = [&](auto value) {
    return csvMode ? std::printf(format, value) : std::printf(format, width, value);
  };
  if (conversion[0] == 's') return print(cell.text().data());
  return conversion[0] == 'L' ? print(cell.number()) : print(static_cast<int>(cell.number()));
}

void PrintfRow(const ColumnDesc* table, bool csvMode, const std::array<Cell, kColumns>& cells) {
  unsigned char carry = 0;
  for (size_t i = 0; i < kColumns; ++i) {
    if (i > 0) std::putchar(csvMode ? ',' : ' ');
    const int printed = PrintCell(table[i].conversion, csvMode, table[i].width - carry, cells[i]);
    carry = static_cast<unsigned char>(carry + printed - table[i].width);
  }
  std::putchar('\n');
}

// What `print` writes to standard output.
template <class Print>
std::string Written(Print print) {
  FILE* const saved = stdout;
  char* text = nullptr;
  size_t size = 0;
  stdout = open_memstream(&text, &size);
  print();
  std::fclose(stdout);
  stdout = saved;
  std::string written(text, size);
  std::free(text);
  return written;
}

void CheckSameBytes(const Table& table) {
  for (const bool csvMode : {false, true}) {
    if (Written([&] { PrintfRow(table.descs(), csvMode, table.cells()); }) !=
        Written([&] { tally::PrintRow(table.descs(), csvMode, false, table.cells()); })) {
      std::fputs("row_bench: the baseline writes other bytes\n", stderr);
      std::exit(1);
    }
  }
}

template <class Print>
void Measure(benchmark::State& state, Print print) {
  const Table table;
  CheckSameBytes(table);
  FILE* const saved = stdout;
  stdout = std::fopen("/dev/null", "w");
  print(table);
  const uint64_t before = Allocations();
  for (auto _ : state) print(table);
  state.counters["allocations_per_row"] = benchmark::Counter(
      static_cast<double>(Allocations() - before), benchmark::Counter::kAvgIterations);
  std::fclose(stdout);
  stdout = saved;
}

void BM_Printf(benchmark::State& state) {
  Measure(state, [&](const Table& table) {
    PrintfRow(table.descs(), state.range(0) != 0, table.cells());
  });
}

void BM_PrintRow(benchmark::State& state) {
  Measure(state, [&](const Table& table) {
    tally::PrintRow(table.descs(), state.range(0) != 0, false, table.cells());
  });
}

BENCHMARK(BM_Printf)->Arg(0)->Arg(1)->ArgName("csv");
BENCHMARK(BM_PrintRow)->Arg(0)->Arg(1)->ArgName("csv");

}  // namespace

BENCHMARK_MAIN();
