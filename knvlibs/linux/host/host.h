// A Linux host: its kernel's files, below a root directory.
#ifndef KNVLIBS_LINUX_HOST_HOST_H_
#define KNVLIBS_LINUX_HOST_HOST_H_

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "knvlibs/linux/host/figure.h"
#include "knvlibs/linux/host/host_root.h"
#include "knvlibs/status.h"

namespace ksi {

struct Reading;

// A read that fails is a status. Why it failed is told once in a reading, unless what was to be
// read is gone. That it may not be read is told if the answer fails for it (TellDenied).
class LinuxHost {
 public:
  using TimePoint = std::chrono::steady_clock::time_point;
  using Clock = TimePoint (*)();

  // `root` is "/" for the machine itself, or the directory of a recorded tree. `clock` tells the
  // time that bounds are measured with.
  explicit LinuxHost(std::string_view root, Clock clock = std::chrono::steady_clock::now);
  ~LinuxHost();

  // Opens a file for what is asked of it piece by piece.
  [[nodiscard]] Status Open(std::string_view file, FileDescriptor& fd) const;

  // The whole of a file, named from the root ("/proc/buddyinfo").
  [[nodiscard]] Status Read(std::string_view file, std::string& content) const;

  // The same of a file that the kernel makes in one piece ("/proc/PID/status", "memory.stat", all
  // files of one value), by a single read: its end need not be read for.
  [[nodiscard]] Status ReadPiece(std::string_view file, std::string& content) const;

  // A file that is one number.
  [[nodiscard]] Status ReadNumber(std::string_view file, uint64_t& number) const;

  // The same of a file that not every kernel or device has: none where it does not.
  [[nodiscard]] Status ReadNumberIfAny(std::string_view file, Figure& figure) const;

  // The names of what lies in a directory, but for those that start with '.', in no order. Links
  // are no directories.
  enum class Entries : uint8_t { kAll, kDirectories };
  [[nodiscard]] Status List(std::string_view directory, Entries wanted,
                            std::vector<std::string>& names) const;

  // All that lies in a directory but for itself and the one above, in no order.
  struct Entry {
    std::string name;
    uint64_t inode = 0;
    bool isDirectory = false;
    bool isLink = false;
  };
  [[nodiscard]] Status List(std::string_view directory, std::vector<Entry>& entries) const;

  // Tells, once in a reading, of an entry that would be more than a name if it were no link that
  // leads out of a recorded tree.
  void TellIfLeadsOut(std::string_view directory, const Entry& entry) const;

  // Where a link of the kernel's files leads: "socket:[4711]".
  [[nodiscard]] Status ReadLink(std::string_view link, std::string& target) const;

  // The status for an errno of a file or directory, which is told: what is opened here and read
  // elsewhere fails like all else.
  [[nodiscard]] Status Failed(std::string_view file, int error) const;

  // Whether it is the first time in this reading that `what` is asked for: what is wrong with many
  // files alike is told once.
  bool First(std::string_view what) const;

  // Tells, once in a reading, which file may not be read: the first that the question met.
  void TellDenied() const;

  // Tells, once in a reading, that the system was short of something by this errno. Any other says
  // how it stands with `what`, and is not told.
  void TellShortage(std::string_view what, int error) const;

  // Notes why something is left out of an answer; the first reason stays.
  void Lose(Status why) const;
  [[nodiscard]] Status LossStatus() const { return loss_; }

  // NotUnderstood, told once in a reading for all files of a kind.
  [[nodiscard]] Status NotUnderstoodOnce(std::string_view kind, std::string_view file,
                                         size_t line) const;

  // Whether this is the machine itself and not a recorded tree.
  bool IsThisMachine() const { return root_.IsThisMachine(); }

  // What has been read and need not be read again until the next reading begins, which forgets it.
  Reading& Kept() const { return *reading_; }
  void BeginReading();
  void BeginQuestion();

  // The size of a page in KB. Recorded trees are taken to come from a machine with pages of the
  // same size.
  uint64_t PageKB() const { return pageKB_; }

  TimePoint Now() const { return clock_(); }
  Clock TimeSource() const { return clock_; }

 private:
  enum class Made : uint8_t { kInOnePiece, kPieceByPiece };
  [[nodiscard]] Status Read(std::string_view file, Made made, std::string& content) const;

  void TellOnce(std::string_view file, int error) const;
  void TellIfLeadsOut(std::string_view file) const;

  HostRoot root_;
  Clock clock_;
  uint64_t pageKB_;
  std::unique_ptr<Reading> reading_;
  mutable Status loss_ = kOk;
};

// Warns that a line of a file (the first is 1) is not understood; returns the status for it.
[[nodiscard]] Status NotUnderstood(std::string_view file, size_t line);

// The same of what a directory has in it.
[[nodiscard]] Status NameNotUnderstood(std::string_view directory, std::string_view name);

}  // namespace ksi

#endif  // KNVLIBS_LINUX_HOST_HOST_H_
