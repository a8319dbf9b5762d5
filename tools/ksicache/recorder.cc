#include "tools/ksicache/recorder.h"

#include <algorithm>
#include <stdexcept>
#include <string>
#include <utility>

#include <knvlibs/ksi_status.h>
#include "knvlibs/recording/chunk.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

// So much is packed at once, whatever the number of moments: it is held in memory.
constexpr size_t kMostBytes = size_t{4} << 20;

// And no more than this share of the file, for it stays there until the next time; of a chunk,
// which leaves as a whole, this one.
constexpr int64_t kPartsInFile = 8;
constexpr int64_t kChunksInFile = 4;

std::string TooLarge(const std::length_error& error) {
  return std::string("a moment of this host is ") + error.what();
}

ksi::Bytes PartOf(const ksi::ChunkWriter& chunk, size_t first) {
  try {
    return chunk.PartFrom(first);
  } catch (const std::length_error& error) {
    throw Error(TooLarge(error));
  }
}

void AddTo(ksi::ChunkWriter& chunk, const ksi::MomentFacts& facts,
           const std::vector<ksi::MomentReading>& readings) {
  try {
    chunk.Add(facts, readings);
  } catch (const std::length_error& error) {
    throw Error(TooLarge(error));
  }
}

}  // namespace

Recorder::Recorder(RecordingStore& store, Singles singles, int64_t longestChunk)
    : store_(store), singles_(singles), longestChunk_(longestChunk) {
  if (!store.Parts().empty()) next_ = store.Parts().back().End();
}

// What a chunk's moments have in common; in one the clock only goes on.
bool Recorder::Continues(const ksi::HostIdentity& host, const ksi::MomentFacts& facts,
                         size_t readings) const {
  return chunk_ != nullptr && chunk_->Count() < kChunkMoments && chunk_->Host() == host &&
         chunk_->Last().taken < facts.taken &&
         chunk_->Readings() + readings <= ksi::chunk::kMostReadings &&
         ksi::chunk::Minus(facts.taken, chunk_->At(0).taken) <= longestChunk_ &&
         static_cast<int64_t>(packedBytes_ + bytes_) <= store_.MaxSize() / kChunksInFile;
}

void Recorder::Add(const ksi::HostIdentity& host, const ksi::MomentFacts& facts,
                   const std::vector<ksi::MomentReading>& readings) {
  if (!Continues(host, facts, readings.size())) Begin(host);
  const bool isFirst = chunk_->Count() == 0;
  try {
    Write(facts, readings);
  } catch (const NoRoom&) {
    if (isFirst) throw;
    Begin(host);
    Write(facts, readings);
  }
}

void Recorder::Write(const ksi::MomentFacts& facts,
                     const std::vector<ksi::MomentReading>& readings) {
  // Until it is written, what the next one would differ from is not in the file.
  std::unique_ptr<ksi::ChunkWriter> chunk = std::move(chunk_);
  const size_t place = chunk->Count();
  AddTo(*chunk, facts, readings);
  const ksi::Bytes content = PartOf(*chunk, place);
  if (singles_ == Singles::kWritten) {
    store_.Add({0, 1, next_, chunkNumber_, facts.taken, facts.taken, 0, 0}, content);
  }
  ++next_;
  bytes_ += content.size();
  chunk_ = std::move(chunk);
}

void Recorder::Begin(const ksi::HostIdentity& host) {
  try {
    Pack();
  } catch (const Error&) {
    if (singles_ == Singles::kLeftOut) throw;
    // It stays as it is, and a moment is worth more.
  }
  chunk_ = std::make_unique<ksi::ChunkWriter>(host);
  chunkNumber_ = next_;
  packed_ = 0;
  packedBytes_ = 0;
  bytes_ = 0;
}

void Recorder::Tidy() {
  const size_t most = std::min(kMostBytes, static_cast<size_t>(store_.MaxSize() / kPartsInFile));
  if (chunk_ != nullptr && (chunk_->Count() - packed_ >= kPartMoments || bytes_ > most)) Pack();
}

void Recorder::Pack() {
  const bool hasSingles = singles_ == Singles::kWritten;
  if (chunk_ == nullptr || chunk_->Count() - packed_ < (hasSingles ? 2u : 1u)) return;
  const auto count = static_cast<int64_t>(chunk_->Count() - packed_);
  const RecordingStore::Part part = {0,
                                     count,
                                     chunkNumber_ + static_cast<int64_t>(packed_),
                                     chunkNumber_,
                                     chunk_->At(packed_).taken,
                                     chunk_->Last().taken,
                                     0,
                                     0};
  const ksi::Bytes content = PartOf(*chunk_, packed_);
  try {
    hasSingles ? store_.Replace(part, content) : store_.Add(part, content);
  } catch (const NoRoom&) {
    if (!hasSingles) throw;
    return;
  }
  packed_ = chunk_->Count();
  packedBytes_ += content.size();
  bytes_ = 0;
}

size_t Recorder::Adopt(ksi::RecordingFile& recording) {
  size_t damaged = 0;
  const std::vector<RecordingStore::Part>& parts = recording.Parts();
  size_t from = parts.size();
  while (from > 0 && parts[from - 1].moments == 1 && parts.size() - from < kChunkMoments) --from;
  ksi::ChunkReader reader;
  int64_t at = ksi::RecordingFile::kNoMoment;
  for (; from < parts.size(); ++from) {
    ksi::Moment moment;
    const int64_t before = std::exchange(at, parts[from].number);
    const ksi::Status status = recording.ReadWhole(at, reader, moment, before);
    if (status == KSI_STATUS_METADATA_READ_ERROR) {
      ++damaged;
      continue;
    }
    if (status != ksi::kOk) throw Error(recording.Why());
    ksi::SortReadings(moment.readings);
    if (chunk_ == nullptr ||
        parts[from].number != chunkNumber_ + static_cast<int64_t>(chunk_->Count()) ||
        !Continues(moment.host, moment.facts, moment.readings.size())) {
      Begin(moment.host);
      chunkNumber_ = parts[from].number;
    }
    AddTo(*chunk_, moment.facts, moment.readings);
  }
  try {
    Pack();
  } catch (const Error&) {
    // They stay as they are, and whether there is room for another will be seen.
  }
  chunk_ = nullptr;
  return damaged;
}

}  // namespace ksicache
