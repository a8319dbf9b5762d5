// check: says all that is wrong with a cache file, and where.
#include <algorithm>
#include <cstdint>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "knvlibs/cache_format.h"
#include "knvlibs/node_table.h"
#include "knvlibs/times.h"
#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/group_tree.h"
#include "tools/ksicache/lost_moments.h"
#include "tools/ksicache/moment_work.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/progress.h"
#include "tools/ksicache/reading_walk.h"
#include "tools/ksicache/recording_structure.h"

namespace ksicache {
namespace {

class Checker {
 public:
  Checker(const std::string& fileName, const ksi::CacheFile& file)
      : fileName_(fileName), file_(file), instances_(file) {}

  size_t Run() {
    CheckIntegrity();
    // In a file whose structure is broken the rest may be read twice or never end.
    if (problems_ != 0) return problems_;
    CheckCapture();
    CheckNodes();
    ForEachReading(file_, [&](const Reading& reading) { CheckReading(reading); });
    CheckGroupTree();
    CheckStrayInstances();
    return problems_;
  }

 private:
  void Report(const std::string& what) {
    PrintLine(fileName_ + ": " + what);
    ++problems_;
  }
  void Report(const Reading& reading, const std::string& what) {
    Report(reading.Name() + ": " + what);
  }

  void ReportFailure() {
    RequireMemory(file_);
    Report(file_.ErrorText());
  }

  void CheckIntegrity() {
    ksi::Statement rows;
    int code = rows.Prepare(file_.Handle(), "PRAGMA integrity_check(20)");
    while (code == SQLITE_OK || code == SQLITE_ROW) {
      code = rows.Step();
      if (code == SQLITE_ROW && rows.Text(0) != "ok") Report(std::string(rows.Text(0)));
    }
    if (code != SQLITE_DONE) ReportFailure();
  }

  void CheckCapture() {
    const std::string& taken = file_.GetCapture().taken;
    if (!ksi::TimeOfText(taken)) Report("taken " + taken + " is no date and time");
    const std::string& signature = file_.GetCapture().signature;
    if (signature != ksi::kDefinitions.signature) {
      Report("signature " + signature + " is not " + std::string(ksi::kDefinitions.signature) +
             " of this version");
    }
  }

  void CheckNodes() {
    std::set<std::pair<const ksi::Node*, ksi::Kind>> seen;
    for (const ksi::CacheFile::NodeRow& row : file_.NodeRows()) {
      if (row.node == nullptr) {
        Report("there is no node " + row.path);
      } else if (!seen.emplace(row.node, row.kind).second) {
        Report("node " + row.path + " is there twice");
      }
    }
  }

  void CheckReading(const Reading& reading) {
    if (reading.row == nullptr) return Report(reading, "is not in the table of nodes");
    if (reading.row->node == nullptr) return;  // reported with its node
    if (!reading.goodKeys) return Report(reading, "has keys that the node does not take");
    if (reading.status < 0 || reading.status > int64_t{0xffffffff}) {
      return Report(reading, "has no good status");
    }
    if (reading.status != ksi::kOk) {
      if (reading.type != SQLITE_NULL) Report(reading, "failed and has an answer");
    } else if (reading.row->kind == ksi::Kind::kValue) {
      CheckValue(reading);
    } else {
      CheckList(reading);
    }
  }

  void CheckValue(const Reading& reading) {
    const size_t size = reading.row->node->recordSize;
    if (reading.type != SQLITE_BLOB) {
      Report(reading, "has no record");
    } else if (reading.value.size() != size) {
      Report(reading, "has " + std::to_string(reading.value.size()) + " bytes, its record " +
                          std::to_string(size));
    }
  }

