#include "knvlibs/param_list.h"

#include <algorithm>
#include <cstring>

namespace {

constexpr size_t kFirstBlock = 128;
constexpr size_t kLargestBlock = size_t{64} << 10;

}  // namespace

KSI_ParamList::KSI_ParamList(size_t capacity, size_t textRoom)
    : capacity_(capacity), fixedTextRoom_(true) {
  blocks_.push_back({std::make_unique_for_overwrite<char[]>(textRoom), textRoom, 0});
}

ksi::Status KSI_ParamList::AddNumber(uint64_t value) {
  if (entries_.size() >= capacity_) return KSI_STATUS_TOO_MANY_ELEMENTS;
  Entry entry{ksi::KeyKind::kNumber, 0, {}};
  entry.number = value;
  entries_.push_back(entry);
  return ksi::kOk;
}

ksi::Status KSI_ParamList::AddText(std::string_view text) {
  if (entries_.size() >= capacity_ || text.size() >= std::numeric_limits<uint32_t>::max()) {
    return KSI_STATUS_TOO_MANY_ELEMENTS;
  }
  // Nothing may fail once the text is taken.
  if (entries_.size() == entries_.capacity()) entries_.reserve(2 * entries_.size() + 1);
  char* copy = TakeText(text.size() + 1);
  if (copy == nullptr) return KSI_STATUS_TOO_MANY_ELEMENTS;
  std::copy(text.begin(), text.end(), copy);
  copy[text.size()] = '\0';
  Entry entry{ksi::KeyKind::kText, static_cast<uint32_t>(text.size()), {}};
  entry.text = copy;
  entries_.push_back(entry);
  return ksi::kOk;
}

char* KSI_ParamList::TakeText(size_t size) {
  if (blocks_.empty() || blocks_.back().size - blocks_.back().used < size) {
    if (fixedTextRoom_) return nullptr;
    const size_t next =
        blocks_.empty() ? kFirstBlock : std::min(2 * blocks_.back().size, kLargestBlock);
    const size_t room = std::max(next, size);
    blocks_.push_back({std::make_unique_for_overwrite<char[]>(room), room, 0});
  }
  Block& block = blocks_.back();
  char* text = block.text.get() + block.used;
  block.used += size;
  return text;
}

void KSI_ParamList::RemoveLast() {
  if (entries_.empty()) return;
  if (entries_.back().kind == ksi::KeyKind::kText) {
    Block& block = blocks_.back();
    block.used = static_cast<size_t>(entries_.back().text - block.text.get());
    if (block.used == 0 && blocks_.size() > 1) blocks_.pop_back();
  }
  entries_.pop_back();
}

ksi::Status KSI_ParamList::Append(const KSI_ParamList& other) {
  const size_t before = entries_.size();
  ksi::Status status = ksi::kOk;
  for (size_t i = 0; i < other.Count() && status == ksi::kOk; ++i) {
    status = other.Kind(i) == ksi::KeyKind::kNumber ? AddNumber(other.Number(i))
                                                    : AddText(other.Text(i));
  }
  if (status != ksi::kOk) {
    while (entries_.size() > before) RemoveLast();
  }
  return status;
}
