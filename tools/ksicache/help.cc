#include "tools/ksicache/help.h"

#include <algorithm>
#include <string_view>
#include <vector>

#include "tools/ksicache/commands/commands.h"

namespace ksicache {
namespace {

constexpr std::string_view kPurpose = R"(
Captures, shows, exports, makes and checks KSI cache files, which `tally -c`
reads instead of the host it runs on.
)";

constexpr std::string_view kExitStatus = R"(
Exit status: 0 if all went well, 1 if something failed or check found something
wrong, 2 if the command line is wrong, 3 if diff found more than --fail-above.
)";

// What a usage stands behind.
constexpr std::string_view kUsage = "Usage: ";

constexpr size_t kWidth = 80;

constexpr Option kHelpOption = {"help", nullptr, "show this message", 'h'};
constexpr Option kVersionOption = {"version", nullptr, "show the version"};

using Options = std::vector<const Option*>;

// Those of all commands, each once.
Options AllOptions() {
  Options all;
  for (const Command* command : kCommands) {
    for (const Option* option : command->options) {
      if (std::ranges::find(all, option) == all.end()) all.push_back(option);
    }
  }
  return all;
}

// "--root DIR"
std::string Spelling(const Option& option) {
  const std::string name = std::string("--") + option.name;
  return option.value == nullptr ? name : name + " " + option.value;
}

std::string OptionList(const Options& options) {
  size_t width = 0;
  for (const Option* option : options) width = std::max(width, Spelling(*option).size());
  std::string list = "\nOptions:\n";
  for (const Option* option : options) {
    std::string spelling = Spelling(*option);
    spelling.resize(width, ' ');
    const std::string letter = {'-', option->letter, ',', ' '};
    list +=
        "  " + (option->letter == '\0' ? "    " : letter) + spelling + "  " + option->help + "\n";
  }
  return list;
}

std::string CommandList() {
  size_t width = 0;
  for (const Command* command : kCommands) {
    width = std::max(width, std::string_view(command->name).size());
  }
  std::string list = "\nCommands:\n";
  for (const Command* command : kCommands) {
    std::string name = command->name;
    name.resize(width, ' ');
    list += "  " + name + "  " + command->summary + "\n";
  }
  return list;
}

}  // namespace

std::string UsageOf(const Command& command) {
  const std::string start = std::string("ksicache ") + command.name;
  std::string usage = start + " " + command.arguments;
  size_t width = kUsage.size() + usage.size();
  for (const Option* option : command.options) {
    const std::string word = " [" + Spelling(*option) + "]";
    width += word.size();
    if (width > kWidth) {
      const std::string margin(kUsage.size() + start.size(), ' ');
      usage += "\n" + margin;
      width = margin.size() + word.size();
    }
    usage += word;
  }
  return usage;
}

std::string ListOf(std::string_view start, std::span<const std::string_view> words) {
  std::string list(start);
  size_t width = start.size();
  for (const std::string_view word : words) {
    width += word.size() + 2;
    if (width > kWidth) {
      list.back() = '\n';
      width = word.size() + 2;
    }
    list.append(word).append(", ");
  }
  list.replace(list.size() - 2, 2, "\n");
  return list;
}

std::string Help() {
  std::string text;
  for (const Command* command : kCommands) {
    text += text.empty() ? kUsage : std::string(kUsage.size(), ' ');
    text += UsageOf(*command) + "\n";
  }
  Options options = AllOptions();
  options.insert(options.end(), {&kHelpOption, &kVersionOption});
  text += kPurpose;
  return text + CommandList() + OptionList(options) + std::string(kExitStatus);
}

std::string HelpOf(const Command& command) {
  Options options(command.options.begin(), command.options.end());
  options.push_back(&kHelpOption);
  return std::string(kUsage) + UsageOf(command) + "\n\n" + command.help + OptionList(options);
}

}  // namespace ksicache