  void CheckList(const Reading& reading) {
    if (reading.type != SQLITE_INTEGER || reading.count < 0) {
      return Report(reading, "has no number of instances");
    }
    uint64_t count = 0;
    entries_.clear();
    instances_.ForEach(reading, [&](int64_t position, const ksi::Statement& row) {
      if (position < 0 || static_cast<uint64_t>(position) != count) {
        Report(reading, "has entry " + std::to_string(position) + " where entry " +
                            std::to_string(count) + " has to be");
      }
      // A count of what is there, so that one gap is said once.
      count = static_cast<uint64_t>(position) + 1;
      CheckEntry(reading, position, row);
    });
    if (count != static_cast<uint64_t>(reading.count)) {
      Report(reading,
             "has " + std::to_string(count) + " entries and says " + std::to_string(reading.count));
    }
  }

  void CheckEntry(const Reading& reading, int64_t position, const ksi::Statement& row) {
    const ksi::Node& node = *reading.row->node;
    const std::string entry = "entry " + std::to_string(position);
    if (ksi::KindOf(node.entries) == ksi::KeyKind::kNumber) {
      if (row.Type(1) != SQLITE_INTEGER) return Report(reading, entry + " is no number");
      if (ksi::IdOf(node) == ksi::node::sched_groups_members_groups) {
        CheckGroup(reading, row.Number(1));
      } else {
        CheckIsNew(reading, position, std::to_string(row.Number(1)));
      }
      if (ksi::IdOf(node) == ksi::node::sched_groups_members_memClients) {
        CheckClient(reading, row.Number(1));
      }
    } else if (row.Type(1) != SQLITE_TEXT) {
      Report(reading, entry + " is no text");
    } else if (row.Text(1).find('\0') != std::string_view::npos) {
      Report(reading, entry + " holds a NUL");
    } else if (row.Text(1).size() > ksi::cache::kLongestText) {
      Report(reading,
             entry + " is longer than " + std::to_string(ksi::cache::kLongestText) + " bytes");
    } else {
      CheckIsNew(reading, position, std::string(row.Text(1)));
    }
  }

  void CheckIsNew(const Reading& reading, int64_t position, std::string text) {
    const auto [first, isNew] = entries_.emplace(std::move(text), position);
    if (isNew) return;
    Report(reading, "entry " + std::to_string(position) + " is the same as entry " +
                        std::to_string(first->second));
  }

  void CheckGroup(const Reading& reading, int64_t group) {
    const std::optional<int64_t> other = groups_.Add(reading.keys[0].number, group);
    if (!other) return;
    Report(reading, "has group " + std::to_string(group) + ", which group " +
                        std::to_string(*other) + " has already");
  }

  // One that stands twice in the same list is none of its concern.
  void CheckClient(const Reading& reading, int64_t client) {
    const int64_t group = reading.keys[0].number;
    const int64_t owner = groupOfClient_.emplace(client, group).first->second;
    if (owner == group) return;
    Report(reading, "has client " + std::to_string(client) + ", which group " +
                        std::to_string(owner) + " has already");
  }

  void CheckGroupTree() {
    for (const int64_t group : groups_.Circles()) {
      Report("group " + std::to_string(group) + " stands below itself");
    }
  }

  // Entries of a list that no reading tells of.
  void CheckStrayInstances() {
    ksi::Statement rows;
    int code = rows.Prepare(file_.Handle(),
                            "SELECT count(*) FROM instance AS i WHERE NOT EXISTS(SELECT 1 FROM "
                            "reading AS r WHERE r.key1 = i.key1 AND r.key2 = i.key2 AND "
                            "r.node = i.node AND r.status = 0 AND typeof(r.answer) = "
                            "'integer')");
    if (code == SQLITE_OK) code = rows.Step();
    if (code != SQLITE_ROW) return ReportFailure();
    if (rows.Number(0) != 0) {
      Report(std::to_string(rows.Number(0)) + " entries belong to no list");
    }
  }

