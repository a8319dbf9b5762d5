// The help, made from the descriptions of the commands.
#ifndef TOOLS_KSICACHE_HELP_H_
#define TOOLS_KSICACHE_HELP_H_

#include <string>

#include "tools/ksicache/command.h"

namespace ksicache {

// "ksicache load JSON FILE [--force]", in as many lines as it takes behind "Usage: ".
std::string UsageOf(const Command& command);

// What --help says, alone and after a command.
std::string Help();
std::string HelpOf(const Command& command);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_HELP_H_
