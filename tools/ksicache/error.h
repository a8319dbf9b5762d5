// How a command fails.
#ifndef TOOLS_KSICACHE_ERROR_H_
#define TOOLS_KSICACHE_ERROR_H_

#include <cstdint>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

#include "knvlibs/source.h"

namespace ksicache {

// Ends the command with its message and exit status 1.
class Error : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// The same for what a command was given to read; whoever knows where it stood adds that.
class DataError : public Error {
 public:
  using Error::Error;
};

// The same for standard output: with that lost, there is no going on.
class OutputError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// Ends the command with its message, a word on how to get help, and exit status 2.
class UsageError : public std::runtime_error {
 public:
  // `help`: whole lines, of this program's own text.
  explicit UsageError(const std::string& message, std::string help = "Try 'ksicache --help'.\n")
      : std::runtime_error(message), help_(std::move(help)) {}

  const char* Help() const { return help_.c_str(); }

 private:
  std::string help_;
};

// The error for a system call on `fileName` that failed with this errno.
Error SystemError(const std::string& fileName, int error);

// "0xbad0003"
std::string Hex(uint64_t number);

// "0xbad0003 Not found", without the words if there are none.
std::string StatusText(ksi::Status status);

// "sched/groups/groupName [5]"
std::string NameOf(std::string_view path, const ksi::Keys& keys);

// As much of a text as a message quotes, with "..." in place of what is more.
std::string Cut(std::string_view text);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_ERROR_H_
