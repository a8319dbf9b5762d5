#include "tools/ksicache/quantity.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <cstdlib>
#include <span>
#include <string_view>

#include "framework/name_list.h"
#include "knvlibs/times.h"
#include "tools/ksicache/error.h"

namespace ksicache {
namespace {

struct Unit {
  std::string_view name;
  int64_t size;
};

constexpr Unit kTimes[] = {{"", ksi::kSecond},
                           {"s", ksi::kSecond},
                           {"m", ksi::kMinute},
                           {"h", ksi::kHour},
                           {"d", ksi::kDay}};
constexpr Unit kSizes[] = {{"", 1},        {"K", 1 << 10},          {"k", 1 << 10},
                           {"M", 1 << 20}, {"m", 1 << 20},          {"G", 1 << 30},
                           {"g", 1 << 30}, {"T", int64_t{1} << 40}, {"t", int64_t{1} << 40}};
constexpr Unit kOne[] = {{"", 1}};

int64_t QuantityOf(const CommandLine& line, const Option& option, int64_t standard,
                   std::span<const Unit> units, const char* form) {
  const std::string* value = line.ValueOf(option);
  if (value == nullptr) return standard;
  int64_t number = 0;
  const auto [end, error] = std::from_chars(value->data(), value->data() + value->size(), number);
  const std::string_view name(end, static_cast<size_t>(value->data() + value->size() - end));
  const auto unit = std::ranges::find(units, name, &Unit::name);
  int64_t quantity = 0;
  if (error != std::errc() || unit == units.end() || number <= 0 ||
      __builtin_mul_overflow(number, unit->size, &quantity)) {
    throw UsageError(std::string("--") + option.name + " takes " + form + ": " + *value);
  }
  return quantity;
}

}  // namespace

int64_t DurationOf(const CommandLine& line, const Option& option, int64_t standard) {
  return QuantityOf(line, option, standard, kTimes, "a time such as 5s, 10m, 6h or 7d");
}

int64_t SizeOf(const CommandLine& line, const Option& option, int64_t standard) {
  return QuantityOf(line, option, standard, kSizes, "a size such as 500M or 2G");
}

std::optional<tally::DisplayUnit> UnitOf(const CommandLine& line) {
  const std::string* word = line.ValueOf(kUnit);
  if (word == nullptr) return std::nullopt;
  for (const tally::UnitName& name : tally::kUnitNames) {
    if (tally::SameName(*word, name.word)) return name.unit;
  }
  throw UsageError("--unit is mb, kb, pg or b");
}

int64_t CountOf(const CommandLine& line, const Option& option, int64_t standard) {
  return QuantityOf(line, option, standard, kOne, "a number from 1 on");
}

std::string TextOfDuration(int64_t duration) {
  const int64_t seconds = std::abs(duration / ksi::kSecond);
  const int64_t days = seconds / (ksi::kDay / ksi::kSecond);
  char clock[16];
  static_cast<void>(
      std::snprintf(clock, sizeof clock, "%02d:%02d:%02d", static_cast<int>(seconds / 3600 % 24),
                    static_cast<int>(seconds / 60 % 60), static_cast<int>(seconds % 60)));
  return (duration <= -ksi::kSecond ? "-" : "") +
         (days == 0 ? std::string() : std::to_string(days) + "d ") + clock;
}

}  // namespace ksicache
