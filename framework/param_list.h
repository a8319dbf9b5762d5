// Parameter lists, and reads with keys.
#ifndef FRAMEWORK_PARAM_LIST_H_
#define FRAMEWORK_PARAM_LIST_H_

#include <concepts>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>

#include <knvlibs/ksi.h>
#include "framework/complaint.h"
#include "framework/status.h"

namespace tally {

struct ParamListDestroyer {
  void operator()(KSI_ParamList* list) const { KSI_ParamListDestroy(list); }
};

// Owns a parameter or instance list and destroys it once. Null when it could not be made.
using ParamList = std::unique_ptr<KSI_ParamList, ParamListDestroyer>;

// A key that selects one instance on one level of the tree. Signed numbers are widened with their
// sign.
class Key {
 public:
  Key() = default;
  template <std::integral Number>
  Key(Number number) : number_(static_cast<uint64_t>(number)), kind_(Kind::number) {}
  Key(const char* text) : text_(text), kind_(Kind::text) {}

  bool given() const { return kind_ != Kind::none; }

  [[nodiscard]] Status AddTo(KSI_ParamList* list) const {
    return kind_ == Kind::text ? KSI_ParamListAddString(list, text_)
                               : KSI_ParamListAddInt(list, number_);
  }

 private:
  enum class Kind : uint8_t { none, number, text };

  uint64_t number_ = 0;
  const char* text_ = nullptr;
  Kind kind_ = Kind::none;
};

// The parameter list of one read, and what becomes of its keys.
struct KeyList {
  int capacity;
  Key first = {};
  Key second = {};
  bool removeKeys = false;  // take the keys out again before the list is destroyed
};

// What a reader says of each step that can fail.
struct ReaderTexts {
  Complaint create = {};
  Complaint firstKey = {};
  Complaint secondKey = {};
  Complaint read = {};
};

// Makes the list of a read; kFailure when there is no list. Inline, as what reads with it: where
// the keys are known there is nothing to ask.
[[nodiscard]] inline Status MakeKeys(const KeyList& keys, const ReaderTexts& texts,
                                     ParamList& list) {
  list.reset(KSI_ParamListCreate(1, keys.capacity));
  if (!list) return texts.create.Of(kFailure);
  if (keys.first.given()) {
    if (Status status = texts.firstKey.Of(keys.first.AddTo(list.get()))) return status;
  }
  if (keys.second.given()) {
    if (Status status = texts.secondKey.Of(keys.second.AddTo(list.get()))) return status;
  }
  return kSuccess;
}

// Destroys the list of a read.
inline void DropKeys(const KeyList& keys, ParamList& list) {
  if (keys.removeKeys) {
    if (keys.second.given()) KSI_ParamListRemoveLastParam(list.get());
    if (keys.first.given()) KSI_ParamListRemoveLastParam(list.get());
  }
  list.reset();
}

// Calls `read` with a list made of the keys and destroys the list, whatever the status.
template <class Read>
[[nodiscard]] Status KeyedRead(const KeyList& keys, const ReaderTexts& texts, Read read) {
  ParamList list;
  if (Status status = MakeKeys(keys, texts, list)) return status;
  const Status status = read(list.get());
  DropKeys(keys, list);
  return texts.read.Of(status);
}

// Reads the record of `node` for the keys: `size` bytes, the record's size.
[[nodiscard]] inline Status ReadRecord(uint16_t node, const KeyList& keys, const ReaderTexts& texts,
                                       void* buffer, size_t size) {
  return KeyedRead(keys, texts,
                   [&](KSI_ParamList* list) { return KSI_Get(node, list, buffer, size); });
}

template <class Record>
[[nodiscard]] Status ReadRecord(uint16_t node, const KeyList& keys, const ReaderTexts& texts,
                                Record& record) {
  return ReadRecord(node, keys, texts, &record, sizeof record);
}

// Lists the instances of `node` for `keys` (null: no keys). A `hint` is how many to expect.
[[nodiscard]] Status ListInstances(uint16_t node, KSI_ParamList* keys, ParamList& instances,
                                   std::optional<uint32_t> hint = {});

// The same for keys of a list of their own.
[[nodiscard]] Status ListInstances(uint16_t node, const KeyList& keys, const ReaderTexts& texts,
                                   ParamList& instances, std::optional<uint32_t> hint = {});

// Calls `take` with each of the first `count` names of a list until one fails. A name that cannot
// be fetched fails after its complaint.
template <class Take>
[[nodiscard]] Status ForEachName(const ParamList& names, uint32_t count,
                                 const Complaint& notFetched, Take take) {
  for (uint32_t i = 0; i < count; ++i) {
    const char* name = nullptr;
    if (Status status = notFetched.Of(KSI_ParamListGetString(names.get(), i, &name))) return status;
    if (Status status = take(name)) return status;
  }
  return kSuccess;
}

// The same for all names of a list.
template <class Take>
[[nodiscard]] Status ForEachName(const ParamList& names, const Complaint& notFetched, Take take) {
  return ForEachName(names, KSI_ParamListUsedCount(names.get()), notFetched, take);
}

}  // namespace tally

#endif  // FRAMEWORK_PARAM_LIST_H_
