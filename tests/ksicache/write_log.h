// What the code under test writes with pwrite(2), and when it has it brought to the disk, in its
// order: from that follows how a file can look when a process or a machine ends, and to whoever
// copies it. The linker leads those calls here (--wrap).
#ifndef TESTS_KSICACHE_WRITE_LOG_H_
#define TESTS_KSICACHE_WRITE_LOG_H_

#include <sys/types.h>

#include <cstddef>
#include <string>
#include <vector>

namespace ksi {

class WriteLog {
 public:
  // One of the two; a sync has no bytes.
  struct Write {
    off_t offset = 0;
    std::string bytes;

    bool IsSync() const { return bytes.empty(); }
  };

  // Writes down all from now on. There is one at a time.
  WriteLog();
  ~WriteLog();
  WriteLog(const WriteLog&) = delete;
  WriteLog& operator=(const WriteLog&) = delete;

  const std::vector<Write>& All() const { return writes_; }
  size_t Count() const { return writes_.size(); }
  void Add(Write write) { writes_.push_back(std::move(write)); }

 private:
  std::vector<Write> writes_;
};

// Makes a write to what a file holds.
void Apply(const WriteLog::Write& write, std::string& content);

// A file in memory that such writes are made to.
class Image {
 public:
  explicit Image(const std::string& content);
  ~Image();
  Image(const Image&) = delete;
  Image& operator=(const Image&) = delete;

  void Apply(const WriteLog::Write& write) const;

  // To open it by.
  std::string Name() const { return "/proc/self/fd/" + std::to_string(descriptor_); }

 private:
  int descriptor_;
};

}  // namespace ksi

#endif  // TESTS_KSICACHE_WRITE_LOG_H_
