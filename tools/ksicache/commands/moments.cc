// moments: when a recording's moments were taken, how large they are, and what is missing.
#include <cinttypes>
#include <cstdio>
#include <string>
#include <vector>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/times.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/progress.h"
#include "tools/ksicache/reading_walk.h"

namespace ksicache {
namespace {

// "1d 02:03:04" or "02:03:04"
std::string SpanText(int64_t time) {
  const int64_t days = time / ksi::kDay;
  char text[64];
  const int size =
      std::snprintf(text, sizeof text, "%02" PRId64 ":%02" PRId64 ":%02" PRId64,
                    time / ksi::kHour % 24, time / ksi::kMinute % 60, time / ksi::kSecond % 60);
  const std::string clock(text, static_cast<size_t>(size));
  return days == 0 ? clock : std::to_string(days) + "d " + clock;
}

// One line a moment: when, its share of the part's bytes, how long and how much CPU it took, and
// what there is to remark.
class Lister {
 public:
  Lister(const std::string& fileName, ksi::RecordingFile& file)
      : fileName_(fileName), file_(file) {}

  // False if something is damaged, which is said.
  bool Run() {
    PrintLine("taken                     bytes   took ms    cpu ms  remarks");
    Progress progress("listing");
    bool isGood = true;
    const std::vector<ksi::RecordingFile::Part>& parts = file_.Parts();
    for (size_t i = 0; i < parts.size(); ++i) {
      progress.Show(i, parts.size());
      try {
        ListPart(parts[i]);
      } catch (const DataError& error) {
        PrintError(fileName_ + ": " + error.what());
        isGood = false;
      }
    }
    return isGood;
  }

 private:
  void ListPart(const ksi::RecordingFile::Part& part) {
    std::vector<ksi::MomentFacts> facts;
    if (file_.ReadFacts(part, facts) != ksi::kOk) throw DataError("damaged: " + file_.Why());
    std::string boot = boot_;
    if (part.number == part.chunk) {
      ksi::HostIdentity host;
      if (file_.ReadHost(part, host) != ksi::kOk) throw DataError("damaged: " + file_.Why());
      boot = host.boot;
    }
    for (const ksi::MomentFacts& each : facts) {
      const std::string remarks = RemarksOn(each, boot);
      char text[128];
      const int size = std::snprintf(text, sizeof text, "%-20s  %9" PRId64 " %9.1f %9.1f",
                                     ksi::TextOfTime(each.taken).c_str(), part.size / part.moments,
                                     static_cast<double>(each.duration) / 1000,
                                     static_cast<double>(each.cpu) / 1000);
      PrintLine(std::string(text, static_cast<size_t>(size)) +
                (remarks.empty() ? "" : "  " + remarks));
      last_ = each;
      boot_ = boot;
      isFirst_ = false;
    }
  }

  std::string RemarksOn(const ksi::MomentFacts& facts, const std::string& boot) const {
    std::string remarks;
    const auto add = [&remarks](const std::string& remark) {
      remarks += (remarks.empty() ? "" : ", ") + remark;
    };
    if (!isFirst_) {
      if (boot != boot_) {
        add("rebooted");
      } else if (last_.uptime != 0 && facts.uptime != 0) {
        // How far the clock on the wall went beyond the other.
        const int64_t step = (facts.taken - last_.taken) - (facts.uptime - last_.uptime);
        if (step > ksi::kSecond) add("clock put forward by " + SpanText(step));
        if (step < -ksi::kSecond) add("clock set back by " + SpanText(-step));
      }
    }
    if (facts.skipped != 0) add(std::to_string(facts.skipped) + " skipped before");
    if (facts.refused != 0) add(std::to_string(facts.refused) + " refused");
    if (facts.failed != 0) add(std::to_string(facts.failed) + " failed");
    if (facts.loss != ksi::kOk) add("left out: " + StatusText(facts.loss));
    return remarks;
  }

  const std::string& fileName_;
  ksi::RecordingFile& file_;
  bool isFirst_ = true;
  ksi::MomentFacts last_;
  std::string boot_;
};

int Moments(const CommandLine& line) {
  return ForEachFile(line.arguments, [](const std::string& fileName) {
    return Lister(fileName, *OpenRecording(fileName)).Run();
  });
}

}  // namespace

const Command kMoments = {
    .name = "moments",
    .arguments = "FILE...",
    .summary = "list the moments of a recording",
    .help = R"(Lists the moments of each FILE: when each was taken, in UTC, how many bytes it
takes in the file, how long it took to read it and how much CPU, and what there is
to remark: reboots, clocks that were set, moments that were skipped, and what
could not be read.
)",
    .options = {},
    .fewest = 1,
    .most = Command::kAnyNumber,
    .run = Moments,
};

}  // namespace ksicache
