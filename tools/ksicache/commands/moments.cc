// moments: when a recording's moments were taken, how large they are, and what is missing.
#include <algorithm>
#include <cstdio>
#include <functional>
#include <optional>
#include <string>
#include <utility>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/times.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/moment_summary.h"
#include "tools/ksicache/moment_walk.h"
#include "tools/ksicache/named_span.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/quantity.h"
#include "tools/ksicache/reading_walk.h"

namespace ksicache {
namespace {

constexpr Option kRemarks = {"remarks", nullptr, "list only moments with something to remark"};
constexpr Option kSummary = {"summary", nullptr, "sum the moments up instead"};
constexpr const Option* kOptions[] = {&kRemarks, &kSummary};

using Part = ksi::RecordingFile::Part;

// The moments that a name means: all of a recording, those of a span, or one.
class Chosen {
 public:
  explicit Chosen(const std::string& name) {
    if (const std::optional<NamedSpan> span = SpanOf(name)) {
      recording_ = OpenRecording(span->fileName);
      span_ = MomentsOf(*span, *recording_);
    } else if (IsRecording(name)) {
      recording_ = OpenRecording(name);
    } else {
      NamedMoment moment = OpenNamed(name);
      recording_ = std::move(moment.recording);
      number_ = moment.number;
    }
  }

  ksi::RecordingFile& Recording() const { return *recording_; }

  bool Has(const WalkedMoment& moment) const {
    return (!span_ || span_->Has(moment.number, moment.facts.taken)) &&
           (!number_ || moment.number == *number_);
  }

  bool HasSome(const Part& part) const {
    return (!span_ || span_->HasSome(part)) &&
           (!number_ || (part.number <= *number_ && *number_ < part.End()));
  }

  // Whether a part has some of them, or is beside one that has: what is to be said of a moment is
  // told by those around it.
  bool Needs(const Part& part) const {
    const auto& parts = recording_->Parts();
    const auto place = static_cast<size_t>(&part - parts.data());
    const size_t end = std::min(place + 2, parts.size());
    return std::any_of(parts.begin() + static_cast<ptrdiff_t>(place == 0 ? 0 : place - 1),
                       parts.begin() + static_cast<ptrdiff_t>(end),
                       [this](const Part& each) { return HasSome(each); });
  }

  bool IsSpan() const { return span_.has_value(); }

 private:
  std::unique_ptr<ksi::RecordingFile> recording_;
  std::optional<MomentSpan> span_;
  std::optional<int64_t> number_;
};

// What there is to remark on a moment, or nothing.
std::string RemarksOn(const WalkedMoment& moment) {
  const ksi::MomentFacts& facts = moment.facts;
  std::string remarks;
  const auto add = [&remarks](bool is, const std::string& remark) {
    if (is) remarks += (remarks.empty() ? "" : ", ") + remark;
  };
  add(moment.isOtherHost, "of the host " + Cut(moment.host));
  add(moment.isRebooted, "rebooted");
  add(moment.isAfterGap, "gap " + TextOfDuration(moment.passed));
  add(moment.step > 0, "clock +" + TextOfDuration(moment.step));
  add(moment.step < 0, "clock -" + TextOfDuration(-moment.step));
  add(facts.skipped != 0, std::to_string(facts.skipped) + " skipped");
  add(facts.refused != 0, std::to_string(facts.refused) + " refused");
  add(facts.failed != 0, std::to_string(facts.failed) + " failed");
  add(facts.loss != ksi::kOk, "left out: " + StatusText(facts.loss));
  return remarks;
}

// What was not recorded, as of captures that were joined, has no figure.
std::string Milliseconds(uint64_t us) {
  char text[64];
  const int size = std::snprintf(text, sizeof text, "%.1f", static_cast<double>(us) / 1000);
  return us == 0 ? "-" : std::string(text, static_cast<size_t>(size));
}

void PrintMoment(const WalkedMoment& moment, const std::string& remarks) {
  char text[192];
  const int size = std::snprintf(text, sizeof text, "%-20s %8.0f %8s %7s",
                                 ksi::TextOfTime(moment.facts.taken).c_str(), moment.bytes,
                                 Milliseconds(moment.facts.duration).c_str(),
                                 Milliseconds(moment.facts.cpu).c_str());
  PrintLine(std::string(text, static_cast<size_t>(size)) + (remarks.empty() ? "" : "  " + remarks));
}

// Visits those that were chosen. False if some of them are damaged, which is said.
bool Walk(const std::string& name, const Chosen& chosen,
          const std::function<void(const WalkedMoment&)>& visit) {
  bool isGood = true;
  bool isFound = false;
  MomentWalk walk(
      chosen.Recording(),
      [&](const WalkedMoment& moment) {
        if (!chosen.Has(moment)) return;
        isFound = true;
        visit(moment);
      },
      [&](const LostMoments& all) {
        const auto isChosen = [&](const Part& part) { return chosen.HasSome(part); };
        const LostMoments lost = all.Only(isChosen);
        if (lost.IsEmpty()) return;
        PrintError(name + ": damaged: " + lost.Text());
        isGood = false;
      });
  walk.Run([&chosen](const Part& part) { return chosen.Needs(part); });
  if (!isFound && isGood && chosen.IsSpan()) {
    throw DataError(NoneInSpan(chosen.Recording().Times()));
  }
  return isGood;
}

bool List(const std::string& name, bool onlyRemarks) {
  const Chosen chosen(name);
  PrintLine("taken                   bytes  took ms  cpu ms  remarks");
  return Walk(name, chosen, [onlyRemarks](const WalkedMoment& moment) {
    const std::string remarks = RemarksOn(moment);
    if (!onlyRemarks || !remarks.empty()) PrintMoment(moment, remarks);
  });
}

bool SumUp(const std::string& name) {
  const Chosen chosen(name);
  MomentSummary summary;
  const bool isGood =
      Walk(name, chosen, [&summary](const WalkedMoment& moment) { summary.Add(moment); });
  if (!isGood) summary.Damage();
  PrintLine("file       " + name);
  summary.Print();
  return isGood;
}

int Moments(const CommandLine& line) {
  if (line.Has(kRemarks) && line.Has(kSummary)) {
    throw UsageError("--remarks is of a list, and --summary is none");
  }
  const bool isSummary = line.Has(kSummary);
  bool first = true;
  return ForEachFile(line.arguments, [&](const std::string& name) {
    if (!std::exchange(first, false)) PrintLine("");
    if (isSummary) return SumUp(name);
    if (line.arguments.size() > 1) PrintLine(name + ":");
    return List(name, line.Has(kRemarks));
  });
}

}  // namespace

const Command kMoments = {
    .name = "moments",
    .arguments = "FILE[@WHEN|@FROM..TO]...",
    .summary = "list the moments of a recording",
    .help = R"(Lists the moments of each FILE, or those that are asked for: when each was
taken, in UTC; how many bytes it takes of the file; how long it took to read the
host and how much CPU; and what there is to remark: reboots, clocks that were
set, times without a recorder, moments that were skipped, and what could not be
read.
)",
    .options = kOptions,
    .fewest = 1,
    .most = Command::kAnyNumber,
    .run = Moments,
};

}  // namespace ksicache
