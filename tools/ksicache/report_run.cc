#include "tools/ksicache/report_run.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <ctime>
#include <memory>
#include <optional>
#include <utility>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_status.h>
#include "framework/loss.h"
#include "knvlibs/cache_format.h"
#include "knvlibs/recording/recording_file.h"
#include "knvlibs/recording/when.h"
#include "knvlibs/times.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/host_files.h"
#include "tools/ksicache/missing_moments.h"
#include "tools/ksicache/named_span.h"
#include "tools/ksicache/opened_file.h"

// A host's own library has none.
#pragma weak KSI_RefreshSource
#pragma weak KSI_SourceNextMoment
#pragma weak KSI_SourceOrigin
#pragma weak KSI_SourceWalkStatus

namespace ksicache {
namespace {

// Reports are made of the records of one version.
void CheckDefinitions() {
  std::array<char, KSI_BUILD_DATE_SIZE> built = {};
  const char* ownBuilt = "";
  if (KSI_CheckSig(built.data(), built.size(), &ownBuilt) == ksi::kOk) return;
  built.back() = '\0';
  throw DataError(std::string("made with definitions built on ") + built.data() + ", not " +
                  ownBuilt);
}

Origin OriginOf(const std::string& host, int64_t taken) {
  return {host, ksi::TextOfTime(taken), taken};
}

// That of the file which the library answers from.
Origin CurrentOrigin() {
  std::array<char, ksi::cache::kLongestText + 1> host = {};
  int64_t taken = 0;
  const ksi::Status status = KSI_SourceOrigin(nullptr, &taken, host.data(), host.size());
  if (status != ksi::kOk) throw DataError("cannot be read: " + StatusText(status));
  return OriginOf(host.data(), taken);
}

// The moments of a recording, by the library, which goes on from one to the next.
class SpanVisit {
 public:
  explicit SpanVisit(NamedSpan named) : named_(std::move(named)) {
    if (&KSI_SourceNextMoment == nullptr) {
      throw DataError("this host's library does not read recordings");
    }
    // A recorder may remove meanwhile what was found.
    int tries = 3;
    do {
      Load();
      Open();
    } while (!IsAtNumber() && --tries != 0);
  }

  void Run(const std::function<void(const Origin&)>& visit) {
    for (ksi::Status status = ksi::kOk; status != KSI_STATUS_NOT_FOUND; status = Next()) {
      status == ksi::kOk ? Visit(visit) : Miss(number_, number_ + 1);
    }
    Miss(number_, End());
    if (!missing_.IsEmpty()) throw DataError(missing_.Text());
    if (!wrong_.empty()) throw DataError(wrong_);
    if (!isFound_) throw DataError(NoneInSpan(recording_->Times()));
  }

 private:
  using Part = ksi::RecordingFile::Part;

  // After damage moments are read again from the next chunk on; of what is nothing but damage not
  // all has to be tried.
  static constexpr size_t kMostChunks = 100;

  void Load() {
    recording_ = OpenRecording(named_.fileName);
    wanted_ = MomentsOf(named_, *recording_);
    missing_ = {};
    const std::vector<Part>& parts = recording_->Parts();
    isInOrder_ = true;
    for (size_t i = 1; i < parts.size(); ++i) {
      isInOrder_ = isInOrder_ && parts[i - 1].last < parts[i].first;
    }
  }

  // Goes to the first moment that may be wanted, or behind what of them is damaged.
  void Open() {
    number_ = ksi::RecordingFile::kNoMoment;
    ksi::Status status = UseFirst();
    size_t tried = 0;
    for (const Part& part : recording_->Parts()) {
      if (status != KSI_STATUS_METADATA_READ_ERROR || tried == kMostChunks) break;
      if (part.number != part.chunk || part.number <= number_ || !wanted_.HasSome(part)) continue;
      status = Use(part.first, part.number);
      ++tried;
    }
    const Part* part = recording_->FindPart(number_);
    Miss(0, status == ksi::kOk && part != nullptr ? part->number : End());
    if (status == ksi::kOk) return;
    throw DataError(missing_.IsEmpty() ? "cannot be read: " + StatusText(status) : missing_.Text());
  }

  // Where the clock was set back, times lie in several places, and so all moments are looked at.
  // What is damaged beside those that are wanted is left alone.
  ksi::Status UseFirst() {
    if (!isInOrder_) return UseName("first", recording_->Parts().front().number);
    const int64_t before = wanted_.times.first - ksi::kSecond;
    int64_t first = ksi::RecordingFile::kNoMoment;
    const ksi::Status status = recording_->FindMoment(before, first);
    if (status != ksi::kOk) return status;
    first = recording_->NumberAfter(first);
    if (first == ksi::RecordingFile::kNoMoment) throw DataError(NoneInSpan(recording_->Times()));
    first = std::max(first, wanted_.numbers.first);
    const Part* part = recording_->FindPart(first);
    if (part == nullptr) throw DataError(NoneInSpan(recording_->Times()));
    const ksi::Status used = Use(std::max(part->first, before), first);
    // Of several in a second that was the last.
    return number_ <= first ? used : Use(part->first - ksi::kSecond, first);
  }

