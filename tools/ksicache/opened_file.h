// Cache files as commands are given them: captures, and moments of recordings, "FILE@WHEN".
#ifndef TOOLS_KSICACHE_OPENED_FILE_H_
#define TOOLS_KSICACHE_OPENED_FILE_H_

#include <cstdint>
#include <memory>
#include <optional>
#include <string>

#include "knvlibs/cache_file.h"
#include "knvlibs/recording/moment.h"
#include "knvlibs/recording/recording_file.h"

namespace ksicache {

// Every call fails with a DataError that says what is wrong with the file. But for HeadOf, each
// says by an error that the last moments are damaged, and which one is taken for them.

// A capture, or a moment as the capture that it would be.
class OpenedFile {
 public:
  explicit OpenedFile(const std::string& name);
  // The same of a moment that has been read; the name is for messages.
  OpenedFile(const std::string& name, const ksi::Moment& moment);

  const ksi::CacheFile& File() const { return *file_; }

  // Whether it is a recording's moment.
  bool IsMoment() const { return !content_.empty(); }

  // Whether the name has a WHEN, and the time that this is, us since 1970; "first" and "last" are
  // none.
  bool HasWhen() const { return hasWhen_; }
  const std::optional<int64_t>& Asked() const { return asked_; }

 private:
  void Open(const std::string& name, const ksi::Moment& moment);

  ksi::Bytes content_;  // of the moment as a capture
  std::unique_ptr<ksi::CacheFile> file_;
  bool hasWhen_ = false;
  std::optional<int64_t> asked_;
};

// The file of a name that may ask for some of its moments, "FILE@...".
std::string FileNameOf(const std::string& name);

// Whether a recording has this name, and no moment is asked for.
bool IsRecording(const std::string& name);

// A whole recording.
std::unique_ptr<ksi::RecordingFile> OpenRecording(const std::string& fileName);

// A recording, and the number of the moment that "FILE@WHEN" means.
struct NamedMoment {
  std::unique_ptr<ksi::RecordingFile> recording;
  int64_t number;
};
NamedMoment OpenNamed(const std::string& name);

// Whose moment a name stands for, and when it was taken, us since 1970. Of a recording's moment
// also its number, in the order in which they were recorded; the boot that it is of; and how long
// the host had run then, in us. These two are empty and 0 if it does not tell.
struct MomentHead {
  std::string host;
  int64_t taken;
  std::optional<int64_t> number = std::nullopt;
  std::string boot = {};
  int64_t uptime = 0;
};
MomentHead HeadOf(const std::string& name);

// One moment of a recording.
ksi::Moment ReadMoment(const std::string& name);

// When a capture was taken, us since 1970.
int64_t TakenOf(const ksi::CacheFile& capture);

// A capture as a moment.
ksi::Moment MomentOf(const ksi::CacheFile& capture);

// What a capture of that moment says of itself.
ksi::CacheFile::Capture CaptureOf(const ksi::Moment& moment);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_OPENED_FILE_H_
