// The commands of ksicache. Each gives its exit status or fails with an Error or UsageError.
#ifndef TOOLS_KSICACHE_COMMANDS_H_
#define TOOLS_KSICACHE_COMMANDS_H_

#include <string>
#include <vector>

namespace ksicache {

struct Options {
  std::vector<std::string> arguments;  // after the command's name
  bool force = false;
  bool json = false;
  std::string root = "/";
};

int Capture(const Options& options);
int Info(const Options& options);
int Dump(const Options& options);
int Load(const Options& options);
int Check(const Options& options);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_COMMANDS_H_
