// A SQLite database: a table for each report, called as it is with '_' for '-', with the host, the
// time and the columns of the report; and the table "columns", which says what these are.
//
// Numbers are integers; one beyond their 63 bits is a real number, which is less exact and not
// another one. A figure without a value is NULL, a flag 0 or 1.
//
// The host, the time and what tells rows apart have an index, made when all rows are there: kept
// up to date row by row it would cost as much as the rows. It is no key, because names of a kernel
// may be there twice, and times where the clock was set back, and no row is to be lost.
#include <bit>
#include <map>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/sqlite.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/formats.h"
#include "tools/ksicache/export/table_name.h"
#include "tools/ksicache/file_database.h"
#include "tools/ksicache/memory_database.h"

namespace ksicache {
namespace {

constexpr const char* kColumnsTable =
    "CREATE TABLE columns(report TEXT NOT NULL, name TEXT NOT NULL, unit TEXT, "
    "description TEXT NOT NULL, isKey INTEGER NOT NULL, isCounter INTEGER NOT NULL, "
    "PRIMARY KEY(report, name)) WITHOUT ROWID";

constexpr RowColumn kFirstColumns[] = {
    {"host", "The host that the row is of", tally::Kind::text, true, false, false, "", {}},
    {"time", "When it was read, in UTC", tally::Kind::text, true, false, false, "", {}},
};
constexpr int kFirstColumn = 3;  // among the parameters of a row

const char* TypeOf(const RowColumn& column) {
  return column.kind == tally::Kind::text ? "TEXT" : "INTEGER";
}

// The statements of a table, made of its columns.
struct TableSql {
  std::string create;
  std::string index;
  std::string insert;
};

TableSql SqlOf(const std::string& table, std::span<const RowColumn> columns) {
  std::string types = "host TEXT NOT NULL, time TEXT NOT NULL";
  std::string key = "host, time";
  std::string parameters = "?, ?";
  for (const RowColumn& column : columns) {
    const std::string name = std::string(", \"") + column.name + "\"";
    types += name + " " + TypeOf(column);
    parameters += ", ?";
    if (column.isKey) key += name;
  }
  return {"CREATE TABLE " + table + "(" + types + ")",
          "CREATE INDEX " + table + "_identity ON " + table + "(" + key + ")",
          "INSERT INTO " + table + " VALUES(" + parameters + ")"};
}

class SqliteFormat : public RowFormat {
 public:
  explicit SqliteFormat(const FormatOptions& options) : file_(options.file) {
    if (options.database.empty()) {
      made_ = std::make_unique<MemoryDatabase>(file_->Name(), "");
      database_ = made_.get();
      database_->Execute(kColumnsTable);
    } else {
      opened_ = std::make_unique<FileDatabase>(options.database);
      database_ = opened_.get();
      if (SqlOfTable("columns") != kColumnsTable) {
        throw Error(database_->Name() + ": is no database of exported rows");
      }
    }
  }

  void Begin(const RowTable& table) override {
    const auto [found, isNew] = tables_.try_emplace(table.report);
    table_ = &found->second;
    if (isNew) OpenTable(table);
    BindTexts(table_->insert, {table.origin->host, table.origin->time});
    isThere_ = table_->before && IsThere(*table.origin);
  }

  void Row(std::span<const Value> values) override {
    if (isThere_) return;
    int parameter = kFirstColumn;
    for (const Value& value : values) {
      database_->Require(CodeOfBind(table_->insert, parameter++, value) == SQLITE_OK);
    }
    const int code = table_->insert.Step();
    table_->insert.Reset();
    database_->Require(code == SQLITE_DONE);
  }

  void Finish() override {
    for (const std::string& index : indexes_) database_->Execute(index);
    tables_.clear();
    made_ ? file_->Commit(made_->Finish()) : opened_->Commit();
  }

 private:
  // The table of a report.
  struct Table {
    ksi::Statement insert;
    ksi::Statement before;  // whether it had rows of a moment; none if it is new
  };

  // What made a table that there is; empty: there is none.
  std::string SqlOfTable(const std::string& name) {
    ksi::Statement query;
    database_->Prepare("SELECT sql FROM sqlite_schema WHERE name = ?1", query);
    database_->Require(query.Bind(1, std::string_view(name)) == SQLITE_OK);
    const int code = query.Step();
    database_->Require(code == SQLITE_ROW || code == SQLITE_DONE);
    return code == SQLITE_ROW ? std::string(query.Text(0)) : "";
  }