  const std::string& fileName_;
  const ksi::CacheFile& file_;
  InstanceWalk instances_;
  GroupTree groups_;
  std::unordered_map<int64_t, int64_t> groupOfClient_;
  std::unordered_map<std::string, int64_t> entries_;  // of a list, and where each stands first
  size_t problems_ = 0;
};

// Whether a part has left the file meanwhile, to make room for others.
bool HasLeft(const std::string& fileName, const ksi::RecordingFile::Part& part) {
  const std::unique_ptr<ksi::RecordingFile> now = OpenRecording(fileName);
  return std::ranges::none_of(now->Parts(), [&part](const ksi::RecordingFile::Part& each) {
    return each.number == part.number && each.first == part.first && each.block == part.block;
  });
}

// All parts of a recording, and of each its last moment as a capture.
class RecordingChecker {
 public:
  explicit RecordingChecker(const std::string& fileName)
      : fileName_(fileName), recording_(OpenRecording(fileName)), work_(*recording_, 1) {}

  bool Run() {
    for (const std::string& line : WrongStructure(fileName_)) Report(fileName_, line);
    for (const std::string& line : WrongRows(*recording_)) Report(fileName_, line);
    const std::vector<Part>& parts = recording_->Parts();
    Progress progress("checking");
    for (size_t i = 0; i < parts.size() && !work_.IsTooMuch(); ++i) {
      progress.Show(i, parts.size());
      CheckPart(parts[i]);
    }
    TellLost();
    if (work_.IsTooMuch()) Report(fileName_, std::string("damaged: ") + MomentWork::kTooMuch);
    return problems_ == 0;
  }

 private:
  using Part = ksi::RecordingFile::Part;

  void Report(const std::string& name, const std::string& what) {
    PrintLine(name + ": " + what);
    ++problems_;
  }

  std::string NameOf(const Part& part) const {
    return fileName_ + "@" + ksi::TextOfTime(part.last);
  }

  void CheckPart(const Part& part) {
    if (lost_.Take(part)) return;
    TellLost();
    ksi::Moment moment;
    const int64_t before = std::exchange(at_, part.End() - 1);
    if (recording_->CheckPart(part, reader_, before) == ksi::kOk &&
        recording_->ReadAll(at_, reader_, moment) == ksi::kOk) {
      return CheckMoment(NameOf(part), moment);
    }
    const std::string why = recording_->Why();
    if (!HasLeft(fileName_, part)) lost_.Begin(part, why);
  }

  void CheckMoment(const std::string& name, const ksi::Moment& moment) {
    work_.Add(moment);
    try {
      const OpenedFile opened(name, moment);
      problems_ += Checker(name, opened.File()).Run();
    } catch (const DataError& error) {
      Report(name, error.what());
    }
  }

  void TellLost() {
    if (lost_.IsEmpty()) return;
    Report(NameOf(lost_.First()), "damaged: " + lost_.Text());
    lost_ = {};
  }

  const std::string& fileName_;
  std::unique_ptr<ksi::RecordingFile> recording_;
  MomentWork work_;
  ksi::ChunkReader reader_;
  int64_t at_ = ksi::RecordingFile::kNoMoment;
  LostMoments lost_;
  size_t problems_ = 0;
};

int Check(const CommandLine& line) {
  return ForEachFile(line.arguments, [](const std::string& fileName) {
    if (IsRecording(fileName)) return RecordingChecker(fileName).Run();
    const OpenedFile opened(fileName);
    return Checker(fileName, opened.File()).Run() == 0;
  });
}

}  // namespace

const Command kCheck = {
    .name = "check",
    .arguments = "FILE...",
    .summary = "say what is wrong with each FILE",
    .help = R"(Says all that is wrong with each FILE: its integrity as a database, nodes that
this version does not know, records of the wrong size, lists with gaps or that
name something twice, groups that stand in two places or below themselves,
clients of two groups, a time that there is not, and a signature that is not
that of this version. Says nothing of a file that is whole.
)",
    .options = {},
    .fewest = 1,
    .most = Command::kAnyNumber,
    .run = Check,
};

}  // namespace ksicache
