// Runs a program to its end and keeps what it wrote.
#ifndef TESTS_HARNESS_PROGRAM_H_
#define TESTS_HARNESS_PROGRAM_H_

#include <string>
#include <utility>
#include <vector>

namespace harness {

struct Program {
  std::string path;
  std::vector<std::string> args;  // from argv[0] on
  std::vector<std::string> environment;
  std::vector<std::pair<int, int>> files;  // (number in the program, file descriptor here)
  // Where standard output goes: a file to write to instead of keeping it, or nowhere at all.
  std::string outPath;
  bool outClosed = false;
  bool outPipeWithoutReader = false;
  bool ignoreSigpipe = false;
};

struct Result {
  int status = 0;  // exit status, or minus the signal that ended the program
  std::string out;
  std::string err;
};

// A program that does not end within a minute is killed, which its status shows.
Result RunProgram(const Program& program);

// The environment of this process, for tools that need it.
std::vector<std::string> OwnEnvironment();

// A file in memory, closed when its owner goes.
class MemoryFile {
 public:
  explicit MemoryFile(const std::string& content = "");
  ~MemoryFile();
  MemoryFile(const MemoryFile&) = delete;
  MemoryFile& operator=(const MemoryFile&) = delete;

  int Descriptor() const { return descriptor_; }
  std::string Content() const;

 private:
  int descriptor_;
};

}  // namespace harness

#endif  // TESTS_HARNESS_PROGRAM_H_
