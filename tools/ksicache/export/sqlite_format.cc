// A SQLite database: a table for each report, called as it is with '_' for '-', with the host, the
// time and the columns of the report; and the table "columns", which says what these are.
//
// Numbers are integers; one beyond their 63 bits is a real number, which is less exact and not
// another one. A figure without a value is NULL, a flag 0 or 1.
#include <bit>
#include <map>
#include <string>

#include "knvlibs/sqlite.h"
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/table_name.h"
#include "tools/ksicache/memory_database.h"

namespace ksicache {
namespace {

const char* TypeOf(const RowColumn& column) {
  return column.kind == tally::Kind::text ? "TEXT" : "INTEGER";
}

class SqliteFormat : public RowFormat {
 public:
  explicit SqliteFormat(const FormatOptions& options)
      : file_(*options.file), database_(file_.Name(), "") {
    database_.Execute(
        "CREATE TABLE columns(report TEXT NOT NULL, name TEXT NOT NULL, unit TEXT, "
        "description TEXT NOT NULL, isKey INTEGER NOT NULL, isCounter INTEGER NOT NULL, "
        "PRIMARY KEY(report, name)) WITHOUT ROWID");
  }

  void Begin(const RowTable& table) override {
    const auto [found, isNew] = inserts_.try_emplace(table.report);
    insert_ = &found->second;
    if (isNew) MakeTable(table);
    Bind(1, table.origin->host);
    Bind(2, table.origin->time);
  }

  void Row(std::span<const Value> values) override {
    int parameter = kFirstColumn;
    for (const Value& value : values) Bind(parameter++, value);
    const int code = insert_->Step();
    insert_->Reset();
    database_.Require(code == SQLITE_DONE);
  }

  void Finish() override {
    inserts_.clear();
    file_.Commit(database_.Finish());
  }

 private:
  static constexpr int kFirstColumn = 3;
  static constexpr RowColumn kFirstColumns[] = {
      {"host", "The host that the row is of", tally::Kind::text, true, false, false, "", {}},
      {"time", "When it was read, in UTC", tally::Kind::text, true, false, false, "", {}},
  };

  void MakeTable(const RowTable& table) {
    const std::string name = TableName(*table.report);
    for (const RowColumn& column : kFirstColumns) Describe(name, column);
    std::string columns = "host TEXT NOT NULL, time TEXT NOT NULL";
    std::string parameters = "?, ?";
    for (const RowColumn& column : table.columns) {
      columns += std::string(", \"") + column.name + "\" " + TypeOf(column);
      parameters += ", ?";
      Describe(name, column);
    }
    database_.Execute("CREATE TABLE " + name + "(" + columns + ")");
    database_.Prepare("INSERT INTO " + name + " VALUES(" + parameters + ")", *insert_);
  }

  void Describe(const std::string& table, const RowColumn& column) {
    ksi::Statement insert;
    database_.Prepare("INSERT INTO columns VALUES(?1, ?2, nullif(?3, ''), rtrim(?4), ?5, ?6)",
                      insert);
    int parameter = 0;
    for (const std::string_view text :
         {std::string_view(table), std::string_view(column.name), std::string_view(column.unit),
          std::string_view(column.description)}) {
      database_.Require(insert.Bind(++parameter, text) == SQLITE_OK);
    }
    database_.Require(insert.Bind(++parameter, int64_t{column.isKey}) == SQLITE_OK);
    database_.Require(insert.Bind(++parameter, int64_t{column.isCounter}) == SQLITE_OK);
    database_.Require(insert.Step() == SQLITE_DONE);
  }

  void Bind(int parameter, const std::string& text) {
    Bind(parameter, Value{ValueType::text, 0, text});
  }

  void Bind(int parameter, const Value& value) {
    database_.Require(CodeOfBind(parameter, value) == SQLITE_OK);
  }

  int CodeOfBind(int parameter, const Value& value) {
    switch (value.type) {
      case ValueType::text:
        return insert_->Bind(parameter, value.text);
      case ValueType::unsignedNumber:
        if (std::bit_width(value.number) > 63) {
          return insert_->Bind(parameter, static_cast<double>(value.number));
        }
        [[fallthrough]];
      case ValueType::flag:
      case ValueType::signedNumber:
        return insert_->Bind(parameter, static_cast<int64_t>(value.number));
      case ValueType::none:
        break;
    }
    return insert_->BindNull(parameter);
  }

  NewFile& file_;
  MemoryDatabase database_;
  std::map<const tally::Report*, ksi::Statement> inserts_;
  ksi::Statement* insert_ = nullptr;  // of the table that was begun last
};

}  // namespace

std::unique_ptr<RowFormat> MakeSqlite(const FormatOptions& options) {
  return std::make_unique<SqliteFormat>(options);
}

}  // namespace ksicache
