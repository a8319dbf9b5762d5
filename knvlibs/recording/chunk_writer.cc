#include "knvlibs/recording/chunk_writer.h"

#include <algorithm>
#include <array>
#include <span>

#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/frame.h"
#include "knvlibs/recording/list_edit.h"

namespace ksi {
namespace {

void PutHost(const HostIdentity& host, ByteWriter& out) {
  for (const std::string* text : {&host.signature, &host.built, &host.name, &host.boot}) {
    out.Text(*text);
  }
  out.Unsigned(host.nodes.size());
  for (const RecordedNode& node : host.nodes) {
    out.Text(node.path);
    out.Byte(static_cast<uint8_t>(node.kind));
    out.Unsigned(node.recordSize);
    out.Unsigned(node.cells.size());
    for (const RecordCell& cell : node.cells) {
      out.Byte(static_cast<uint8_t>(2 * cell.width + (cell.isFigure ? 1 : 0)));
    }
  }
}

void PutFacts(const MomentFacts& facts, const MomentFacts& before, ByteWriter& out) {
  out.Signed(chunk::Minus(facts.taken, before.taken));
  out.Signed(chunk::Minus(facts.uptime, before.uptime));
  for (const uint64_t number : {facts.duration, facts.cpu, facts.skipped, uint64_t{facts.loss},
                                facts.refused, facts.failed}) {
    out.Unsigned(number);
  }
}

// Ascending numbers, as gaps.
void PutNumbers(const std::vector<size_t>& numbers, ByteWriter& out) {
  size_t next = 0;
  out.Unsigned(numbers.size());
  for (const size_t number : numbers) {
    out.Unsigned(number - next);
    next = number + 1;
  }
}

}  // namespace

// The streams of a node's cells from a moment on.
class ChunkWriter::Columns {
 public:
  Columns(const ChunkWriter& writer, size_t node, size_t from) : from_(from) {
    for (const size_t number : writer.byNode_[node]) Collect(writer.readings_[number]);
    const std::vector<RecordCell>& cells = writer.host_.nodes[node].cells;
    for (uint32_t i = 0; i < cells.size(); ++i) {
      for (Series& each : series_) PutCell(cells[i], i, each);
    }
  }

  const Bytes& Stream(size_t kind) const { return streams_[kind].All(); }

 private:
  // The changes of a reading, by cell; those up to `next` have been put.
  struct Series {
    const Tracked* reading;
    std::vector<Change> changes;
    size_t next = 0;
  };

  void Collect(const Tracked& tracked) {
    if (tracked.went < from_ || tracked.reading.answer.status != kOk) return;
    const auto begin = std::ranges::lower_bound(tracked.changes, from_, {}, &Change::moment);
    Series& made = series_.emplace_back();
    made.reading = &tracked;
    made.changes.assign(begin, tracked.changes.end());
    std::ranges::stable_sort(made.changes, {}, &Change::cell);
  }

  void PutCell(const RecordCell& cell, uint32_t index, Series& series) {
    if (series.reading->came >= from_) PutFirst(cell, series.reading->first);
    const size_t begin = series.next;
    while (series.next < series.changes.size() && series.changes[series.next].cell == index) {
      ++series.next;
    }
    if (begin == series.next) {
      ++gap_;
      return;
    }
    streams_[chunk::kGaps].Unsigned(std::exchange(gap_, 0));
    streams_[chunk::kCounts].Unsigned(series.next - begin - 1);
    size_t moment = std::max(series.reading->came + 1, from_);
    for (const Change& change : std::span(series.changes).subspan(begin, series.next - begin)) {
      streams_[chunk::kSteps].Unsigned(change.moment - moment);
      streams_[chunk::kDeltas].Signed(change.delta, streams_[chunk::kMore]);
      moment = change.moment + 1;
    }
  }

  void PutFirst(const RecordCell& cell, const Bytes& record) {
    if (cell.isFigure) {
      streams_[chunk::kFirst].Signed(chunk::SignedOf(chunk::BitsOf(cell, record), cell));
    } else {
      streams_[chunk::kRaw].Raw(ByteView(record).subspan(cell.offset, cell.width));
    }
  }

