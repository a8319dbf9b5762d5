#include "tools/ksicache/report_run.h"

#include <array>
#include <cstdint>
#include <ctime>
#include <memory>
#include <optional>
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
  explicit SpanVisit(const NamedSpan& named) : fileName_(named.fileName) {
    if (&KSI_SourceNextMoment == nullptr) {
      throw DataError("this host's library does not read recordings");
    }
    const std::unique_ptr<ksi::RecordingFile> recording = OpenRecording(fileName_);
    wanted_ = TimesOf(named, *recording);
    all_ = recording->Times();
    const auto& parts = recording->Parts();
    for (size_t i = 1; i < parts.size(); ++i) {
      isInOrder_ = isInOrder_ && parts[i - 1].last < parts[i].first;
      if (parts[i].chunk == parts[i].number) chunks_.push_back(parts[i].first);
    }
  }

  void Run(const std::function<void(const Origin&)>& visit) {
    Open();
    ksi::Status status = ksi::kOk;
    for (; status != KSI_STATUS_NOT_FOUND; status = KSI_SourceNextMoment(nullptr)) {
      if (status != ksi::kOk) {
        MissMoments(status);
      } else if (!Visit(visit)) {
        break;
      }
    }
    if (!wrong_.empty()) throw DataError(wrong_);
    if (!isFound_) throw DataError(NoneInSpan(all_));
  }

 private:
  // After damage moments are read again from the next chunk on; of what is nothing but damage not
  // all has to be tried.
  static constexpr size_t kMostChunks = 100;

  // Goes to the first moment that may be wanted: from the last one of the second before on. Where
  // the clock was set back, times lie in several places.
  void Open() {
    const int64_t before = wanted_.first - ksi::kSecond;
    const bool isAfterFirst = isInOrder_ && before > all_.first;
    ksi::Status status = Use(isAfterFirst ? ksi::TextOfTime(before) : "first");
    size_t tried = 0;
    for (const int64_t start : chunks_) {
      if (status != KSI_STATUS_METADATA_READ_ERROR || tried == kMostChunks) break;
      if (isAfterFirst && start < before) continue;
      MissMoments(status);
      status = Use(ksi::TextOfTime(start));
      ++tried;
    }
    if (status != ksi::kOk) throw DataError("cannot be read: " + StatusText(status));
  }

  ksi::Status Use(const std::string& when) const {
    return KSI_UseCache((fileName_ + "@" + when).c_str(), 0);
  }

  void MissMoments(ksi::Status status) { wrong_ = "moments are missing: " + StatusText(status); }

  // False if no other moment can be wanted.
  bool Visit(const std::function<void(const Origin&)>& visit) {
    const Origin origin = CurrentOrigin();
    if (origin.taken > wanted_.last) return !isInOrder_;
    if (origin.taken < wanted_.first) return true;
    isFound_ = true;
    try {
      CheckDefinitions();
      visit(origin);
    } catch (const DataError& error) {
      wrong_ = error.what();
    }
    return true;
  }

  std::string fileName_;
  ksi::Span all_ = {};
  ksi::Span wanted_ = {};
  bool isInOrder_ = true;
  std::vector<int64_t> chunks_;  // when the first moment of each but the first chunk was taken
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