  void OpenTable(const RowTable& table) {
    const std::string name = TableName(*table.report);
    const TableSql sql = SqlOf(name, table.columns);
    const std::string found = made_ ? "" : SqlOfTable(name);
    if (found.empty()) {
      database_->Execute(sql.create);
      for (const RowColumn& column : kFirstColumns) Describe(name, column);
      for (const RowColumn& column : table.columns) Describe(name, column);
      indexes_.push_back(sql.index);
    } else {
      RequireSame(name, found == sql.create, table.columns);
      PrepareBefore(name);
    }
    database_->Prepare(sql.insert, table_->insert);
  }

  void RequireSame(const std::string& name, bool hasSameColumns,
                   std::span<const RowColumn> columns) {
    ksi::Statement query;
    database_->Prepare(
        "SELECT 1 FROM columns WHERE report = ?1 AND name = ?2 AND unit IS nullif(?3, '')", query);
    for (const RowColumn& column : columns) {
      BindTexts(query, {name, column.name, column.unit});
      hasSameColumns = hasSameColumns && query.Step() == SQLITE_ROW;
      query.Reset();
    }
    if (!hasSameColumns) {
      throw Error(database_->Name() + ": " + name + " has other columns or units there");
    }
  }

  // What is there already is that of earlier runs; moments of this one are not compared.
  void PrepareBefore(const std::string& name) {
    ksi::Statement last;
    database_->Prepare("SELECT coalesce(max(rowid), 0) FROM " + name, last);
    database_->Require(last.Step() == SQLITE_ROW);
    database_->Prepare("SELECT 1 FROM " + name + " WHERE host = ?1 AND time = ?2 AND rowid <= " +
                           std::to_string(last.Number(0)) + " LIMIT 1",
                       table_->before);
  }

  bool IsThere(const Origin& origin) {
    BindTexts(table_->before, {origin.host, origin.time});
    const int code = table_->before.Step();
    table_->before.Reset();
    database_->Require(code == SQLITE_ROW || code == SQLITE_DONE);
    return code == SQLITE_ROW;
  }

  void Describe(const std::string& table, const RowColumn& column) {
    ksi::Statement insert;
    database_->Prepare("INSERT INTO columns VALUES(?1, ?2, nullif(?3, ''), rtrim(?4), ?5, ?6)",
                       insert);
    BindTexts(insert, {table, column.name, column.unit, column.description});
    database_->Require(insert.Bind(5, int64_t{column.isKey}) == SQLITE_OK);
    database_->Require(insert.Bind(6, int64_t{column.isCounter}) == SQLITE_OK);
    database_->Require(insert.Step() == SQLITE_DONE);
  }

  // To the parameters from the first on.
  void BindTexts(ksi::Statement& statement, std::initializer_list<std::string_view> texts) {
    int parameter = 0;
    for (const std::string_view text : texts) {
      database_->Require(statement.Bind(++parameter, text) == SQLITE_OK);
    }
  }

  static int CodeOfBind(ksi::Statement& insert, int parameter, const Value& value) {
    switch (value.type) {
      case ValueType::text:
        return insert.Bind(parameter, value.text);
      case ValueType::unsignedNumber:
        if (std::bit_width(value.number) > 63) {
          return insert.Bind(parameter, static_cast<double>(value.number));
        }
        [[fallthrough]];
      case ValueType::flag:
      case ValueType::signedNumber:
        return insert.Bind(parameter, static_cast<int64_t>(value.number));
      case ValueType::none:
        break;
    }
    return insert.BindNull(parameter);
  }

  NewFile* file_;                         // that it becomes; none: it is one
  std::unique_ptr<MemoryDatabase> made_;  // one of these
  std::unique_ptr<FileDatabase> opened_;
  WrittenDatabase* database_ = nullptr;
  std::map<const tally::Report*, Table> tables_;
  std::vector<std::string> indexes_;  // what makes those of new tables
  Table* table_ = nullptr;            // that was begun last
  bool isThere_ = false;              // the moment at hand had been exported before
};

}  // namespace

std::unique_ptr<RowFormat> MakeSqlite(const FormatOptions& options) {
  return std::make_unique<SqliteFormat>(options);
}

}  // namespace ksicache
