#include "tools/ksicache/join_inputs.h"

#include <algorithm>
#include <utility>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/times.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/moment_work.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/recorder.h"

namespace ksicache {
namespace {

// What goes wrong with a file is said with its name.
template <class Action>
auto Named(const std::string& name, Action&& action) {
  try {
    return action();
  } catch (const DataError& error) {
    throw Error(name + ": " + error.what());
  }
}

// Captures, in the order of their times.
class Captures : public MomentSequence {
 public:
  void Add(const std::string& name) {
    const int64_t taken = Named(name, [&] { return TakenOf(OpenedFile(name).File()); });
    Capture& capture = all_.emplace_back();
    capture.stamp.taken = taken;
    capture.name = name;
  }

  void Sort() {
    std::ranges::stable_sort(all_, {}, [](const Capture& each) { return each.stamp.taken; });
  }

  const Stamp* Next() override { return next_ == all_.size() ? nullptr : &all_[next_].stamp; }

  std::optional<ksi::Moment> Take() override {
    const std::string& name = all_[next_++].name;
    return Named(name, [&] { return MomentOf(OpenedFile(name).File()); });
  }

  const std::string& Name() const override { return all_[next_ - 1].name; }

  std::vector<std::string> Boots() override { return {}; }

 private:
  struct Capture {
    Stamp stamp;
    std::string name;
  };
  std::vector<Capture> all_;
  size_t next_ = 0;
};

class Recording : public MomentSequence {
 public:
  Recording(std::string name, bool& isDamaged)
      : name_(std::move(name)),
        file_(Named(name_, [&] { return OpenRecording(name_); })),
        parts_(file_->Parts()),
        work_(*file_, Recorder::kPartMoments),
        isDamaged_(isDamaged) {}

  size_t Count() const {
    size_t count = 0;
    for (const Part& part : parts_) count += static_cast<size_t>(part.moments);
    return count;
  }

  const Stamp* Next() override {
    while (place_ == facts_.size()) {
      if (part_ == parts_.size()) return nullptr;
      Open();
    }
    stamp_ = {facts_[place_].taken, facts_[place_].uptime, host_.boot};
    return &stamp_;
  }

  std::optional<ksi::Moment> Take() override {
    ksi::Moment moment;
    const int64_t number = parts_[part_ - 1].number + static_cast<int64_t>(place_);
    const int64_t before = std::exchange(at_, number);
    if (work_.IsTooMuch()) {
      LeaveOut(MomentWork::kTooMuch, stamp_.taken, number, parts_.size());
      return std::nullopt;
    }
    if (file_->ReadWhole(number, reader_, moment, before) != ksi::kOk) {
      LeaveOutChunk(part_ - 1, stamp_.taken, number);
      return std::nullopt;
    }
    ++place_;
    work_.Add(moment);
    return moment;
  }

  const std::string& Name() const override { return name_; }

  std::vector<std::string> Boots() override {
    std::vector<std::string> boots;
    int64_t chunk = -1;
    for (const Part& part : parts_) {
      if (part.chunk == std::exchange(chunk, part.chunk)) continue;
      // What is damaged is said when its turn comes.
      ksi::HostIdentity host;
      if (file_->ReadHost(part, host) != ksi::kOk || host.boot.empty()) continue;
      if (std::ranges::find(boots, host.boot) == boots.end()) boots.push_back(host.boot);
    }
    return boots;
  }

 private:
  using Part = ksi::RecordingFile::Part;

  // Goes on to the next part, or past what cannot be read.
  void Open() {
    const size_t place = part_++;
    const Part& part = parts_[place];
    facts_.clear();
    place_ = 0;
    const bool isKnown = part.chunk == std::exchange(chunk_, part.chunk);
    if ((!isKnown && file_->ReadHost(part, host_) != ksi::kOk) ||
        file_->ReadFacts(part, facts_) != ksi::kOk) {
      LeaveOutChunk(place, part.first, part.number);
    }
  }

  // Of a chunk nothing behind what is damaged can be read.
  void LeaveOutChunk(size_t place, int64_t taken, int64_t number) {
    const int64_t chunk = parts_[place].chunk;
    while (place < parts_.size() && parts_[place].chunk == chunk) ++place;
    LeaveOut(file_->Why(), taken, number, place);
  }

