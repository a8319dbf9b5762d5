#include "knvlibs/recording/moment_source.h"

#include <algorithm>
#include <utility>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_status.h>
#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

constexpr Key kAbsent{KeyKind::kText, 0, {}};

// A host on which nothing happens takes a hundred bytes a moment, and all reports on it ask some
// ten thousand times.
uint64_t MostAnswers(uint64_t fileSize) { return (uint64_t{1} << 17) + 160 * fileSize; }

}  // namespace

MomentSource::MomentSource(std::string fileName, std::unique_ptr<RecordingFile> recording,
                           int64_t number, ChunkReader moment)
    : fileName_(std::move(fileName)),
      recording_(std::move(recording)),
      number_(number),
      moment_(std::move(moment)),
      walk_(moment_.Size()),
      places_(moment_.Host().nodes) {}

Status MomentSource::Damaged(const Node& node) {
  if (!std::exchange(told_, true)) {
    Warning("%s: %.*s: is damaged\n", Printable(fileName_).c_str(),
            static_cast<int>(node.path.size()), node.path.data());
  }
  return KSI_STATUS_METADATA_READ_ERROR;
}

// The reading of a node's value or list; one that failed fails again.
Status MomentSource::Find(const Node& node, Kind kind, const Keys& keys, NodeReader::View& view) {
  ++answers_;
  const size_t place = places_.Of(node, kind);
  if (place == NodePlaces::kNowhere) return KSI_STATUS_NOT_FOUND;
  const NodeReader* readings = nullptr;
  if (moment_.ReadNode(place, &readings) != kOk) return Damaged(node);
  NodeReader::KeyPair wanted = {kAbsent, kAbsent};
  std::copy_n(keys.at, keys.count, wanted.begin());
  return readings->Find(wanted, view) ? view.status : Status{KSI_STATUS_NOT_FOUND};
}

Status MomentSource::NextMoment() {
  if (isExhausted_) return KSI_STATUS_NOT_FOUND;
  if (answers_ > MostAnswers(recording_->Size())) {
    isExhausted_ = true;
    Warning("%s: damaged: its moments hold more than a file of its size does\n",
            Printable(fileName_).c_str());
    return KSI_STATUS_METADATA_READ_ERROR;
  }
  const Status status = recording_->ReadNext(number_, moment_);
  if (status != kOk && status != KSI_STATUS_NOT_FOUND) {
    Warning("%s: %s\n", Printable(fileName_).c_str(), Printable(recording_->Why()).c_str());
  }
  if (status != kOk) return status;
  places_ = NodePlaces(moment_.Host().nodes);
  walk_ = ListWalk(moment_.Size());
  return kOk;
}

Status MomentSource::Value(const Node& node, const Keys& keys, Buffer record) {
  NodeReader::View view = {};
  const Status status = Find(node, Kind::kValue, keys, view);
  if (status != kOk) return status;
  if (view.record.size() != record.size()) return KSI_STATUS_LENGTH_MISMATCH;
  std::ranges::copy(view.record, record.begin());
  return kOk;
}

Status MomentSource::Instances(const Node& node, const Keys& keys, ParamList& instances) {
  NodeReader::View view = {};
  Status status = walk_.Begin(node, keys);
  if (status == kOk) status = Find(node, Kind::kList, keys, view);
  if (status != kOk) return status;
  answers_ += view.entries.size();
  const size_t before = instances.Count();
  for (const Key& entry : view.entries) {
    if (entry.kind != KindOf(node.entries)) return Damaged(node);
    status = entry.kind == KeyKind::kNumber
                 ? instances.AddNumber(static_cast<uint64_t>(entry.number))
                 : instances.AddText(entry.text);
    if (status != kOk) return status;
  }
  walk_.End(node, instances, before);
  return kOk;
}

}  // namespace ksi
