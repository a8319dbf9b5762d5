// A file that is not there until it is whole.
#ifndef TOOLS_KSICACHE_NEW_FILE_H_
#define TOOLS_KSICACHE_NEW_FILE_H_

#include <sys/types.h>

#include <cstddef>
#include <span>
#include <string>

#include "tools/ksicache/command.h"

namespace ksicache {

// A file descriptor, closed with its owner; negative: none.
class Descriptor {
 public:
  explicit Descriptor(int fd = -1) : fd_(fd) {}
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;
  ~Descriptor();

  void Reset(int fd);
  int Get() const { return fd_; }
  explicit operator bool() const { return fd_ >= 0; }

 private:
  int fd_;
};

class NewFile {
 public:
  // Captures hold the names and figures of everybody on a host.
  static constexpr mode_t kMode = 0600;

  // `target` "-" is standard output. Fails with an Error if no file could come to stand there: its
  // directory cannot be written to, or something stands there and may not be replaced; and if
  // standard output is a terminal.
  NewFile(std::string target, bool replace, mode_t mode);

  // Fails with an Error if the file would stand in the place of this one, which is read.
  void RefuseInput(const std::string& fileName) const;

  // What to call it in a message.
  const std::string& Name() const { return name_; }

  // Writes the file, brings it to the disk and gives it its name. Fails with an Error; what stood
  // there stands there still, unless it says that the file is whole.
  void Commit(std::span<const std::byte> content);

  // The same of a file that is too large for the memory: adds to what is not there yet, and makes a
  // file of all that was added. REQUIRES: something was, be it nothing.
  void Write(std::span<const std::byte> content);
  void CommitWritten();

 private:
  void OpenListing();
  void CheckTarget() const;
  void RequireNotRecorded() const;
  void OpenUnnamed();
  void OpenElsewhere();
  void WriteTo(int fd, std::span<const std::byte> content) const;
  void Settle(int fd) const;
  bool LinkUnnamed(const std::string& entry) const;
  bool CommitUnnamed() const;
  void CommitNamed(std::span<const std::byte> content) const;
  void Rename(const std::string& entry, int fd) const;
  void SyncDirectory() const;

  std::string name_;
  bool replace_;
  mode_t mode_;
  bool standardOutput_;
  Descriptor directory_;
  Descriptor listing_;        // of the same, to bring it to the disk; none where it may not be read
  std::string entry_;         // the target's name in its directory
  Descriptor unnamed_;        // none where the file system has no such files
  bool isElsewhere_ = false;  // it is on another one, and gets no name
};

// The option of commands that make a file, and what it asks for. Fails with a UsageError.
inline constexpr Option kMode = {"mode", "MODE", "give FILE these rights instead of 0600"};
mode_t ModeOf(const CommandLine& line);

// Standard output is neither replaced nor given rights: fails with a UsageError if that is asked.
void CheckOptionsFor(const std::string& target, const CommandLine& line);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_NEW_FILE_H_
