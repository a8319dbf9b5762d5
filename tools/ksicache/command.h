// What a command is. Each stands in a file of its own, described there once: the usage, the help
// and the reading of the command line derive from these descriptions. A new one is its file, its
// line in commands/commands.h and CMakeLists.txt, its section in docs/ksicache.8 and its
// completions.
#ifndef TOOLS_KSICACHE_COMMAND_H_
#define TOOLS_KSICACHE_COMMAND_H_

#include <cstddef>
#include <map>
#include <span>
#include <string>
#include <vector>

namespace ksicache {

struct Option {
  const char* name;   // without its dashes
  const char* value;  // what the value is called, null if it takes none
  const char* help;
  char letter = '\0';  // a short name; none
};

// What was given to a command.
struct CommandLine {
  std::vector<std::string> arguments;
  std::map<const Option*, std::string> options;  // with their values

  bool Has(const Option& option) const { return options.contains(&option); }

  // The value of an option, null if it was not given.
  const std::string* ValueOf(const Option& option) const {
    const auto found = options.find(&option);
    return found == options.end() ? nullptr : &found->second;
  }
};

struct Command {
  static constexpr size_t kAnyNumber = SIZE_MAX;

  const char* name;
  const char* arguments;  // as the usage shows them
  const char* summary;    // for the list of commands
  const char* help;       // whole lines
  std::span<const Option* const> options;
  size_t fewest;  // arguments
  size_t most;
  // Gives the exit status or fails with an Error or UsageError.
  int (*run)(const CommandLine&);
};

// The options that more than one command takes.
inline constexpr Option kForce = {"force", nullptr, "replace FILE if it exists"};
inline constexpr Option kJson = {"json", nullptr, "print JSON"};
inline constexpr Option kEvery = {"every", "TIME",
                                  "take a moment each TIME; record alone does each 5s"};
inline constexpr Option kUnit = {"unit", "UNIT", "show memory in mb, kb, pg (4 KB pages) or b",
                                 'u'};
inline constexpr Option kOutput = {"output", "OUT", "make the file OUT", 'o'};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_COMMAND_H_
