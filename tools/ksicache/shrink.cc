#include "tools/ksicache/shrink.h"

#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <limits>
#include <memory>
#include <vector>

#include <knvlibs/ksi_status.h>
#include "knvlibs/cache_format.h"
#include "knvlibs/recording/recording_file.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/recording_store.h"

namespace ksicache {
namespace {

using Part = ksi::RecordingFile::Part;

// The blocks that those parts take which may be kept, as room for them is made at once.
size_t BlocksOf(const std::vector<Part>& parts) {
  size_t blocks = 0;
  for (const Part& part : parts) blocks += ksi::cache::BlocksOf(static_cast<size_t>(part.size));
  return blocks;
}

std::string HostOf(ksi::RecordingFile& recording) {
  ksi::HostIdentity host;
  const std::vector<Part>& parts = recording.Parts();
  const bool isRead = !parts.empty() && recording.ReadHost(parts.back(), host) == ksi::kOk;
  return isRead ? host.name : "unknown";
}

// A file that goes with its owner, unless it has been given another name.
class Beside {
 public:
  explicit Beside(const std::string& fileName) : name_(fileName + ".smaller") {
    static_cast<void>(unlink(name_.c_str()));
  }
  Beside(const Beside&) = delete;
  Beside& operator=(const Beside&) = delete;
  ~Beside() { static_cast<void>(unlink(name_.c_str())); }

  const std::string& Name() const { return name_; }

 private:
  std::string name_;
};

// Copies the parts, of which the oldest make room for the others. Gives how many are damaged.
size_t Copy(ksi::RecordingFile& from, RecordingStore& to) {
  size_t damaged = 0;
  ksi::Bytes content;
  to.Reserve(BlocksOf(from.Parts()));
  for (const Part& part : from.Parts()) {
    content.clear();
    if (from.ReadPart(part, content) == ksi::kOk) {
      to.Replace(part, content);
    } else {
      ++damaged;
    }
  }
  to.Sync();
  return damaged;
}

}  // namespace

std::string Shrink(const std::string& fileName, int64_t maxSize) {
  // It stays locked until the other one has its name.
  const RecordingStore store(fileName, std::numeric_limits<int64_t>::max());
  const std::unique_ptr<ksi::RecordingFile> recording = store.Read();
  struct stat info = {};
  if (stat(fileName.c_str(), &info) != 0) throw SystemError(fileName, errno);
  const Beside beside(fileName);
  NewFile(beside.Name(), false, info.st_mode & 0777)
      .Commit(RecordingStore::Empty(HostOf(*recording)));
  RecordingStore smaller(beside.Name(), maxSize);
  const size_t damaged = Copy(*recording, smaller);
  if (rename(beside.Name().c_str(), fileName.c_str()) != 0) throw SystemError(fileName, errno);
  const RecordingStore::Gone gone = smaller.TakeGone();
  return fileName + ": made smaller, of " + std::to_string(store.Size()) + " bytes " +
         std::to_string(smaller.Size()) + "; removed " + std::to_string(gone.moments) + " moments" +
         (damaged == 0 ? "" : " and " + std::to_string(damaged) + " damaged parts");
}

}  // namespace ksicache
