#include "tools/ksicache/opened_file.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <new>
#include <optional>
#include <utility>

#include <knvlibs/ksi_status.h>
#include "knvlibs/open_cache.h"
#include "knvlibs/times.h"
#include "tools/ksicache/cache_writer.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/failures.h"
#include "tools/ksicache/moment_builder.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/reading_walk.h"

namespace ksicache {
namespace {

// A cache file is read here and there, which a pipe does not allow.
bool IsRegular(const std::string& fileName) {
  struct stat info = {};
  return stat(fileName.c_str(), &info) != 0 || S_ISREG(info.st_mode);
}

std::string MeaningOf(ksi::Status status, const std::string& fileName) {
  switch (status) {
    case KSI_STATUS_NOT_FOUND:
      return std::strerror(ENOENT);
    case KSI_STATUS_PERMISSION_DENIED:
      return std::strerror(EACCES);
    case KSI_STATUS_IS_A_DIRECTORY:
      return std::strerror(EISDIR);
    case KSI_STATUS_INVALID_METADATA:
      return IsRegular(fileName) ? "not a cache file" : "is not a regular file";
    case KSI_STATUS_MAJOR_VERSION_MISMATCH:
      return "made by a newer version";
    case KSI_STATUS_METADATA_READ_ERROR:
      return "damaged";
    default:
      return "cannot be read";
  }
}

[[noreturn]] void Throw(ksi::Status status, const std::string& name, const std::string& why) {
  if (status == KSI_STATUS_NO_MEMORY) throw std::bad_alloc();
  // A time that is not there needs no more words.
  const bool isTime =
      !why.empty() && (status == KSI_STATUS_NOT_FOUND || status == KSI_STATUS_BAD_PARAM);
  throw DataError(isTime ? why : MeaningOf(status, name) + (why.empty() ? "" : ": " + why));
}

ksi::OpenedCache OpenAny(const std::string& name, ksi::ChunkReader& moment) {
  ksi::OpenedCache opened;
  std::string why;
  const ksi::Status status = ksi::ReadCache(name, &opened, &moment, &why);
  if (status != ksi::kOk) Throw(status, name, why);
  return opened;
}

// The same; what is to be said of the moment is said.
ksi::OpenedCache OpenAloud(const std::string& name, ksi::ChunkReader& moment) {
  ksi::OpenedCache opened = OpenAny(name, moment);
  if (!opened.remark.empty()) PrintError(name + ": " + opened.remark);
  return opened;
}

ksi::Moment WholeOf(const ksi::OpenedCache& opened, ksi::ChunkReader& reader) {
  ksi::Moment moment;
  const int64_t taken = reader.Facts().taken;
  if (opened.recording->ReadAll(opened.number, reader, moment) == ksi::kOk) return moment;
  throw DataError("damaged: the moment of " + ksi::TextOfTime(taken) + ": " +
                  opened.recording->Why());
}

// The moment as a capture in memory.
ksi::Bytes ContentOf(const ksi::Moment& moment, const std::string& name) {
  CacheContent content(name);
  PutReadings(moment, content);
  const std::span<const std::byte> bytes = content.Finish(CaptureOf(moment));
  return {bytes.begin(), bytes.end()};
}

// Why a reading cannot be taken; null if it can.
const char* WrongWith(const Reading& reading) {
  if (reading.row == nullptr || reading.row->node == nullptr) return "is of no known node";
  if (!reading.goodKeys) return "has keys that the node does not take";
  if (reading.status < 0 || reading.status > int64_t{0xffffffff}) return "has no good status";
  if (reading.status != ksi::kOk) return nullptr;
  if (reading.row->kind == ksi::Kind::kList) {
    return reading.type == SQLITE_INTEGER ? nullptr : "has no number of instances";
  }
  return reading.value.size() == reading.row->node->recordSize ? nullptr
                                                               : "has no record of this version";
}

void AddList(const Reading& reading, InstanceWalk& instances, MomentBuilder& builder) {
  const ksi::KeyKind kind = ksi::KindOf(reading.row->node->entries);
  std::vector<ksi::OwnKey> own;
  instances.ForEach(reading, [&](int64_t position, const ksi::Statement& row) {
    const bool isNumber = kind == ksi::KeyKind::kNumber;
    if (position != static_cast<int64_t>(own.size()) ||
        row.Type(1) != (isNumber ? SQLITE_INTEGER : SQLITE_TEXT)) {
      throw DataError("damaged: " + reading.Name() + ": is a list with gaps");
    }
    if (isNumber) {
      own.emplace_back(row.Number(1));
    } else {
      own.emplace_back(std::string(row.Text(1)));
    }
  });
  if (static_cast<int64_t>(own.size()) != reading.count) {
    throw DataError("damaged: " + reading.Name() + ": is a list with gaps");
  }
  std::vector<ksi::Key> entries;
  entries.reserve(own.size());
  for (const ksi::OwnKey& entry : own) entries.push_back(ksi::ViewOf(entry));
  builder.AddList(*reading.row->node, reading.keys, entries);
}

void Count(ksi::Status status, ksi::MomentFacts& facts) {
  Failures failures;
  failures.Add(status, [] { return std::string(); });
  facts.refused += failures.refused.Count();
  facts.failed += failures.failed.Count();
}

}  // namespace

OpenedFile::OpenedFile(const std::string& name) {
  ksi::ChunkReader moment;
  ksi::OpenedCache opened = OpenAloud(name, moment);
  hasWhen_ = opened.hasWhen;
  asked_ = opened.asked;
  if (opened.recording == nullptr) {
    file_ = std::move(opened.capture);
  } else {
    Open(name, WholeOf(opened, moment));
  }
}

OpenedFile::OpenedFile(const std::string& name, const ksi::Moment& moment) { Open(name, moment); }

void OpenedFile::Open(const std::string& name, const ksi::Moment& moment) {
  std::string why;
  content_ = ContentOf(moment, name);
  auto database = std::make_unique<ksi::CacheDatabase>();
  ksi::Status status = database->OpenBytes(content_);
  if (status == ksi::kOk) status = ksi::CacheFile::Make(std::move(database), &file_, &why);
  if (status != ksi::kOk) Throw(status, name, why);
}

std::string FileNameOf(const std::string& name) {
  return access(name.c_str(), F_OK) == 0 ? name : name.substr(0, name.rfind('@'));
}

bool IsRecording(const std::string& name) {
  return ksi::CacheDatabase::VersionOf(name.c_str()) == ksi::cache::kRecordingVersion;
}

std::unique_ptr<ksi::RecordingFile> OpenRecording(const std::string& fileName) {
  auto database = std::make_unique<ksi::CacheDatabase>();
  std::unique_ptr<ksi::RecordingFile> recording;
  std::string why;
  ksi::Status status = database->Open(fileName.c_str());
  if (status != ksi::kOk) Throw(status, fileName, database->Why());
  if (database->Version() == ksi::cache::kSchemaVersion) throw DataError("is no recording");
  status = ksi::RecordingFile::Make(std::move(database), &recording, &why);
  if (status != ksi::kOk) Throw(status, fileName, why);
  return recording;
}

NamedMoment OpenNamed(const std::string& name) {
  ksi::ChunkReader moment;
  ksi::OpenedCache opened = OpenAloud(name, moment);
  if (opened.recording == nullptr) throw DataError("is no recording");
  return {std::move(opened.recording), opened.number};
}

MomentHead HeadOf(const std::string& name) {
  ksi::ChunkReader moment;
  const ksi::OpenedCache opened = OpenAny(name, moment);
  if (opened.recording == nullptr) {
    return {opened.capture->GetCapture().host, TakenOf(*opened.capture)};
  }
  return {moment.Host().name, moment.Facts().taken, opened.number, moment.Host().boot,
          moment.Facts().uptime};
}

ksi::Moment ReadMoment(const std::string& name) {
  ksi::ChunkReader moment;
  const ksi::OpenedCache opened = OpenAloud(name, moment);
  if (opened.recording == nullptr) throw DataError("is no recording");
  return WholeOf(opened, moment);
}

int64_t TakenOf(const ksi::CacheFile& capture) {
  const std::string& text = capture.GetCapture().taken;
  const std::optional<int64_t> taken = ksi::TimeOfText(text);
  if (!taken) throw DataError("damaged: taken " + text + " is no date and time");
  return *taken;
}

ksi::Moment MomentOf(const ksi::CacheFile& capture) {
  const ksi::CacheFile::Capture& head = capture.GetCapture();
  ksi::Moment moment;
  moment.host = {head.signature, head.built, head.host, "", ksi::RecordedNodes()};
  moment.facts.taken = TakenOf(capture);
  MomentBuilder builder;
  InstanceWalk instances(capture);
  ForEachReading(capture, [&](const Reading& reading) {
    if (const char* wrong = WrongWith(reading)) {
      throw DataError("damaged: " + reading.Name() + ": " + wrong);
    }
    const ksi::Node& node = *reading.row->node;
    if (reading.status != ksi::kOk) {
      const auto status = static_cast<ksi::Status>(reading.status);
      Count(status, moment.facts);
      builder.AddFailure(node, reading.row->kind, reading.keys, status);
    } else if (reading.row->kind == ksi::Kind::kValue) {
      builder.AddValue(node, reading.keys, reading.value);
    } else {
      AddList(reading, instances, builder);
    }
  });
  moment.readings = builder.Take();
  return moment;
}

ksi::CacheFile::Capture CaptureOf(const ksi::Moment& moment) {
  return {moment.host.signature, moment.host.built, moment.host.name,
          ksi::TextOfTime(moment.facts.taken)};
}

}  // namespace ksicache
