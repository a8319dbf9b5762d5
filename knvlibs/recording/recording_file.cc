#include "knvlibs/recording/recording_file.h"

#include <algorithm>
#include <cstring>
#include <tuple>
#include <utility>

#include <knvlibs/ksi_status.h>
#include "knvlibs/cache_format.h"
#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/chunk_reader.h"
#include "knvlibs/times.h"

namespace ksi {
namespace {

enum Column { kId, kMoments, kNumber, kChunk, kFirst, kLast, kSize, kBlock };

constexpr const char* kRows =
    "SELECT id, moments, number, chunk, first, last, size, block FROM part WHERE moments > 0 "
    "ORDER BY id";
constexpr const char* kLastBlock = "SELECT max(id) FROM block";
constexpr const char* kBlockOf = "SELECT data FROM block WHERE id = ?1";

// More than the years of a recording in seconds.
constexpr int64_t kMostNumber = int64_t{1} << 47;
constexpr size_t kMostRows = size_t{1} << 20;

// By so much a file may have grown since its size was looked at.
constexpr uint64_t kGrowth = uint64_t{1} << 20;

// What the blocks of a part take of the file.
uint64_t RoomOf(const RecordingFile::Part& part) {
  return cache::BlocksOf(static_cast<size_t>(part.size)) * cache::kBlockSize;
}

bool IsTime(int64_t time) { return kFirstTime <= time && time <= kLastTime; }

bool IsGood(const MomentFacts& facts) {
  constexpr uint64_t kMostCount = kMostNumber;
  constexpr uint64_t kLongest = kFarthest;
  return IsTime(facts.taken) && facts.uptime >= 0 && facts.uptime < kFarthest &&
         facts.duration < kLongest && facts.cpu < kLongest && facts.skipped < kMostCount &&
         facts.refused < kMostCount && facts.failed < kMostCount;
}

bool IsGood(const RecordingFile::Part& part) {
  return part.moments > 0 && part.moments <= static_cast<int64_t>(chunk::kMostMoments) &&
         part.chunk >= 0 && part.chunk <= part.number && part.number < kMostNumber &&
         part.End() - part.chunk <= static_cast<int64_t>(chunk::kMostMoments) &&
         IsTime(part.first) && IsTime(part.last) && part.first <= part.last && part.size > 0 &&
         part.size <= RecordingFile::kLargestPart && part.block > 0;
}

}  // namespace

Status RecordingFile::Make(std::unique_ptr<CacheDatabase> database,
                           std::unique_ptr<RecordingFile>* file, std::string* why) {
  if (database->Version() != cache::kRecordingVersion) return KSI_STATUS_INVALID_METADATA;
  std::unique_ptr<RecordingFile> made(new RecordingFile(std::move(database)));
  Status status = made->database_->CheckSchema(cache::kRecordingTables);
  made->database_->AllowReads();
  if (status == kOk) status = made->ReadRows();
  if (status != kOk) {
    if (why != nullptr) *why = made->Why();
    return status;
  }
  made->ChooseParts();
  *file = std::move(made);
  return kOk;
}

Status RecordingFile::ReadRows() {
  Statement rows;
  int code = rows.Prepare(database_->Handle(), kRows);
  if (code != SQLITE_OK) return database_->Failed(code);
  int64_t last = 0;
  uint64_t total = 0;
  while ((code = rows.Step()) == SQLITE_ROW) {
    const Part part = {rows.Number(kId),    rows.Number(kMoments), rows.Number(kNumber),
                       rows.Number(kChunk), rows.Number(kFirst),   rows.Number(kLast),
                       rows.Number(kSize),  rows.Number(kBlock)};
    if (part.id <= std::exchange(last, part.id) || rows_.size() == kMostRows) {
      return database_->Damaged("the rows of its parts are out of order");
    }
    if (!IsGood(part)) return Damaged(part, "is not understood");
    total += RoomOf(part);
    if (total > Size() + kGrowth) return database_->Damaged("its parts are larger than it");
    rows_.push_back(part);
  }
  return code == SQLITE_DONE ? kOk : database_->Failed(code);
}

void RecordingFile::ChooseParts() {
  std::vector<Part> sorted = rows_;
  std::ranges::sort(sorted, [](const Part& a, const Part& b) {
    return std::tuple(a.number, -a.moments, a.id) < std::tuple(b.number, -b.moments, b.id);
  });
  int64_t end = 0;
  for (const Part& part : sorted) {
    if (part.number < end) continue;
    end = part.End();
    parts_.push_back(part);
  }
}

Status RecordingFile::Damaged(const Part& part, const char* why) {
  return database_->Damaged("the part of " + TextOfTime(part.first) + " " + why);
}

Status RecordingFile::ReadPart(const Part& part, Bytes& content) {
  content.clear();
  content.reserve(std::min(static_cast<uint64_t>(part.size), Size()));
  return Walk(part, &content, nullptr);
}

Status RecordingFile::ReadBlocks(const Part& part, std::vector<int64_t>& blocks) {
  blocks.clear();
  return Walk(part, nullptr, &blocks);
}

// Goes through the blocks of a part; it has as many as its size takes.
Status RecordingFile::Walk(const Part& part, Bytes* content, std::vector<int64_t>* blocks) {
  const Status status = database_->BeginRead();
  if (status != kOk) return status;
  // Blocks that lead to each other in a circle would be enough for any size.
  if (static_cast<uint64_t>(part.size) > Size()) return Damaged(part, "is larger than the file");
  int code = block_ ? SQLITE_OK : block_.Prepare(database_->Handle(), kBlockOf);
  int64_t block = part.block;
  auto left = static_cast<size_t>(part.size);
  while (code == SQLITE_OK && left != 0) {
    block_.Reset();
    code = block_.Bind(1, block);
    if (code == SQLITE_OK) code = block_.Step();
    const ByteView data = code == SQLITE_ROW ? block_.Blob(0) : ByteView();
    if (code == SQLITE_DONE || (code == SQLITE_ROW && data.size() != cache::kBlockSize)) {
      return Damaged(part, "has not all its blocks");
    }
    if (code != SQLITE_ROW) return database_->Failed(code);
    code = SQLITE_OK;
    const size_t size = std::min(left, cache::kBlockSize - cache::kBlockHead);
    const ByteView piece = data.subspan(cache::kBlockHead, size);
    if (content != nullptr) content->insert(content->end(), piece.begin(), piece.end());
    if (blocks != nullptr) blocks->push_back(block);
    uint32_t next = 0;
    std::memcpy(&next, data.data(), sizeof next);
    block = next;
    left -= size;
  }
  return code == SQLITE_OK ? kOk : database_->Failed(code);
}

// The row of a part and what it holds were written one after the other.
Status RecordingFile::CheckFacts(const Part& part, const std::vector<MomentFacts>& facts) {
  const bool isOfPart = facts.size() == static_cast<size_t>(part.moments) &&
                        facts.front().taken == part.first && facts.back().taken == part.last;
  if (!isOfPart) return Damaged(part, "is not what its row says");
  if (!std::ranges::is_sorted(facts, {}, &MomentFacts::taken)) {
    return Damaged(part, "goes back in time");
  }
  const bool isGood =
      std::ranges::all_of(facts, [](const MomentFacts& each) { return IsGood(each); });
  return isGood ? kOk : Damaged(part, "has times or numbers that there are not");
}

Status RecordingFile::ReadFacts(const Part& part, std::vector<MomentFacts>& facts) {
  Bytes content;
  HostIdentity host;
  Status status = ReadPart(part, content);
  if (status != kOk) return status;
  status = ChunkReader::TakeFacts(content, host, facts);
  return status == kOk ? CheckFacts(part, facts) : Damaged(part, "is damaged");
}

Status RecordingFile::ReadHost(const Part& part, HostIdentity& host) {
  const Part* start = FindPart(part.chunk);
  if (start == nullptr || start->number != part.chunk) return Damaged(part, "has no start");
  Bytes content;
  std::vector<MomentFacts> facts;
  const Status status = ReadPart(*start, content);
  if (status != kOk) return status;
  host = {};
  return ChunkReader::TakeFacts(content, host, facts) == kOk && !host.nodes.empty()
             ? kOk
             : Damaged(*start, "is damaged");
}

const RecordingFile::Part* RecordingFile::FindPart(int64_t number) const {
  const auto after = std::ranges::upper_bound(parts_, number, {}, &Part::number);
  if (after == parts_.begin()) return nullptr;
  const Part& part = *std::prev(after);
  return number < part.End() ? &part : nullptr;
}

Status RecordingFile::ReadMoment(int64_t number, ChunkReader& reader, int64_t at) {
  const Part* wanted = FindPart(number);
  if (wanted == nullptr) return KSI_STATUS_NOT_FOUND;
  const Part* reached = FindPart(at);
  const bool goesOn =
      !reader.IsEmpty() && reached != nullptr && reached->chunk == wanted->chunk && at <= number;
  if (!goesOn) reader = {};
  for (; goesOn && reader.HasNext() && at < number; ++at) reader.Next();
  for (int64_t next = goesOn ? reached->End() : wanted->chunk; next <= number;) {
    const Part* part = FindPart(next);
    if (part == nullptr || part->number != next || part->chunk != wanted->chunk) {
      reader = {};
      return Damaged(*wanted, "has not all that it continues");
    }
    const size_t last = part == wanted ? static_cast<size_t>(number - next) : SIZE_MAX;
    const Status status = TakePart(*part, last, reader);
    if (status != kOk) {
      reader = {};  // of which nothing is good any more
      return status;
    }
    next = part->End();
  }
  return kOk;
}

Status RecordingFile::TakePart(const Part& part, size_t last, ChunkReader& reader) {
  Bytes content;
  const Status status = ReadPart(part, content);
  if (status != kOk) return status;
  const size_t before = reader.Size();
  const bool isGood = reader.Take(std::move(content), last) == kOk;
  constexpr uint64_t kAnyPart = 65536;  // that the smallest one is like
  taken_ += kAnyPart + reader.Size() - before;
  return isGood ? CheckFacts(part, reader.PartFacts()) : Damaged(part, "is damaged");
}

Status RecordingFile::CheckPart(const Part& part, ChunkReader& reader, int64_t at) {
  const Status status = ReadMoment(part.End() - 1, reader, at);
  if (status != kOk || reader.CheckLastPart() == kOk) return status;
  reader = {};
  return Damaged(part, "is damaged");
}

Status RecordingFile::ReadLast(ChunkReader& reader, int64_t& number) {
  // Each loss of power harms one at most.
  constexpr int kMostChunks = 16;
  number = parts_.back().End() - 1;
  Status status = ReadMoment(number, reader);
  if (status == kOk && reader.CheckSingles() == kOk) return kOk;
  if (status == kOk) status = Damaged(parts_.back(), "is damaged");
  const Part* last = &parts_.back();
  for (int i = 0; i < kMostChunks && status == KSI_STATUS_METADATA_READ_ERROR; ++i) {
    status = ReadLastOf(last->chunk, reader, number);
    const auto start = std::ranges::lower_bound(parts_, last->chunk, {}, &Part::number);
    if (start == parts_.begin()) break;
    last = &*std::prev(start);
  }
  return status;
}

// Up to where a chunk can be read.
Status RecordingFile::ReadLastOf(int64_t chunk, ChunkReader& reader, int64_t& number) {
  ChunkReader next;
  int64_t at = kNoMoment;
  Status status = kOk;
  for (const Part* part = FindPart(chunk); part != nullptr && part->chunk == chunk;
       part = FindPart(part->End())) {
    status = CheckPart(*part, next, at);
    if (status != kOk) break;
    at = part->End() - 1;
  }
  if (at == kNoMoment) return status == kOk ? Damaged(parts_.back(), "has no start") : status;
  number = at;
  return ReadMoment(number, reader);
}

int64_t RecordingFile::NumberAfter(int64_t number) const {
  const Part* part = FindPart(number);
  if (part != nullptr && number + 1 < part->End()) return number + 1;
  const auto next = std::ranges::upper_bound(parts_, number, {}, &Part::number);
  return next == parts_.end() ? kNoMoment : next->number;
}

Status RecordingFile::ReadNext(int64_t& number, ChunkReader& reader) {
  const int64_t next = NumberAfter(number);
  if (next == kNoMoment) return KSI_STATUS_NOT_FOUND;
  const int64_t at = std::exchange(number, next);
  return ReadMoment(number, reader, at);
}

Status RecordingFile::ReadWhole(int64_t number, ChunkReader& reader, Moment& moment, int64_t at) {
  const Status status = ReadMoment(number, reader, at);
  return status == kOk ? ReadAll(number, reader, moment) : status;
}

Status RecordingFile::ReadAll(int64_t number, ChunkReader& reader, Moment& moment) {
  if (reader.ReadAll(moment) == kOk) return kOk;
  reader = {};
  return Damaged(*FindPart(number), "is damaged");
}

Status RecordingFile::ReadRoom(Room& room) {
  Statement last;
  int code = last.Prepare(database_->Handle(), kLastBlock);
  if (code == SQLITE_OK) code = last.Step();
  if (code != SQLITE_ROW) return database_->Failed(code);
  room = {};
  for (const Part& row : rows_) room.replaced += RoomOf(row);
  for (const Part& part : parts_) room.moments += RoomOf(part);
  room.replaced -= room.moments;
  // Blocks are never removed, so there are as many as the last one says.
  const auto count = static_cast<uint64_t>(std::max<int64_t>(last.Number(0), 0));
  const uint64_t size = std::max(Size(), room.moments + room.replaced);
  const uint64_t blocks = std::min(count, size / cache::kBlockSize) * cache::kBlockSize;
  room.free = std::max(blocks, room.moments + room.replaced) - room.moments - room.replaced;
  room.rest = size - room.moments - room.replaced - room.free;
  return kOk;
}

Span RecordingFile::Times() const {
  Span times = {parts_.front().first, parts_.front().last};
  for (const Part& part : parts_) {
    times = {std::min(times.first, part.first), std::max(times.last, part.last)};
  }
  return times;
}

// The number of the last moment of a part up to a second, in which its first one is or which is
// later.
Status RecordingFile::FindIn(const Part& part, int64_t second, int64_t& number, int64_t& found) {
  number = part.End() - 1;
  found = SecondOf(part.last);
  if (found <= second) return kOk;
  std::vector<MomentFacts> facts;
  const Status status = ReadFacts(part, facts);
  if (status != kOk) return status;
  const auto after = std::ranges::upper_bound(
      facts, second, {}, [](const MomentFacts& each) { return SecondOf(each.taken); });
  number = part.number + (after - facts.begin()) - 1;
  found = SecondOf(std::prev(after)->taken);
  return kOk;
}

Status RecordingFile::FindMoment(int64_t time, int64_t& number) {
  const int64_t wanted = SecondOf(time);
  int64_t best = 0;  // the second of `number`
  number = -1;
  for (size_t i = parts_.size(); i-- > 0;) {
    const Part& part = parts_[i];
    const bool isBehind = number >= 0 && SecondOf(part.last) <= best;
    if (isBehind || SecondOf(part.first) > wanted) continue;
    int64_t candidate = 0;
    int64_t second = 0;
    const Status status = FindIn(part, wanted, candidate, second);
    if (status != kOk) return status;
    if (number >= 0 && second <= best) continue;
    number = candidate;
    best = second;
    if (best == wanted) break;
  }
  return kOk;
}

}  // namespace ksi
