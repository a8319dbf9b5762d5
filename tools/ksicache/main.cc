// ksicache: the tool for KSI cache files.
#include <getopt.h>
#include <signal.h>
#include <sqlite3.h>

#include <algorithm>
#include <cstdio>
#include <exception>
#include <new>
#include <string>
#include <vector>

#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/help.h"
#include "tools/ksicache/output.h"

namespace ksicache {
namespace {

enum Letter : int { kHelpLetter = 'h', kVersionLetter = 'V', kFirstOption = 256 };

// All that may be given, whatever the command; an option of a command is known by its place in
// `all`.
struct Given {
  std::vector<const Option*> all;
  bool help = false;
  bool version = false;
  CommandLine line;
};

std::vector<option> LongOptions(Given& given, std::string& letters) {
  std::vector<option> options = {{"help", no_argument, nullptr, kHelpLetter},
                                 {"version", no_argument, nullptr, kVersionLetter}};
  for (const Command* command : kCommands) {
    for (const Option* each : command->options) {
      if (std::ranges::find(given.all, each) != given.all.end()) continue;
      const int letter = kFirstOption + static_cast<int>(given.all.size());
      options.push_back(
          {each->name, each->value == nullptr ? no_argument : required_argument, nullptr, letter});
      given.all.push_back(each);
      if (each->letter == '\0') continue;
      letters += each->letter;
      if (each->value != nullptr) letters += ':';
    }
  }
  options.push_back({nullptr, 0, nullptr, 0});
  return options;
}

// The one that getopt_long has found; null if it is none of a command.
const Option* FindOption(const Given& given, int letter) {
  if (letter >= kFirstOption) return given.all[static_cast<size_t>(letter - kFirstOption)];
  const auto found = std::ranges::find_if(given.all, [&](const Option* each) {
    return each->letter != '\0' && each->letter == letter;
  });
  return found == given.all.end() ? nullptr : *found;
}

Given Parse(int argc, char** argv) {
  Given given;
  std::string letters = "h";
  const std::vector<option> options = LongOptions(given, letters);
  opterr = 0;
  for (int letter;
       (letter = getopt_long(argc, argv, letters.c_str(), options.data(), nullptr)) != -1;) {
    if (const Option* each = FindOption(given, letter)) {
      given.line.options[each] = optarg == nullptr ? "" : optarg;
    } else if (letter == kHelpLetter) {
      given.help = true;
    } else if (letter == kVersionLetter) {
      given.version = true;
    } else {
      throw UsageError(std::string("unknown or incomplete option ") + argv[optind - 1]);
    }
  }
  given.line.arguments.assign(argv + optind, argv + argc);
  return given;
}

// Null if there is none of that name.
const Command* FindCommand(const std::string& name) {
  const auto* found =
      std::ranges::find_if(kCommands, [&](const Command* each) { return each->name == name; });
  return found == std::end(kCommands) ? nullptr : *found;
}

void CheckLine(const Command& command, const CommandLine& line) {
  for (const auto& [option, value] : line.options) {
    if (std::ranges::find(command.options, option) == command.options.end()) {
      throw UsageError(std::string(command.name) + " does not take --" + option->name);
    }
  }
  const size_t count = line.arguments.size();
  if (count < command.fewest || count > command.most) {
    constexpr size_t kOneLine = 59;  // leaves room for what stands before it
    const std::string usage = UsageOf(command);
    if (usage.size() <= kOneLine) throw UsageError("not as in: " + usage);
    throw UsageError("not as in:", "Usage: " + usage + "\nTry 'ksicache --help'.\n");
  }
}

int Run(int argc, char** argv) {
  Given given = Parse(argc, argv);
  std::vector<std::string>& arguments = given.line.arguments;
  if (given.version) {
    Print("ksicache " KSICACHE_VERSION "\n");
    return 0;
  }
  const Command* command = arguments.empty() ? nullptr : FindCommand(arguments.front());
  if (given.help) {
    Print(command == nullptr ? Help() : HelpOf(*command));
    return 0;
  }
  if (arguments.empty()) throw UsageError("which command?");
  if (command == nullptr) throw UsageError("there is no command " + arguments.front());
  arguments.erase(arguments.begin());
  CheckLine(*command, given.line);
  return command->run(given.line);
}

}  // namespace
}  // namespace ksicache

int main(int argc, char** argv) {
  // A file that may grow no more is an error like others, with a message and nothing left behind.
  static_cast<void>(signal(SIGXFSZ, SIG_IGN));
  // Nobody asks SQLite how much memory it has, which it would count with a lock for each piece.
  static_cast<void>(sqlite3_config(SQLITE_CONFIG_MEMSTATUS, 0));
  try {
    const int status = ksicache::Run(argc, argv);
    ksicache::FinishOutput();
    return status;
  } catch (const ksicache::UsageError& error) {
    ksicache::PrintError(error.what());
    static_cast<void>(std::fputs(error.Help(), stderr));
    return 2;
  } catch (const std::bad_alloc&) {
    ksicache::PrintNoMemory();
    return 1;
  } catch (const std::exception& error) {
    ksicache::PrintError(error.what());
    return 1;
  }
}