  size_t from_;
  std::vector<Series> series_;
  std::array<ByteWriter, chunk::kStreams> streams_;
  uint64_t gap_ = 0;
};

void ChunkWriter::Add(const MomentFacts& facts, const std::vector<MomentReading>& readings) {
  Event event;
  event.facts = facts;
  std::vector<size_t> current;
  current.reserve(readings.size());
  auto old = current_.begin();
  for (const MomentReading& reading : readings) {
    for (; old != current_.end() && readings_[*old].reading.question < reading.question; ++old) {
      Go(*old, event);
    }
    if (old == current_.end() || readings_[*old].reading.question != reading.question) {
      current.push_back(Come(reading, event));
      continue;
    }
    if (Compare(*old, reading.answer, event)) {
      current.push_back(*old);
    } else {
      Go(*old, event);
      current.push_back(Come(reading, event));
    }
    ++old;
  }
  for (; old != current_.end(); ++old) Go(*old, event);
  std::ranges::sort(event.gone);
  current_ = std::move(current);
  moments_.push_back(std::move(event));
}

size_t ChunkWriter::Come(const MomentReading& reading, Event& event) {
  const size_t number = readings_.size();
  event.come.push_back(number);
  byNode_[reading.question.node].push_back(number);
  Tracked& come = readings_.emplace_back();
  come.reading.question = reading.question;
  come.reading.answer.status = reading.answer.status;
  come.reading.answer.record = come.first = reading.answer.record;
  come.came = moments_.size();
  CompareLists(number, reading.answer.entries, event);
  return number;
}

void ChunkWriter::Go(size_t number, Event& event) {
  readings_[number].went = moments_.size();
  event.gone.push_back(number);
}

// Notes how the answer to a question changed; false if it is of another kind now.
bool ChunkWriter::Compare(size_t number, const Answer& answer, Event& event) {
  const Answer& before = readings_[number].reading.answer;
  if (before.status != answer.status || before.record.size() != answer.record.size()) return false;
  CompareRecords(readings_[number], answer.record);
  CompareLists(number, answer.entries, event);
  return true;
}

void ChunkWriter::CompareRecords(Tracked& tracked, const Bytes& record) const {
  Bytes& before = tracked.reading.answer.record;
  if (before == record) return;
  const std::vector<RecordCell>& cells = host_.nodes[tracked.reading.question.node].cells;
  for (uint32_t i = 0; i < cells.size(); ++i) {
    const uint64_t delta = chunk::BitsOf(cells[i], record) - chunk::BitsOf(cells[i], before);
    if (delta == 0) continue;
    tracked.changes.push_back(
        {i, static_cast<uint32_t>(moments_.size()), chunk::SignedOf(delta, cells[i])});
  }
  before = record;
}

void ChunkWriter::CompareLists(size_t number, const std::vector<OwnKey>& entries, Event& event) {
  std::vector<OwnKey>& before = readings_[number].reading.answer.entries;
  if (before == entries) return;
  ByteWriter edit;
  PutEdit(before, entries, edit);
  event.edits.push_back({number, edit.All()});
  before = entries;
}

Bytes ChunkWriter::PartFrom(size_t from) const {
  const Bytes index = FactsFrom(from);
  const ByteView pieces[] = {index};
  const Bytes facts = Pack(pieces);
  const Bytes changes = ChangesFrom(from);
  const auto size = static_cast<uint32_t>(facts.size());
  ByteWriter part;
  part.Raw(std::as_bytes(std::span(&size, 1)));
  part.Raw(facts);
  part.Raw(changes);
  return part.All();
}

Bytes ChunkWriter::FactsFrom(size_t from) const {
  ByteWriter out;
  out.Byte(from == 0 ? 1 : 0);
  if (from == 0) PutHost(host_, out);
  out.Unsigned(moments_.size() - from);
  MomentFacts before;
  for (const Event& event : std::span(moments_).subspan(from)) {
    PutFacts(event.facts, before, out);
    before = event.facts;
  }
  return out.All();
}

// The frame of the changes.
Bytes ChunkWriter::ChangesFrom(size_t from) const {
  std::vector<Columns> columns;
  for (size_t node = 0; node < byNode_.size(); ++node) columns.emplace_back(*this, node, from);
  const Bytes events = EventsFrom(from);
  ByteWriter head;
  std::array<ByteWriter, chunk::kStreams> streams;
  head.Unsigned(events.size());
  for (const Columns& each : columns) {
    for (size_t kind = 0; kind < chunk::kStreams; ++kind) {
      head.Unsigned(each.Stream(kind).size());
      streams[kind].Raw(each.Stream(kind));
    }
  }
  std::vector<ByteView> pieces = {head.All(), events};
  for (const ByteWriter& stream : streams) pieces.emplace_back(stream.All());
  return Pack(pieces);
}

Bytes ChunkWriter::EventsFrom(size_t from) const {
  ByteWriter out;
  for (const Event& event : std::span(moments_).subspan(from)) {
    PutNumbers(event.gone, out);
    out.Unsigned(event.come.size());
    int64_t number = 0;
    for (const size_t each : event.come) {
      const MomentReading& reading = readings_[each].reading;
      out.Unsigned(reading.question.node);
      for (const OwnKey& key : reading.question.keys) PutEntry(key, number, out);
      out.Unsigned(reading.answer.status);
    }
    out.Unsigned(event.edits.size());
    for (const Edit& edit : event.edits) {
      out.Unsigned(edit.reading);
      out.Raw(edit.edit);
    }
  }
  return out.All();
}

}  // namespace ksi
