#include "knvlibs/recording/node_writer.h"

#include <algorithm>
#include <array>
#include <utility>

#include "knvlibs/recording/chunk.h"
#include "knvlibs/recording/list_edit.h"

namespace ksi {
namespace {

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

// The streams of the node's cells from a moment on.
class NodeWriter::Columns {
 public:
  Columns(const NodeWriter& writer, size_t from, std::array<ByteWriter, chunk::kStreams>& streams)
      : from_(from), streams_(streams), changes_(writer.node_->cells.size()) {
    for (const Tracked& each : writer.readings_) Collect(each);
    for (size_t i = 0; i < changes_.size(); ++i) {
      for (const Bytes* first : firsts_) PutFirst(writer.node_->cells[i], *first);
      PutCell(i);
    }
  }

 private:
  // A change of a cell of one of the series.
  struct Placed {
    size_t series;
    const Change* change;
  };

  // Reading by reading, and of each by moments: so each cell has its changes in their order.
  void Collect(const Tracked& tracked) {
    if (tracked.went < from_ || tracked.reading.answer.status != kOk) return;
    if (tracked.came >= from_) firsts_.push_back(&tracked.first);
    auto change = std::ranges::lower_bound(tracked.changes, from_, {}, &Change::moment);
    for (; change != tracked.changes.end(); ++change) {
      changes_[change->cell].push_back({series_.size(), &*change});
    }
    series_.push_back(&tracked);
  }

  void PutCell(size_t cell) {
    for (std::span<const Placed> rest = changes_[cell]; !rest.empty();) {
      const auto end = std::ranges::find_if_not(
          rest, [&rest](size_t series) { return series == rest.front().series; }, &Placed::series);
      const auto count = static_cast<size_t>(end - rest.begin());
      PutChanges(cell, rest.first(count));
      rest = rest.subspan(count);
    }
  }

  // Those of one series.
  void PutChanges(size_t cell, std::span<const Placed> changes) {
    const size_t series = changes.front().series;
    const size_t place = cell * series_.size() + series;
    streams_[chunk::kGaps].Unsigned(place - std::exchange(next_, place + 1));
    streams_[chunk::kCounts].Unsigned(changes.size() - 1);
    size_t moment = std::max(series_[series]->came + 1, from_);
    for (const Placed& each : changes) {
      streams_[chunk::kSteps].Unsigned(each.change->moment - moment);
      streams_[chunk::kDeltas].Signed(each.change->delta, streams_[chunk::kMore]);
      moment = each.change->moment + 1;
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
  std::array<ByteWriter, chunk::kStreams>& streams_;
  std::vector<const Tracked*> series_;
  std::vector<const Bytes*> firsts_;          // the records that series came with
  std::vector<std::vector<Placed>> changes_;  // by cell
  size_t next_ = 0;                           // the place behind the last one put
};

void NodeWriter::Add(std::span<const MomentReading> readings) {
  Event event;
  event.moment = moments_;
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
  ++moments_;
  if (!event.gone.empty() || !event.come.empty() || !event.edits.empty()) {
    events_.push_back(std::move(event));
  }
}

size_t NodeWriter::Come(const MomentReading& reading, Event& event) {
  const size_t number = readings_.size();
  event.come.push_back(number);
  Tracked& come = readings_.emplace_back();
  come.reading.question = reading.question;
  come.reading.answer.status = reading.answer.status;
  come.reading.answer.record = come.first = reading.answer.record;
  come.came = moments_;
  CompareLists(number, reading.answer.entries, event);
  return number;
}

void NodeWriter::Go(size_t number, Event& event) {
  readings_[number].went = moments_;
  event.gone.push_back(number);
}

// Notes how the answer to a question changed; false if it is of another kind now.
bool NodeWriter::Compare(size_t number, const Answer& answer, Event& event) {
  const Answer& before = readings_[number].reading.answer;
  if (before.status != answer.status || before.record.size() != answer.record.size()) return false;
  CompareRecords(readings_[number], answer.record);
  CompareLists(number, answer.entries, event);
  return true;
}

void NodeWriter::CompareRecords(Tracked& tracked, const Bytes& record) const {
  Bytes& before = tracked.reading.answer.record;
  if (before == record) return;
  const std::vector<RecordCell>& cells = node_->cells;
  for (uint32_t i = 0; i < cells.size(); ++i) {
    const uint64_t delta = chunk::BitsOf(cells[i], record) - chunk::BitsOf(cells[i], before);
    if (delta == 0) continue;
    tracked.changes.push_back(
        {i, static_cast<uint32_t>(moments_), chunk::SignedOf(delta, cells[i])});
  }
  before = record;
}

void NodeWriter::CompareLists(size_t number, const std::vector<OwnKey>& entries, Event& event) {
  std::vector<OwnKey>& before = readings_[number].reading.answer.entries;
  if (before == entries) return;
  ByteWriter edit;
  PutEdit(before, entries, edit);
  event.edits.push_back({number, edit.All()});
  before = entries;
}

std::vector<Bytes> NodeWriter::PiecesFrom(size_t from) const {
  std::array<ByteWriter, chunk::kStreams> streams;
  size_t next = from;
  for (const Event& event : events_) {
    if (event.moment < from) continue;
    streams[chunk::kEvents].Unsigned(event.moment - next);
    next = event.moment + 1;
    PutEvent(event, streams[chunk::kEvents]);
  }
  const Columns columns(*this, from, streams);
  ByteWriter sizes;
  for (const ByteWriter& stream : streams) sizes.Unsigned(stream.All().size());
  if (std::ranges::all_of(streams, [](const ByteWriter& each) { return each.All().empty(); })) {
    return {};
  }
  std::vector<Bytes> pieces = {sizes.All()};
  for (const ByteWriter& stream : streams) pieces.push_back(stream.All());
  return pieces;
}

void NodeWriter::PutEvent(const Event& event, ByteWriter& out) const {
  PutNumbers(event.gone, out);
  out.Unsigned(event.come.size());
  int64_t number = 0;
  for (const size_t each : event.come) {
    const MomentReading& reading = readings_[each].reading;
    for (const OwnKey& key : reading.question.keys) PutEntry(key, number, out);
    out.Unsigned(reading.answer.status);
  }
  out.Unsigned(event.edits.size());
  for (const Edit& edit : event.edits) {
    out.Unsigned(edit.reading);
    out.Raw(edit.edit);
  }
}

}  // namespace ksi
