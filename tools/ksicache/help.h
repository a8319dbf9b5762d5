// The help, made from the descriptions of the commands.
#ifndef TOOLS_KSICACHE_HELP_H_
#define TOOLS_KSICACHE_HELP_H_

#include <span>
#include <string>
#include <string_view>

#include "tools/ksicache/command.h"

namespace ksicache {

// "ksicache load JSON FILE [--force]", in as many lines as it takes behind "Usage: ".
std::string UsageOf(const Command& command);

// Words on lines of 80 characters, for a UsageError: "There are csv, json and so on".
std::string ListOf(std::string_view start, std::span<const std::string_view> words);

// What --help says, alone and after a command.
std::string Help();
std::string HelpOf(const Command& command);

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_HELP_H_
