// The rows of a recording that is being written.
#ifndef TOOLS_KSICACHE_RECORDING_STORE_H_
#define TOOLS_KSICACHE_RECORDING_STORE_H_

#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <deque>
#include <memory>
#include <stdexcept>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

#include "knvlibs/recording/recording_file.h"
#include "knvlibs/sqlite.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/page_file.h"

namespace ksicache {

// The file is not any more what was recorded into.
class FileLost : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// What was to be written does not fit beside what has to stay.
class NoRoom : public Error {
 public:
  using Error::Error;
};

// Every call may fail with an Error, those that write also with a FileLost. What it was to write is
// then not there, or whole, and all else is as it was.
class RecordingStore {
 public:
  using Part = ksi::RecordingFile::Part;

  // The smallest bound of a file's size that leaves room for moments.
  static constexpr int64_t kSmallestFile = int64_t{4} << 20;

  // By so many blocks a recording grows at least.
  static constexpr size_t kMoreBlocks = 16;

  // The content of an empty recording of `host`, with room in so many blocks.
  static ksi::Bytes Empty(const std::string& host, size_t blocks = kMoreBlocks);

  // Opens a recording to write it, alone: fails if somebody else does, with his process. Its file
  // grows to `maxSize` bytes and no further.
  RecordingStore(const std::string& fileName, int64_t maxSize);
  // The same of a file that is open already, which this closes.
  RecordingStore(std::string name, int file, int64_t maxSize);

  // The rows in use, by the number of their first moment.
  const std::vector<Part>& Parts() const { return parts_; }

  // Grows by no fewer blocks than these from now on.
  void GrowBy(size_t blocks) { moreBlocks_ = blocks; }

  // Adds a part; its id, size and block are chosen here. Old chunks make room, from the first on,
  // but not its own. Fails with a NoRoom if they do not make enough, and none leaves.
  void Add(Part part, ksi::ByteView content);

  // Adds it in the place of those that it holds the moments of. Those stay until the next Replace,
  // for whoever copies the file meanwhile.
  void Replace(Part part, ksi::ByteView content);

  // Removes the chunks before that of this number.
  void RemoveBefore(int64_t chunk);

  // The moments that have left since this was asked last: how many, and from when to when.
  struct Gone {
    int64_t moments = 0;
    int64_t first = 0;
    int64_t last = 0;
  };
  Gone TakeGone() { return std::exchange(gone_, {}); }

  // Makes room for so many blocks, as far as the file may grow.
  void Reserve(size_t count);

  // Brings all to the disk.
  void Sync();

  // Fails with a FileLost if the file is another one than its name means, or has been harmed.
  void RequireThere() const;

  // The file, to read what it holds; by what is open, for another file may have its name.
  std::unique_ptr<ksi::RecordingFile> Read() const;

  // Lets others know which process this is. They do not any more once this process has closed any
  // descriptor of the file, as whoever has read it has.
  void TellWhose();

  int64_t Size() const;

  // What it may grow to.
  int64_t MaxSize() const { return maxSize_; }

 private:
  void Lock();
  void TakeStock();
  void Connect();
  void RequireWhole() const;
  void Ready();
  void Execute(const char* sql);
  void Require(bool good);
  void Flush();
  [[noreturn]] void Fail(int error);

  void Put(Part part, ksi::ByteView content, bool replaces);
  bool HasOldChunk() const;
  void RemoveFirstChunk();
  void CountGone(int64_t chunk);
  void Remove(const std::vector<Part>& parts);
  void RequireRoom(size_t count, int64_t chunk) const;
  [[noreturn]] void ThrowNoRoom() const;
  size_t Room() const;
  size_t RoomOnDisk() const;
  void Grow(size_t count);
  void KeepSpare(size_t count);
  std::vector<int64_t> TakeBlocks(size_t count, int64_t chunk);
  int64_t TakeRow();
  void WriteBlocks(const std::vector<int64_t>& blocks, ksi::ByteView content);
  void WriteRow(const Part& part);

  std::string name_;
  int64_t maxSize_;
  size_t moreBlocks_ = kMoreBlocks;
  Descriptor file_;
  std::unique_ptr<PageFile> pages_;
  ksi::Database database_;  // none after a failure: what it knows is not what stands there
  std::vector<Part> parts_;
  std::vector<Part> replaced_;                                  // that stay until the next Replace
  std::unordered_map<int64_t, std::vector<int64_t>> blocksOf_;  // by the row of the part
  // What is free, the one that has been so for longest first.
  std::deque<int64_t> rows_;
  std::deque<int64_t> blocks_;
  // Blocks that were taken since moments were packed or a chunk began, and the most until then.
  size_t taken_ = 0;
  size_t mostTaken_ = 0;
  Gone gone_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_RECORDING_STORE_H_
