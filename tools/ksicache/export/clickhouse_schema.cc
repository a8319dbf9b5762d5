// What ClickHouse needs to take the rows that MakeJson writes: for each report a table of the host,
// the time and the report's columns, which have their descriptions as comments; with a cluster also
// the table vm_stats_all, say, over those of all its servers.
//
// A figure may have no value. Rows lie by host and time, which is what all questions ask by.
#include <algorithm>
#include <string>
#include <string_view>

#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/table_name.h"
#include "tools/ksicache/export/text_output.h"

namespace ksicache {
namespace {

// As ClickHouse quotes a text.
std::string Quoted(std::string_view text) {
  std::string quoted = "'";
  for (const char c : text) {
    if (c == '\'' || c == '\\') quoted += '\\';
    quoted += c;
  }
  return quoted + "'";
}

const char* TypeOf(const RowColumn& column) {
  if (column.kind == tally::Kind::text) return "Nullable(String)";
  if (column.kind == tally::Kind::flag) return "Nullable(UInt8)";
  return column.isSigned ? "Nullable(Int64)" : "Nullable(UInt64)";
}

// "Used memory, KB"
std::string CommentOf(const RowColumn& column) {
  std::string text = column.description;
  while (text.ends_with(' ')) text.pop_back();
  return *column.unit == '\0' ? text : text + ", " + column.unit;
}

class ClickHouseSchema : public RowFormat {
 public:
  explicit ClickHouseSchema(const FormatOptions& options)
      : output_(options.file), cluster_(options.cluster) {}

  void Begin(const RowTable& table) override {
    const std::string name = TableName(*table.report);
    std::string columns = "(\n  host String,\n  time DateTime";
    for (const RowColumn& column : table.columns) {
      columns += std::string(",\n  `") + column.name + "` " + TypeOf(column) + " COMMENT " +
                 Quoted(CommentOf(column));
    }
    columns += "\n)";
    output_.Put("CREATE TABLE IF NOT EXISTS " + name + "\n" + columns +
                "\nENGINE = MergeTree PARTITION BY toYYYYMM(time) ORDER BY (host, time);\n");
    if (!cluster_.empty()) {
      output_.Put("CREATE TABLE IF NOT EXISTS " + name + "_all AS " + name +
                  "\nENGINE = Distributed(" + Quoted(cluster_) + ", currentDatabase(), '" + name +
                  "', sipHash64(host));\n");
    }
    output_.EndRow();
  }

  void Row(std::span<const Value> /*values*/) override {}

  void Finish() override { output_.Finish(); }

 private:
  TextOutput output_;
  std::string cluster_;
};

}  // namespace

std::unique_ptr<RowFormat> MakeClickHouseSchema(const FormatOptions& options) {
  return std::make_unique<ClickHouseSchema>(options);
}

}  // namespace ksicache
