// What is needed of SQLite, with owners for its handles.
#ifndef KNVLIBS_SQLITE_H_
#define KNVLIBS_SQLITE_H_

#include <sqlite3.h>

#include <cstddef>
#include <cstdint>
#include <memory>
#include <new>
#include <span>
#include <string_view>
#include <utility>

namespace ksi {

// Statements may live longer.
struct CloseDatabase {
  void operator()(sqlite3* database) const { sqlite3_close_v2(database); }
};
using Database = std::unique_ptr<sqlite3, CloseDatabase>;

// A column of the row that a statement is on, good until the next step. Several looks at one column
// cost less by it than by the statement.
class ColumnValue {
 public:
  explicit ColumnValue(sqlite3_value* value) : value_(value) {}

  int Type() const { return sqlite3_value_type(value_); }
  int64_t Number() const { return sqlite3_value_int64(value_); }
  // The bytes of a text as they lie, which costs less than to have them end in a NUL.
  std::string_view Bytes() const {
    const auto* bytes = static_cast<const char*>(sqlite3_value_blob(value_));
    return bytes == nullptr ? std::string_view() : std::string_view(bytes, Size());
  }
  std::span<const std::byte> Blob() const {
    const auto* blob = static_cast<const std::byte*>(sqlite3_value_blob(value_));
    return blob == nullptr ? std::span<const std::byte>() : std::span(blob, Size());
  }

 private:
  size_t Size() const { return static_cast<size_t>(sqlite3_value_bytes(value_)); }

  sqlite3_value* value_;
};

// A prepared statement. Calls give SQLite's result codes.
class Statement {
 public:
  Statement() = default;
  Statement(Statement&& other) noexcept : handle_(std::exchange(other.handle_, nullptr)) {}
  Statement& operator=(Statement&& other) noexcept {
    std::swap(handle_, other.handle_);
    return *this;
  }
  ~Statement() { sqlite3_finalize(handle_); }

  int Prepare(sqlite3* database, const char* sql) {
    sqlite3_finalize(std::exchange(handle_, nullptr));
    return sqlite3_prepare_v3(database, sql, -1, SQLITE_PREPARE_PERSISTENT, &handle_, nullptr);
  }

  explicit operator bool() const { return handle_ != nullptr; }

  // Parameters count from 1. A text is copied, if there is any; a blob must live until the
  // statement is stepped for the last time or bound anew.
  int Bind(int parameter, int64_t number) { return sqlite3_bind_int64(handle_, parameter, number); }
  int Bind(int parameter, double number) { return sqlite3_bind_double(handle_, parameter, number); }
  int Bind(int parameter, std::string_view text) {
    if (text.empty()) return sqlite3_bind_text(handle_, parameter, "", 0, SQLITE_STATIC);
    return sqlite3_bind_text(handle_, parameter, text.data(), static_cast<int>(text.size()),
                             SQLITE_TRANSIENT);
  }
  int Bind(int parameter, std::span<const std::byte> blob) {
    return sqlite3_bind_blob(handle_, parameter, blob.data(), static_cast<int>(blob.size()),
                             SQLITE_STATIC);
  }
  int BindNull(int parameter) { return sqlite3_bind_null(handle_, parameter); }

  // SQLITE_ROW, SQLITE_DONE or an error.
  int Step() { return sqlite3_step(handle_); }
  void Reset() { sqlite3_reset(handle_); }

  // Columns of the row count from 0; views are good until the next step. A text for which there is
  // no memory is std::bad_alloc, and not the empty one.
  int Type(int column) const { return sqlite3_column_type(handle_, column); }
  int64_t Number(int column) const { return sqlite3_column_int64(handle_, column); }
  std::string_view Text(int column) const {
    const auto* text = reinterpret_cast<const char*>(sqlite3_column_text(handle_, column));
    if (text == nullptr) RequireMemory();
    return text == nullptr ? std::string_view() : std::string_view(text, Size(column));
  }
  std::span<const std::byte> Blob(int column) const { return At(column).Blob(); }

  // A connection is used by one thread at a time, and so may its values.
  ColumnValue At(int column) const { return ColumnValue(sqlite3_column_value(handle_, column)); }

 private:
  void RequireMemory() const {
    if (sqlite3_errcode(sqlite3_db_handle(handle_)) == SQLITE_NOMEM) throw std::bad_alloc();
  }

  size_t Size(int column) const {
    return static_cast<size_t>(sqlite3_column_bytes(handle_, column));
  }

  sqlite3_stmt* handle_ = nullptr;
};

}  // namespace ksi

#endif  // KNVLIBS_SQLITE_H_
