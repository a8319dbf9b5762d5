// ksicache: the tool for KSI cache files.
#include <getopt.h>

#include <cstdio>
#include <exception>
#include <string>

#include "tools/ksicache/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"

namespace ksicache {
namespace {

constexpr const char* kHelp =
    R"(Usage: ksicache capture FILE [--force] [--root DIR]
       ksicache info FILE
       ksicache dump FILE [NODE...] [--json]
       ksicache load JSON FILE [--force]
       ksicache check FILE

Captures, shows, makes and checks KSI cache files, which `tally -c FILE` reads
instead of the host it runs on.

Commands:
  capture   record every node and instance of this Linux host in FILE
  info      say which host FILE is of, when it was taken and what it holds
  dump      show what FILE holds, of all nodes or of those named
  load      make FILE from JSON, the output of dump --json
  check     say what is wrong with FILE

Options:
      --force     replace FILE if it exists
      --root DIR  capture the host whose files are recorded below DIR
      --json      dump as JSON
  -h, --help      show this message
      --version   show the version

Exit status: 0 if all went well, 1 if something failed or check found something
wrong, 2 if the command line is wrong.
)";

struct Command {
  const char* name;
  int (*run)(const Options&);
  const char* options;  // the ones it takes, by their letters below
};
constexpr Command kCommands[] = {
    {"capture", Capture, "fr"}, {"info", Info, ""},   {"dump", Dump, "j"},
    {"load", Load, "f"},        {"check", Check, ""},
};

const Command& FindCommand(const std::string& name) {
  for (const Command& command : kCommands) {
    if (name == command.name) return command;
  }
  throw UsageError("there is no command " + name);
}

int Run(int argc, char** argv) {
  constexpr option kOptions[] = {
      {"force", no_argument, nullptr, 'f'},   {"root", required_argument, nullptr, 'r'},
      {"json", no_argument, nullptr, 'j'},    {"help", no_argument, nullptr, 'h'},
      {"version", no_argument, nullptr, 'V'}, {nullptr, 0, nullptr, 0}};
  Options options;
  std::string given;
  opterr = 0;
  for (int letter; (letter = getopt_long(argc, argv, "h", kOptions, nullptr)) != -1;) {
    switch (letter) {
      case 'h':
        Print(kHelp);
        return 0;
      case 'V':
        Print("ksicache " KSICACHE_VERSION "\n");
        return 0;
      case 'f':
        options.force = true;
        break;
      case 'j':
        options.json = true;
        break;
      case 'r':
        options.root = optarg;
        break;
      default:
        throw UsageError(std::string("unknown or incomplete option ") + argv[optind - 1]);
    }
    given += static_cast<char>(letter);
  }
  if (optind == argc) throw UsageError("which command?");
  const Command& command = FindCommand(argv[optind]);
  if (given.find_first_not_of(command.options) != std::string::npos) {
    throw UsageError(std::string(command.name) + " does not take that option");
  }
  options.arguments.assign(argv + optind + 1, argv + argc);
  return command.run(options);
}

}  // namespace
}  // namespace ksicache

int main(int argc, char** argv) {
  try {
    const int status = ksicache::Run(argc, argv);
    ksicache::FinishOutput();
    return status;
  } catch (const ksicache::UsageError& error) {
    ksicache::PrintError(std::string(error.what()) + "\nTry 'ksicache --help'.");
    return 2;
  } catch (const std::exception& error) {
    ksicache::PrintError(error.what());
    return 1;
  }
}