  // Says that moments from one on are left out, up to a part.
  void LeaveOut(const std::string& why, int64_t taken, int64_t number, size_t end) {
    const int64_t count = parts_[end - 1].End() - number;
    PrintError(name_ + "@" + ksi::TextOfTime(taken) + ": damaged: " + why + ": " +
               std::to_string(count) + (count == 1 ? " moment left out" : " moments left out"));
    isDamaged_ = true;
    part_ = end;
    facts_.clear();
    place_ = 0;
  }

  std::string name_;
  std::unique_ptr<ksi::RecordingFile> file_;
  const std::vector<Part>& parts_;
  MomentWork work_;
  bool& isDamaged_;
  size_t part_ = 0;  // the one after that which is open
  int64_t chunk_ = -1;
  ksi::HostIdentity host_;
  std::vector<ksi::MomentFacts> facts_;  // of the part that is open
  size_t place_ = 0;
  Stamp stamp_;
  ksi::ChunkReader reader_;
  int64_t at_ = ksi::RecordingFile::kNoMoment;  // the moment that it has
};

bool IsBefore(const Stamp& a, const Stamp& b) {
  const bool isOneBoot = !a.boot.empty() && a.boot == b.boot && a.uptime != 0 && b.uptime != 0;
  return isOneBoot ? a.uptime < b.uptime : a.taken < b.taken;
}

}  // namespace

JoinInputs::JoinInputs(const std::vector<std::string>& names) {
  auto captures = std::make_unique<Captures>();
  for (const std::string& name : names) {
    if (IsRecording(name)) {
      auto recording = std::make_unique<Recording>(name, isDamaged_);
      count_ += recording->Count();
      sequences_.push_back(std::move(recording));
    } else {
      captures->Add(name);
      ++count_;
    }
  }
  captures->Sort();
  sequences_.push_back(std::move(captures));
  for (const auto& sequence : sequences_) {
    std::map<std::string, size_t> order;
    for (const std::string& boot : sequence->Boots()) order.emplace(boot, order.size());
    if (order.size() > 1) bootOrders_.push_back(std::move(order));
  }
}

// Whether a moment of an earlier boot is still to come.
bool JoinInputs::IsHeldBack(const Stamp& stamp) {
  if (stamp.boot.empty()) return false;
  for (const auto& sequence : sequences_) {
    const Stamp* other = sequence->Next();
    if (other == nullptr || other->boot == stamp.boot) continue;
    for (const auto& order : bootOrders_) {
      const auto earlier = order.find(other->boot);
      const auto later = order.find(stamp.boot);
      if (earlier == order.end() || later == order.end()) continue;
      if (earlier->second < later->second) return true;
    }
  }
  return false;
}

// Whose moment is the next one; null after the last.
MomentSequence* JoinInputs::Choose() {
  MomentSequence* first = nullptr;
  MomentSequence* firstFree = nullptr;
  const auto isFirst = [](MomentSequence* before, const Stamp& stamp) {
    return before == nullptr || IsBefore(stamp, *before->Next());
  };
  for (const auto& sequence : sequences_) {
    const Stamp* stamp = sequence->Next();
    if (stamp == nullptr) continue;
    // What several files have is taken from all of them before any of them goes on.
    if (last_ == *stamp) return sequence.get();
    if (isFirst(first, *stamp)) first = sequence.get();
    if (!IsHeldBack(*stamp) && isFirst(firstFree, *stamp)) firstFree = sequence.get();
  }
  // Files may contradict each other.
  return firstFree == nullptr ? first : firstFree;
}

std::optional<ksi::Moment> JoinInputs::Take() {
  while (MomentSequence* sequence = Choose()) {
    last_ = *sequence->Next();
    std::optional<ksi::Moment> moment = sequence->Take();
    if (!moment) continue;
    if (host_.empty()) host_ = moment->host.name;
    if (moment->host.name != host_) {
      throw Error(sequence->Name() + ": is of the host " + moment->host.name + ", not of " + host_);
    }
    ksi::SortReadings(moment->readings);
    return moment;
  }
  return std::nullopt;
}

}  // namespace ksicache
