// A directory for the files of a target. Programs of libFuzzer end without removing it:
// scripts/fuzz gives them a TMPDIR, in memory, that it removes.
#ifndef TESTS_FUZZ_SCRATCH_DIRECTORY_H_
#define TESTS_FUZZ_SCRATCH_DIRECTORY_H_

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>

namespace fuzz {

class ScratchDirectory {
 public:
  ScratchDirectory() {
    path_ = std::filesystem::temp_directory_path() / "tally-fuzz.XXXXXX";
    if (mkdtemp(path_.data()) == nullptr) std::abort();
  }
  ~ScratchDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
  }
  ScratchDirectory(const ScratchDirectory&) = delete;
  ScratchDirectory& operator=(const ScratchDirectory&) = delete;

  const std::string& Path() const { return path_; }

 private:
  std::string path_;
};

inline void WriteFile(const std::string& file, std::string_view content) {
  std::ofstream stream(file, std::ios::binary | std::ios::trunc);
  stream.write(content.data(), static_cast<std::streamsize>(content.size()));
  if (!stream.flush()) std::abort();
}

}  // namespace fuzz

#endif  // TESTS_FUZZ_SCRATCH_DIRECTORY_H_
