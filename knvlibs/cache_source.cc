#include "knvlibs/cache_source.h"

#include <algorithm>
#include <cstring>
#include <limits>

#include <knvlibs/ksi.h>
#include "knvlibs/cache_format.h"
#include "knvlibs/linux/host/text.h"
#include "knvlibs/times.h"

namespace ksi {
namespace {

// The columns of the rows of readings, and of those of lists.
enum ReadingColumn { kKey1, kKey2, kNode, kStatus, kAnswer };
enum EntryColumn { kPosition = kNode + 1, kEntry };

// All readings from an object on. One comparison of both keys, as the lists have it, would say it
// shorter, and SQLite would make it again for each row.
constexpr const char* kReadings =
    "SELECT * FROM (SELECT key1, key2, node, status, answer FROM reading "
    "WHERE key1 = ?1 AND key2 >= ?2 ORDER BY key2, node) "
    "UNION ALL "
    "SELECT * FROM (SELECT key1, key2, node, status, answer FROM reading "
    "WHERE key1 > ?1 ORDER BY key1, key2, node)";
constexpr const char* kEntries =
    "SELECT key1, key2, node, position, entry FROM instance "
    "WHERE (key1, key2, node) >= (?1, ?2, ?3) ORDER BY key1, key2, node, position";

// More readings than a catalogue has nodes are damage.
constexpr size_t kMostReadings = 256;

// A report may ask for a list of a few entries twice, and whoever reads has gone on since.
constexpr int64_t kFewEntries = 16;

constexpr const char* kOtherCount = "has other entries than it says";

constexpr Key kAbsent{KeyKind::kText, 0, {}};

// The keys of an object as the file has them.
const Key& KeyAt(const Keys& keys, size_t i) { return i < keys.count ? keys[i] : kAbsent; }

bool AreSame(const Key& one, const Key& other) {
  return one.kind == other.kind &&
         (one.kind == KeyKind::kNumber ? one.number == other.number : one.text == other.text);
}

// None if the column holds what is no key.
std::optional<Key> KeyIn(const ColumnValue& column) {
  const int type = column.Type();
  if (type == SQLITE_INTEGER) return Key{KeyKind::kNumber, column.Number(), {}};
  if (type == SQLITE_TEXT) return Key{KeyKind::kText, 0, column.Bytes()};
  return std::nullopt;
}

}  // namespace

bool CacheSource::Cursor::IsAt(const Keys& keys) const {
  if (!isOnRow) return false;
  for (size_t i = 0; i < kMaxKeys; ++i) {
    if (!at[i] || !AreSame(*at[i], KeyAt(keys, i))) return false;
  }
  return true;
}

int CacheSource::Cursor::Step() {
  const int code = rows.Step();
  isOnRow = code == SQLITE_ROW;
  if (isOnRow) at = {KeyIn(rows.At(kKey1)), KeyIn(rows.At(kKey2))};
  return code;
}

void CacheSource::Cursor::Leave() {
  rows.Reset();
  isOnRow = false;
}

// To the first row that is not before `keys`, and `node` if the rows are of lists.
int CacheSource::Cursor::Seek(sqlite3* database, const Keys& keys, const int64_t* node) {
  Leave();
  // Many a report reads little, so this waits until it is needed.
  int code = rows ? SQLITE_OK : rows.Prepare(database, node == nullptr ? kReadings : kEntries);
  for (size_t i = 0; i < kMaxKeys && code == SQLITE_OK; ++i) {
    const Key& key = KeyAt(keys, i);
    const int parameter = static_cast<int>(i) + 1;
    code = key.kind == KeyKind::kNumber ? rows.Bind(parameter, key.number)
                                        : rows.Bind(parameter, key.text);
  }
  if (code == SQLITE_OK && node != nullptr) code = rows.Bind(kMaxKeys + 1, *node);
  return code == SQLITE_OK ? Step() : code;
}

bool CacheSource::OwnKey::Is(const Key& key) const { return AreSame({kind, number, text}, key); }

void CacheSource::OwnKey::Take(const Key& key) {
  kind = key.kind;
  number = key.number;
  text = key.text;
}

CacheSource::CacheSource(std::string fileName, std::unique_ptr<CacheFile> file)
    : fileName_(std::move(fileName)), file_(std::move(file)), walk_(file_->Size()) {
  for (auto& ids : ids_) ids.assign(Catalogue().size(), -1);
  for (const CacheFile::NodeRow& row : file_->NodeRows()) {
    if (row.node == nullptr) continue;
    ids_[static_cast<size_t>(row.kind)][IdOf(*row.node) - 1u] = row.id;
  }
}

Status CacheSource::Value(const Node& node, const Keys& keys, Buffer record) {
  const Status status = Read(node, keys, record);
  TellWhy(node);
  return status;
}

Status CacheSource::Read(const Node& node, const Keys& keys, Buffer record) {
  Object* object = nullptr;
  const Reading* reading = nullptr;
  const Status status = Find(node, Kind::kValue, keys, &object, &reading);
  if (status != kOk) return status;
  if (reading->type != SQLITE_BLOB || reading->size != record.size()) {
    why_ = "has no record of this version";
    return KSI_STATUS_LENGTH_MISMATCH;
  }
  std::memcpy(record.data(), object->bytes.data() + reading->offset, record.size());
  return kOk;
}

Status CacheSource::Instances(const Node& node, const Keys& keys, ParamList& instances) {
  const size_t before = instances.Count();
  Status status = BeginList(node, keys);
  if (status == kOk) status = List(node, keys, instances);
  if (status == kOk) walk_.End(node, instances, before);
  TellWhy(node);
  return status;
}

// What the walks have to say of a list that is asked for; of the groups WalkStatus tells it.
Status CacheSource::BeginList(const Node& node, const Keys& keys) {
  const Status status = walk_.Begin(node, keys);
  if (status == kOk || walk_.WalkStatus() != kOk) return status;
  return Damaged("volumes are listed over and over");
}

Status CacheSource::Damaged(const char* why) {
  why_ = why;
  return KSI_STATUS_METADATA_READ_ERROR;
}

// The status for what a call of SQLite gave.
Status CacheSource::StatusOfCall(int code) {
  const Status status = StatusOfSqlite(code);
  if (status != kOk) why_ = file_->ErrorText();
  return status;
}

// Tells what is wrong with what was read. Once: one damage is the reason for many.
void CacheSource::TellWhy(const Node& node) {
  if (why_.empty()) return;
  if (!told_) {
    Warning("%s: %.*s: %s\n", Printable(fileName_).c_str(), static_cast<int>(node.path.size()),
            node.path.data(), why_.c_str());
  }
  told_ = true;
  why_.clear();
}

Status CacheSource::BeginRead() {
  const Status status = file_->BeginRead();
  if (status != kOk) why_ = file_->ErrorText();
  return status;
}

Status CacheSource::List(const Node& node, const Keys& keys, ParamList& instances) {
  Object* object = nullptr;
  const Reading* reading = nullptr;
  Status status = Find(node, Kind::kList, keys, &object, &reading);
  if (status != kOk) return status;
  if (reading->type != SQLITE_INTEGER) return Damaged("has no number of entries");
  if (reading->number == 0) return kOk;
  if (reading->number > kFewEntries) return ReadEntries(node, keys, *reading, instances);
  if (object->listed != reading->node) {
    object->listed = -1;
    object->entries = ParamList(ParamList::kNoLimit);
    status = ReadEntries(node, keys, *reading, object->entries);
    if (status != kOk) return status;
    object->listed = reading->node;
  }
  return instances.Append(object->entries);
}

Status CacheSource::ReadEntries(const Node& node, const Keys& keys, const Reading& reading,
                                ParamList& instances) {
  Status status = BeginRead();
  if (status != kOk) return status;

  // The lists of a walk lie side by side.
  const auto isOnList = [&] {
    return entries_.IsAt(keys) && entries_.rows.Number(kNode) == reading.node;
  };
  int code = SQLITE_ROW;
  if (!isOnList() || entries_.rows.Number(kPosition) != 0) {
    code = entries_.Seek(file_->Handle(), keys, &reading.node);
  }
  int64_t position = 0;
  for (; status == kOk && code == SQLITE_ROW && isOnList(); code = entries_.Step(), ++position) {
    status = position < reading.number && entries_.rows.Number(kPosition) == position
                 ? TakeEntry(node, instances)
                 : Damaged(kOtherCount);
  }
  if (status == kOk) status = StatusOfCall(code);
  if (status == kOk && position != reading.number) status = Damaged(kOtherCount);
  if (status != kOk) entries_.Leave();
  return status;
}

// The entry of the row that entries_ is on.
Status CacheSource::TakeEntry(const Node& node, ParamList& instances) {
  const Statement& row = entries_.rows;
  if (KindOf(node.entries) == KeyKind::kNumber) {
    if (row.Type(kEntry) != SQLITE_INTEGER) return Damaged("has an entry that is no number");
    return instances.AddNumber(static_cast<uint64_t>(row.Number(kEntry)));
  }
  const std::string_view text = row.Text(kEntry);
  if (row.Type(kEntry) != SQLITE_TEXT || text.find('\0') != std::string_view::npos) {
    return Damaged("has an entry that is no text");
  }
  return instances.AddText(text);
}

Definitions CacheSource::KernelDefinitions() const {
  const CacheFile::Capture& capture = file_->GetCapture();
  return {capture.signature, capture.built};
}

std::optional<Source::Origin> CacheSource::GetOrigin() const {
  const CacheFile::Capture& capture = file_->GetCapture();
  return Origin{capture.host, TimeOfText(capture.taken).value_or(0)};
}

// The reading of a node's value or list; one that failed when it was captured fails again.
Status CacheSource::Find(const Node& node, Kind kind, const Keys& keys, Object** object,
                         const Reading** reading) {
  const int64_t id = ids_[static_cast<size_t>(kind)][IdOf(node) - 1u];
  if (id < 0) return KSI_STATUS_NOT_FOUND;
  const Status status = FindObject(keys, object);
  if (status != kOk) return status;
  const std::vector<Reading>& readings = (*object)->readings;
  const auto found = std::ranges::find(readings, id, &Reading::node);
  if (found == readings.end()) return KSI_STATUS_NOT_FOUND;
  *reading = &*found;
  return found->status;
}

Status CacheSource::FindObject(const Keys& keys, Object** object) {
  for (Object& each : objects_) {
    if (each.valid && each.keys[0].Is(KeyAt(keys, 0)) && each.keys[1].Is(KeyAt(keys, 1))) {
      *object = &each;
      return kOk;
    }
  }
  Object& loaded = objects_[oldest_];
  loaded.valid = false;
  const Status status = Load(keys, loaded);
  if (status != kOk) return status;
  for (size_t i = 0; i < kMaxKeys; ++i) loaded.keys[i].Take(KeyAt(keys, i));
  loaded.valid = true;
  oldest_ = (oldest_ + 1) % objects_.size();
  *object = &loaded;
  return kOk;
}

// A cursor on the first reading of an object: one that is there after the object before it, or else
// the one that has rested longest. Off any row if there is no such object.
Status CacheSource::FindCursor(const Keys& keys, Cursor*& cursor) {
  auto* const there =
      std::ranges::find_if(cursors_, [&](const Cursor& each) { return each.IsAt(keys); });
  if (there != cursors_.end()) {
    cursor = there;
    return kOk;
  }
  cursor = &cursors_[restedCursor_];
  restedCursor_ = (restedCursor_ + 1) % cursors_.size();
  return StatusOfCall(cursor->Seek(file_->Handle(), keys, nullptr));
}

Status CacheSource::Load(const Keys& keys, Object& object) {
  object.readings.clear();
  object.bytes.clear();
  object.listed = -1;
  Cursor* cursor = nullptr;
  Status status = BeginRead();
  if (status == kOk) status = FindCursor(keys, cursor);
  while (status == kOk && cursor->IsAt(keys)) {
    status = TakeReading(cursor->rows, object);
    if (status == kOk) status = StatusOfCall(cursor->Step());
  }
  if (status != kOk && cursor != nullptr) cursor->Leave();
  return status;
}

Status CacheSource::TakeReading(const Statement& row, Object& object) {
  Reading reading{};
  reading.node = row.Number(kNode);
  // Rows in order end: a damaged tree that leads back to itself does not.
  if (!object.readings.empty() &&
      (reading.node <= object.readings.back().node || object.readings.size() == kMostReadings)) {
    return Damaged("readings are out of order");
  }
  const ColumnValue recorded = row.At(kStatus);
  if (recorded.Type() != SQLITE_INTEGER || recorded.Number() < 0 ||
      recorded.Number() > std::numeric_limits<Status>::max()) {
    return Damaged("a reading has no good status");
  }
  reading.status = static_cast<Status>(recorded.Number());
  const ColumnValue answer = row.At(kAnswer);
  reading.type = answer.Type();
  if (reading.type == SQLITE_INTEGER) {
    reading.number = answer.Number();
  } else if (reading.type == SQLITE_BLOB) {
    const std::span<const std::byte> blob = answer.Blob();
    reading.offset = object.bytes.size();
    reading.size = blob.size();
    if (blob.size() <= kMaxRecordSize) {  // a larger one is no node's
      object.bytes.insert(object.bytes.end(), blob.begin(), blob.end());
    }
  }
  object.readings.push_back(reading);
  return kOk;
}

}  // namespace ksi
