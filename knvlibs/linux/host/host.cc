#include "knvlibs/linux/host/host.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <iterator>
#include <system_error>

#include <knvlibs/ksi.h>
#include "knvlibs/linux/host/text.h"
#include "knvlibs/linux/reading.h"

namespace ksi {
namespace {

// No file that is read whole is anywhere near this large.
constexpr size_t kLargestFile = size_t{64} << 20;

class Directory {
 public:
  explicit Directory(FileDescriptor fd) : stream_(fd.IsOpen() ? fdopendir(fd.Get()) : nullptr) {
    if (stream_ != nullptr) fd.Release();
  }
  Directory(const Directory&) = delete;
  Directory& operator=(const Directory&) = delete;
  ~Directory() {
    if (stream_ != nullptr) closedir(stream_);
  }
  DIR* get() const { return stream_; }

 private:
  DIR* stream_;
};

// DT_DIR, DT_LNK and the like; not every file system tells at once.
unsigned char TypeOf(DIR* stream, const dirent& entry) {
  if (entry.d_type != DT_UNKNOWN) return entry.d_type;
  struct stat status = {};
  if (fstatat(dirfd(stream), entry.d_name, &status, AT_SYMLINK_NOFOLLOW) != 0) return DT_UNKNOWN;
  return static_cast<unsigned char>(IFTODT(status.st_mode));
}

}  // namespace

LinuxHost::LinuxHost(std::string_view root, Clock clock)
    : root_(root),
      clock_(clock),
      pageKB_(static_cast<uint64_t>(sysconf(_SC_PAGESIZE)) / 1024),
      reading_(std::make_unique<Reading>()) {}

LinuxHost::~LinuxHost() = default;

Status LinuxHost::Open(std::string_view file, FileDescriptor& fd) const {
  // Without O_NONBLOCK a FIFO in a recorded tree would hold the program up.
  fd = root_.Open(file, O_RDONLY | O_NONBLOCK);
  return fd.IsOpen() ? kOk : Failed(file, errno);
}

Status LinuxHost::Read(std::string_view file, std::string& content) const {
  return Read(file, Made::kPieceByPiece, content);
}

Status LinuxHost::ReadPiece(std::string_view file, std::string& content) const {
  return Read(file, Made::kInOnePiece, content);
}

Status LinuxHost::Read(std::string_view file, Made made, std::string& content) const {
  FileDescriptor fd;
  const Status status = Open(file, fd);
  if (status != kOk) return status;

  // Kernel files have no size to ask for: a piece ends where a read leaves room, the file where a
  // read comes back empty.
  std::array<char, 16384> part;
  content.clear();
  for (;;) {
    const ssize_t count = read(fd.Get(), part.data(), part.size());
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return Failed(file, errno);
    const auto length = static_cast<size_t>(count);
    if (content.size() + length >= kLargestFile) {
      TellOnce(file, EFBIG);
      return KSI_STATUS_READ_ERROR;
    }
    content.append(part.data(), length);
    if (length == 0 || (made == Made::kInOnePiece && length < part.size())) return kOk;
  }
}

Status LinuxHost::ReadNumber(std::string_view file, uint64_t& number) const {
  std::string content;
  const Status status = ReadPiece(file, content);
  if (status != kOk) return status;
  Lines lines(content);
  std::string_view line;
  if (!lines.Next(line) || !ParseNumber(line, number) || lines.Next(line)) {
    Lose(KSI_STATUS_INVALID_METADATA);
    return NotUnderstood(file, 1);
  }
  return kOk;
}

Status LinuxHost::ReadNumberIfAny(std::string_view file, Figure& figure) const {
  uint64_t number = 0;
  const Status status = ReadNumber(file, number);
  figure = status == kOk ? Figure(number) : std::nullopt;
  return status == KSI_STATUS_NOT_FOUND ? kOk : status;
}

Status LinuxHost::ReadLink(std::string_view link, std::string& target) const {
  const FileDescriptor fd = root_.Open(link, O_PATH | O_NOFOLLOW);
  if (!fd.IsOpen()) return Failed(link, errno);
  std::array<char, 4096> text;
  const ssize_t length = readlinkat(fd.Get(), "", text.data(), text.size());
  if (length < 0) return Failed(link, errno);
  target.assign(text.data(), static_cast<size_t>(length));
  return kOk;
}

Status LinuxHost::List(std::string_view directory, std::vector<Entry>& entries) const {
  const Directory stream(root_.Open(directory, O_RDONLY | O_DIRECTORY));
  if (stream.get() == nullptr) return Failed(directory, errno);

  entries.clear();
  for (;;) {
    errno = 0;
    const dirent* entry = readdir(stream.get());
    if (entry == nullptr) return errno == 0 ? kOk : Failed(directory, errno);
    const std::string_view name = entry->d_name;
    if (name == "." || name == "..") continue;
    const unsigned char type = TypeOf(stream.get(), *entry);
    entries.push_back({std::string(name), entry->d_ino, type == DT_DIR, type == DT_LNK});
  }
}

Status LinuxHost::List(std::string_view directory, Entries wanted,
                       std::vector<std::string>& names) const {
  std::vector<Entry> entries;
  const Status status = List(directory, entries);
  if (status != kOk) return status;

  names.clear();
  for (Entry& entry : entries) {
    if (entry.name.starts_with('.')) continue;
    if (wanted == Entries::kDirectories && !entry.isDirectory) {
      TellIfLeadsOut(directory, entry);
      continue;
    }
    names.push_back(std::move(entry.name));
  }
  return kOk;
}

bool LinuxHost::First(std::string_view what) const { return reading_->told.emplace(what).second; }

Status LinuxHost::Failed(std::string_view file, int error) const {
  const Status status = StatusOfErrno(error);
  if (status == KSI_STATUS_PERMISSION_DENIED) {
    // A reader may have another file to turn to, or tell what goes without.
    if (reading_->denied.empty()) reading_->denied = file;
  } else if (status == KSI_STATUS_NOT_FOUND) {
    TellIfLeadsOut(file);
  } else if (error != EOPNOTSUPP) {
    // A cgroup of threads, which has no processes of its own to list, says so by EOPNOTSUPP.
    TellOnce(file, error);
  }
  return status;
}

void LinuxHost::TellIfLeadsOut(std::string_view file) const {
  if (!root_.LeadsOut(file)) return;
  Lose(KSI_STATUS_NOT_FOUND);
  if (!First("leads out")) return;
  Warning("%s: leads out of the recorded tree: what cannot be read is left out or has no value\n",
          Printable(file).c_str());
}

void LinuxHost::TellIfLeadsOut(std::string_view directory, const Entry& entry) const {
  if (entry.isLink && !IsThisMachine()) TellIfLeadsOut(std::string(directory) + '/' + entry.name);
}

void LinuxHost::BeginQuestion() { reading_->denied.clear(); }

void LinuxHost::TellDenied() const {
  if (First("denied")) Warning("%s: permission denied\n", Printable(reading_->denied).c_str());
}

void LinuxHost::Lose(Status why) const {
  if (loss_ == kOk) loss_ = why;
}

void LinuxHost::TellShortage(std::string_view what, int error) const {
  constexpr int kShortages[] = {EMFILE, ENFILE, ENOMEM, ENOBUFS, EIO};
  if (std::ranges::find(kShortages, error) != std::end(kShortages)) TellOnce(what, error);
}

void LinuxHost::TellOnce(std::string_view file, int error) const {
  Lose(StatusOfErrno(error));
  const std::string reason = std::generic_category().message(error);
  if (!First(reason)) return;
  Warning("%s: %s: what cannot be read is left out or has no value\n", Printable(file).c_str(),
          reason.c_str());
}

void LinuxHost::BeginReading() { reading_ = std::make_unique<Reading>(); }

Status LinuxHost::NotUnderstoodOnce(std::string_view kind, std::string_view file,
                                    size_t line) const {
  Lose(KSI_STATUS_INVALID_METADATA);
  return First(kind) ? NotUnderstood(file, line) : KSI_STATUS_INVALID_METADATA;
}

Status NotUnderstood(std::string_view file, size_t line) {
  Warning("%s: line %zu is not understood\n", Printable(file).c_str(), line);
  return KSI_STATUS_INVALID_METADATA;
}

Status NameNotUnderstood(std::string_view directory, std::string_view name) {
  Warning("%s: the name %s is not understood\n", Printable(directory).c_str(),
          Printable(name).c_str());
  return KSI_STATUS_INVALID_METADATA;
}

}  // namespace ksi
