// page: a host's memory, at one moment or over time, as a page for a browser.
#include <algorithm>
#include <cctype>
#include <filesystem>
#include <span>
#include <string>
#include <string_view>
#include <system_error>

#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/export/escaped_text.h"
#include "tools/ksicache/new_file.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/page/document.h"
#include "tools/ksicache/page/page_data.h"
#include "tools/ksicache/printable.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {
namespace {

constexpr Option kTitle = {"title", "TEXT", "head the page with TEXT instead of the host's name"};
constexpr Option kZone = {"zone", "ZONE", "tell times also in ZONE, the host's own, not in UTC"};
constexpr const Option* kOptions[] = {&kOutput, &kTitle, &kZone, &kForce, &kMode};

std::string TargetOf(const CommandLine& line) {
  const std::string* name = line.ValueOf(kOutput);
  if (name == nullptr || *name == "-") CheckOptionsFor("-", line);
  return name == nullptr ? "-" : *name;
}

// What heads the page, unless it is its host.
const std::string* TitleOf(const CommandLine& line) {
  const std::string* title = line.ValueOf(kTitle);
  if (title != nullptr && title->find_first_not_of(" \t\r\n") == std::string::npos) {
    throw UsageError("--title takes a text that can be seen");
  }
  return title;
}

// The time zone of the host, "Europe/Berlin"; empty if it is not told. A browser has names of its
// own, which are mostly those that this machine has, if it has any.
std::string ZoneOf(const CommandLine& line) {
  const std::string* zone = line.ValueOf(kZone);
  if (zone == nullptr) return {};
  const auto isOfName = [](unsigned char c) {
    return std::isalnum(c) != 0 ||
           std::string_view("_+-/").find(static_cast<char>(c)) != std::string_view::npos;
  };
  const std::filesystem::path zones = "/usr/share/zoneinfo";
  std::error_code error;
  const bool isName = !zone->empty() &&
                      std::isupper(static_cast<unsigned char>(zone->front())) != 0 &&
                      std::ranges::all_of(*zone, isOfName);
  if (!isName || (std::filesystem::is_directory(zones, error) &&
                  !std::filesystem::is_regular_file(zones / *zone, error))) {
    throw UsageError("--zone takes the name of a time zone, such as Europe/Berlin: " +
                     Printable(*zone));
  }
  return *zone;
}

int Page(const CommandLine& line) {
  const std::string& name = line.arguments[0];
  const std::string* title = TitleOf(line);
  const std::string zone = ZoneOf(line);
  const std::string start = name + ": ";
  NewFile file(TargetOf(line), line.Has(kForce), ModeOf(line));
  file.RefuseInput(FileNameOf(name));
  PageData data;
  try {
    ReadPage(IsRecording(name) ? name + "@.." : name, data);
  } catch (const DataError& error) {
    throw Error(start + error.what());
  }
  for (const std::string& problem : data.problems.All()) PrintError(start + problem);
  data.title = title == nullptr ? NameText(data.survey.host, -1)
               : IsUtf8(*title) ? *title
                                : Escaped(*title);
  data.zone = zone;
  const std::string html = ToHtml(data);
  file.Commit(std::as_bytes(std::span(html)));
  return data.problems.All().empty() ? 0 : 1;
}

}  // namespace

const Command kPage = {
    .name = "page",
    .arguments = "FILE[@WHEN|@FROM..TO]",
    .summary = "make a page of FILE for a browser",
    .help = R"(Makes one HTML file that shows where the memory of a host was, what happened
over time and what changed, and all reports as tables: of a capture, of one
moment of a recording, of those from FROM to TO, or of all it has. The page
needs no network, and any browser of the last years shows it.
)",
    .options = kOptions,
    .fewest = 1,
    .most = 1,
    .run = Page,
};

}  // namespace ksicache
