#include "tools/ksicache/diff/text.h"

#include <locale.h>
#include <wchar.h>

#include <array>
#include <cmath>
#include <cstdio>
#include <span>
#include <utility>
#include <vector>

#include "knvlibs/characters.h"
#include "tools/ksicache/printable.h"

namespace ksicache {
namespace {

std::string Formatted(const char* format, double number) {
  std::array<char, 400> text = {};
  static_cast<void>(std::snprintf(text.data(), text.size(), format, number));
  return text.data();
}

// The cells that a terminal takes for a character.
size_t CellsOf(char32_t code) {
  if (code < 0x80) return 1;
  // The characters' widths are known in any locale of UTF-8, whatever that of the environment.
  static const locale_t utf8 = newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr);
  if (utf8 == nullptr) return 1;
  const locale_t before = uselocale(utf8);
  const int cells = wcwidth(static_cast<wchar_t>(code));
  uselocale(before);
  return cells < 0 ? 1 : static_cast<size_t>(cells);
}

// A character as it is shown, which may be by an escape.
struct Shown {
  std::string text;
  size_t cells;
};

std::vector<Shown> Split(std::string_view text) {
  std::vector<Shown> all;
  while (!text.empty()) {
    const ksi::Character character = ksi::FirstOf(text);
    const std::string_view raw = text.substr(0, character.size);
    std::string shown = Printable(raw);
    const size_t cells = shown == raw ? CellsOf(character.code) : shown.size();
    all.push_back({std::move(shown), cells});
    text.remove_prefix(character.size);
  }
  return all;
}

size_t CellsIn(std::span<const Shown> characters) {
  size_t cells = 0;
  for (const Shown& character : characters) cells += character.cells;
  return cells;
}

std::string TextOf(std::span<const Shown> characters) {
  std::string text;
  for (const Shown& character : characters) text += character.text;
  return text;
}

// Takes characters off one end until they have no more than so many cells.
std::span<const Shown> First(std::span<const Shown> characters, size_t cells) {
  while (CellsIn(characters) > cells) characters = characters.first(characters.size() - 1);
  return characters;
}

std::span<const Shown> Last(std::span<const Shown> characters, size_t cells) {
  while (CellsIn(characters) > cells) characters = characters.subspan(1);
  return characters;
}

}  // namespace

std::string DurationText(double seconds) {
  struct Unit {
    const char* name;
    int64_t size;
  };
  constexpr Unit kUnits[] = {
      {"y", int64_t{365} * 86400}, {"d", 86400}, {"h", 3600}, {"m", 60}, {"s", 1}};
  const auto whole = static_cast<int64_t>(std::llround(std::fabs(seconds)));
  const std::string sign = seconds < 0 ? "-" : "";
  for (size_t i = 0; i + 1 < std::size(kUnits); ++i) {
    if (whole < kUnits[i].size) continue;
    const int64_t rest = whole % kUnits[i].size / kUnits[i + 1].size;
    return sign + std::to_string(whole / kUnits[i].size) + kUnits[i].name + " " +
           std::to_string(rest) + kUnits[i + 1].name;
  }
  return sign + std::to_string(whole) + "s";
}

std::string NumberText(std::optional<int64_t> number) {
  return number ? std::to_string(*number) : kNoFigure;
}

std::string RateText(std::optional<double> rate) {
  if (!rate) return kNoFigure;
  if (*rate != 0 && std::fabs(*rate) < 0.001) return *rate < 0 ? ">-0.001" : "<0.001";
  return Formatted(std::fabs(*rate) < 0.1 && *rate != 0 ? "%.3f" : "%.1f", *rate);
}

std::string PartText(std::optional<int64_t> part, std::optional<int64_t> whole) {
  if (!part || !whole || *whole == 0) return kNoFigure;
  const double percent = 100 * static_cast<double>(*part) / static_cast<double>(*whole);
  if (*part == 0) return "0%";
  if (std::fabs(percent) < 0.5) return "<1%";
  return Formatted("%.0f%%", percent);
}

std::string OnTheLeft(std::string_view text, size_t width) {
  constexpr std::string_view kCut = "...";
  const std::vector<Shown> all = Split(text);
  const size_t cells = CellsIn(all);
  if (cells <= width) return TextOf(all) + std::string(width - cells, ' ');
  const auto begin = First(all, (width - kCut.size()) / 2);
  const auto end = Last(all, width - kCut.size() - CellsIn(begin));
  const std::string cut = TextOf(begin) + std::string(kCut) + TextOf(end);
  return cut + std::string(width - kCut.size() - CellsIn(begin) - CellsIn(end), ' ');
}

std::string OnTheRight(std::string_view text, size_t width) {
  const std::vector<Shown> all = Split(text);
  const size_t cells = CellsIn(all);
  return std::string(cells < width ? width - cells : 1, ' ') + TextOf(all);
}

std::string NameText(std::string_view name, int64_t number) {
  constexpr int64_t kFirstProcess = int64_t{1} << 40;
  std::string text(name.empty() ? "(no name)" : name);
  if (number < 0) return text;
  return text + " " + std::to_string(number >= kFirstProcess ? number - kFirstProcess : number);
}

}  // namespace ksicache
