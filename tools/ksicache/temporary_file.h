// A file that is written beside its place and takes it when it is whole.
#ifndef TOOLS_KSICACHE_TEMPORARY_FILE_H_
#define TOOLS_KSICACHE_TEMPORARY_FILE_H_

#include <string>

namespace ksicache {

// Until it is committed, the file goes away with the object, and when a signal ends the process.
// There is one at a time.
class TemporaryFile {
 public:
  // Fails with an Error if `target` exists and may not be replaced.
  TemporaryFile(std::string target, bool replace);
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;
  ~TemporaryFile();

  const std::string& Name() const { return name_; }
  const std::string& Target() const { return target_; }

  // Brings the file to the disk and gives it the target's name.
  void Commit();

 private:
  std::string target_;
  bool replace_;
  std::string name_;
  int fd_ = -1;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_TEMPORARY_FILE_H_
