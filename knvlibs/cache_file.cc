#include "knvlibs/cache_file.h"

#include <algorithm>
#include <utility>

#include <knvlibs/ksi_status.h>
#include "knvlibs/cache_format.h"

namespace ksi {
namespace {

// Twice the nodes of the catalogue, and room for those of a later one.
constexpr size_t kMostNodeRows = 4096;

bool IsDate(std::string_view text) {
  return text.size() == cache::kDateSize &&
         std::ranges::all_of(text, [](char c) { return c >= ' ' && c <= '~'; });
}

bool IsSignature(std::string_view text) {
  return text.size() == cache::kSignatureSize &&
         text.find_first_not_of("0123456789abcdef") == std::string_view::npos;
}

bool IsPlain(std::string_view text) {
  return text.size() <= cache::kLongestText && text.find('\0') == std::string_view::npos;
}

}  // namespace

const char* BadMember(const CacheFile::Capture& capture) {
  if (!IsSignature(capture.signature)) return "signature";
  if (!IsDate(capture.built)) return "built";
  if (!IsDate(capture.taken)) return "taken";
  if (!IsPlain(capture.host)) return "host";
  return nullptr;
}

Status CacheFile::Open(const char* fileName, std::unique_ptr<CacheFile>* file, std::string* why) {
  auto database = std::make_unique<CacheDatabase>();
  const Status status = database->Open(fileName);
  if (status == kOk) return Make(std::move(database), file, why);
  if (why != nullptr) *why = database->Why();
  return status;
}

Status CacheFile::Make(std::unique_ptr<CacheDatabase> database, std::unique_ptr<CacheFile>* file,
                       std::string* why) {
  std::unique_ptr<CacheFile> made(new CacheFile(std::move(database)));
  Status status = made->database_->CheckSchema(cache::kTables);
  if (status == kOk) status = made->ReadCapture();
  if (status == kOk) status = made->ReadNodes();
  if (status != kOk) {
    if (why != nullptr) *why = made->database_->Why();
    return status;
  }
  made->database_->AllowReads();
  *file = std::move(made);
  return kOk;
}

Status CacheFile::ReadCapture() {
  Statement rows;
  int code = rows.Prepare(Handle(), "SELECT signature, built, host, taken FROM capture");
  if (code == SQLITE_OK) code = rows.Step();
  if (code == SQLITE_DONE) return database_->Damaged("the table capture is empty");
  if (code != SQLITE_ROW) return database_->Failed(code);
  capture_.signature = rows.Text(0);
  capture_.built = rows.Text(1);
  capture_.host = rows.Text(2);
  capture_.taken = rows.Text(3);
  if (BadMember(capture_) != nullptr)
    return database_->Damaged("the table capture is not understood");
  code = rows.Step();
  if (code == SQLITE_ROW) return database_->Damaged("the table capture has more than one row");
  return code == SQLITE_DONE ? kOk : database_->Failed(code);
}

Status CacheFile::ReadNodes() {
  Statement rows;
  int code = rows.Prepare(Handle(), "SELECT id, path, kind FROM node ORDER BY id");
  if (code != SQLITE_OK) return database_->Failed(code);
  while ((code = rows.Step()) == SQLITE_ROW) {
    const std::string_view kind = rows.Text(2);
    NodeRow row{rows.Number(0), nullptr, kind == cache::kList ? Kind::kList : Kind::kValue,
                std::string(rows.Text(1))};
    if (!IsPlain(row.path) || (kind != cache::kList && kind != cache::kValue) ||
        (!nodes_.empty() && nodes_.back().id >= row.id) || nodes_.size() == kMostNodeRows) {
      return database_->Damaged("the table node is not understood");
    }
    const Node* node = FindNode(row.path);
    if (node != nullptr && (row.kind == Kind::kList ? node->HasList() : node->HasValue())) {
      row.node = node;
    }
    nodes_.push_back(std::move(row));
  }
  return code == SQLITE_DONE ? kOk : database_->Failed(code);
}

const CacheFile::NodeRow* CacheFile::FindRow(const Node& node, Kind kind) const {
  const auto found = std::ranges::find_if(
      nodes_, [&](const NodeRow& row) { return row.node == &node && row.kind == kind; });
  return found == nodes_.end() ? nullptr : &*found;
}

const CacheFile::NodeRow* CacheFile::FindRow(int64_t id) const {
  const auto found = std::ranges::lower_bound(nodes_, id, {}, &NodeRow::id);
  return found == nodes_.end() || found->id != id ? nullptr : &*found;
}

}  // namespace ksi