  // `number_` is then that of the moment; `expected` where what would tell that is damaged.
  ksi::Status Use(int64_t time, int64_t expected) {
    int64_t number = 0;
    if (recording_->FindMoment(time, number) != ksi::kOk) number = expected;
    const int64_t first = recording_->Parts().front().number;
    if (number <= first) return UseName("first", first);
    return UseName(ksi::TextOfTime(time), number);
  }

  ksi::Status UseName(const std::string& when, int64_t number) {
    number_ = number;
    return KSI_UseCache((named_.fileName + "@" + when).c_str(), 0);
  }

  // Whether the library has the moment of that number.
  bool IsAtNumber() const {
    const Part* part = recording_->FindPart(number_);
    const int64_t taken = CurrentOrigin().taken;
    return part != nullptr && part->first <= taken && taken <= part->last;
  }

  // As the library, but that no moment follows the last one that can be wanted.
  ksi::Status Next() {
    const int64_t next = recording_->NumberAfter(number_);
    const Part* part = recording_->FindPart(next);
    number_ = part == nullptr || IsBehind(next, part->first) ? End() : next;
    return number_ == End() ? ksi::Status{KSI_STATUS_NOT_FOUND} : KSI_SourceNextMoment(nullptr);
  }

  bool IsBehind(int64_t number, int64_t taken) const {
    return number > wanted_.numbers.last || (isInOrder_ && taken > wanted_.times.last);
  }

  // Behind the number of the last moment.
  int64_t End() const { return recording_->Parts().back().End(); }

  // Nobody can have the moments of parts that have numbers from one up to another.
  void Miss(int64_t from, int64_t to) {
    for (const Part& part : recording_->Parts()) {
      if (from < part.End() && part.number < to && wanted_.HasSome(part)) missing_.Add(part);
    }
  }

  void Visit(const std::function<void(const Origin&)>& visit) {
    const Origin origin = CurrentOrigin();
    if (IsBehind(number_, origin.taken)) number_ = End();
    if (!wanted_.Has(number_, origin.taken)) return;
    isFound_ = true;
    try {
      CheckDefinitions();
      visit(origin);
    } catch (const DataError& error) {
      wrong_ = error.what();
    }
  }

  NamedSpan named_;
  std::unique_ptr<ksi::RecordingFile> recording_;
  MomentSpan wanted_ = {};
  MissingMoments missing_;
  int64_t number_ = 0;  // of the moment that the library has
  bool isInOrder_ = true;
  bool isFound_ = false;
  std::string wrong_;
};

}  // namespace

Origin LiveOrigin() {
  CheckDefinitions();
  bool isRead = false;
  return OriginOf(HostName(nullptr, isRead), ksi::ReadClock(CLOCK_REALTIME));
}

void ForEachMoment(const std::string& name, const std::function<void(const Origin&)>& visit) {
  if (const std::optional<NamedSpan> span = SpanOf(name)) return SpanVisit(*span).Run(visit);
  // The library says what is wrong with a file in a status, and so it is looked into first.
  const MomentHead head = HeadOf(name);
  const ksi::Status status = KSI_UseCache(name.c_str(), 0);
  if (status != ksi::kOk) throw DataError("cannot be read: " + StatusText(status));
  CheckDefinitions();
  visit(OriginOf(head.host, head.taken));
}

bool GoesDownGroups(const tally::Report& report) {
  return report.frame->Takes('g') && report.frame->Takes('l');
}

void RunReport(const tally::Report& report, tally::Sink& sink,
               const tally::ReportOptions& selection) {
  tally::ReportOptions options = {.levels = report.frame->defaultLevels};
  if (report.frame->Takes('g')) options.startGid = selection.startGid;
  if (GoesDownGroups(report)) options.levels = selection.levels;
  if (report.frame->Takes('i')) options.inclusionText = selection.inclusionText;
  if (report.frame->Takes('e')) options.exclusionText = selection.exclusionText;
  const std::string name = report.name;
  static_cast<void>(tally::TakeLoss());
  const ksi::Status status = report.run(options, sink);
  const ksi::Status loss = tally::TakeLoss();
  if (status != ksi::kOk) throw DataError(name + ": " + StatusText(status));
  const ksi::Status walk =
      &KSI_SourceWalkStatus == nullptr ? ksi::kOk : KSI_SourceWalkStatus(nullptr);
  if (walk != ksi::kOk) {
    KSI_RefreshSource(nullptr);  // the next walk begins anew
    throw DataError(name + ": groups contain each other, rows are missing: " + StatusText(walk));
  }
  if (loss != ksi::kOk) throw DataError(name + ": rows are missing: " + StatusText(loss));
}

}  // namespace ksicache
