#include "knvlibs/recording/list_edit.h"

#include <cstddef>
#include <unordered_map>
#include <utility>

#include "knvlibs/recording/chunk.h"

namespace ksi {
namespace {

using Entries = std::vector<OwnKey>;

struct Step {
  size_t stayed = 0;
  size_t gone = 0;
  size_t come = 0;

  bool IsLast() const { return stayed + gone + come == 0; }
};

void PutStep(const Step& step, ByteWriter& out) {
  for (const size_t number : {step.stayed, step.gone, step.come}) out.Unsigned(number);
}

// The old list's places; of an entry that stands there twice the first.
std::unordered_map<OwnKey, size_t> PlacesOf(const Entries& entries) {
  std::unordered_map<OwnKey, size_t> places;
  places.reserve(entries.size());
  for (size_t i = 0; i < entries.size(); ++i) places.emplace(entries[i], i);
  return places;
}

}  // namespace

void PutEntry(const OwnKey& entry, int64_t& before, ByteWriter& out) {
  if (const auto* number = std::get_if<int64_t>(&entry)) {
    out.Byte(0);
    out.Signed(chunk::Minus(*number, std::exchange(before, *number)));
  } else {
    out.Byte(1);
    out.Text(std::get<std::string>(entry));
  }
}

Key TakeEntry(ByteReader& in, int64_t& before) {
  if (in.Bounded(1) == 1) return {KeyKind::kText, 0, in.Text()};
  before = chunk::Plus(before, in.Signed());
  return {KeyKind::kNumber, before, {}};
}

void PutEdit(const Entries& before, const Entries& after, ByteWriter& out) {
  const std::unordered_map<OwnKey, size_t> places = PlacesOf(before);
  int64_t number = 0;
  size_t at = 0;  // in the old list
  for (size_t i = 0; i < after.size() || at < before.size();) {
    Step step;
    for (; i < after.size() && at < before.size() && after[i] == before[at]; ++i, ++at) {
      ++step.stayed;
    }
    // What comes ends where the old list goes on with an entry of the new one.
    const size_t from = i;
    size_t next = before.size();
    for (; i < after.size() && next == before.size(); ++i) {
      const auto found = places.find(after[i]);
      if (found != places.end() && found->second >= at) next = found->second;
    }
    if (next != before.size()) --i;
    step.gone = next - std::exchange(at, next);
    step.come = i - from;
    PutStep(step, out);
    for (size_t j = from; j < i; ++j) PutEntry(after[j], number, out);
  }
  PutStep({}, out);
}

bool TakeEdit(ByteReader& in, size_t most, std::vector<Key>& entries) {
  std::vector<Key> after;
  int64_t number = 0;
  for (size_t at = 0;;) {
    Step step;
    step.stayed = in.Bounded(entries.size() - at);
    step.gone = in.Bounded(entries.size() - at - step.stayed);
    step.come = in.Bounded(in.Left());
    const size_t stay = step.IsLast() ? entries.size() - at : step.stayed;
    if (stay + step.come > most - after.size()) return false;
    const auto from = entries.begin() + static_cast<ptrdiff_t>(at);
    after.insert(after.end(), from, from + static_cast<ptrdiff_t>(stay));
    if (step.IsLast()) break;
    at += step.stayed + step.gone;
    for (size_t i = 0; i < step.come && in.IsGood(); ++i) after.push_back(TakeEntry(in, number));
  }
  entries = std::move(after);
  return in.IsGood();
}

void PassEdit(ByteReader& in) {
  int64_t number = 0;
  for (;;) {
    const Step step = {in.Unsigned(), in.Unsigned(), in.Bounded(in.Left())};
    if (!in.IsGood() || step.IsLast()) return;
    for (size_t i = 0; i < step.come && in.IsGood(); ++i) static_cast<void>(TakeEntry(in, number));
  }
}

}  // namespace ksi
