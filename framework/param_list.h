// Parameter lists, and reads with keys.
#ifndef FRAMEWORK_PARAM_LIST_H_
#define FRAMEWORK_PARAM_LIST_H_

#include <cstddef>
#include <cstdint>
#include <memory>
#include <utility>

#include <knvlibs/ksi.h>
#include "framework/status.h"

namespace tally {

struct ParamListDestroyer {
  void operator()(KSI_ParamList* list) const { KSI_ParamListDestroy(list); }
};

// Owns a parameter or instance list and destroys it once. Null when it could not be made.
using ParamList = std::unique_ptr<KSI_ParamList, ParamListDestroyer>;

// A key that selects one instance on one level of the tree.
class Key {
 public:
  Key() = default;
  Key(uint64_t number) : number_(number), kind_(Kind::number) {}
  Key(const char* text) : text_(text), kind_(Kind::text) {}

  bool given() const { return kind_ != Kind::none; }
  Status AddTo(KSI_ParamList* list) const {
    return kind_ == Kind::text ? KSI_ParamListAddString(list, text_)
                               : KSI_ParamListAddInt(list, number_);
  }

 private:
  enum class Kind : uint8_t { none, number, text };

  uint64_t number_ = 0;
  const char* text_ = nullptr;
  Kind kind_ = Kind::none;
};

// Where a keyed read failed; each reader has its own words for each.
enum class ReadStep : uint8_t { create, addFirstKey, addSecondKey, read };

// The parameter list of one read, and what becomes of its keys.
struct KeyList {
  int capacity;
  Key first = {};
  Key second = {};
  bool removeKeys = false;  // take the keys out again before the list is destroyed
};

// Calls `read` with a list made of the keys and destroys the list, whatever the status. A failure
// is worded by `words(step, status)`.
template <class Read, class Words>
Status KeyedRead(const KeyList& keys, Read read, Words words) {
  ParamList list(KSI_ParamListCreate(1, keys.capacity));
  if (!list) {
    words(ReadStep::create, kFailure);
    return kFailure;
  }
  int added = 0;
  for (const auto& [key, step] : {std::pair{keys.first, ReadStep::addFirstKey},
                                  std::pair{keys.second, ReadStep::addSecondKey}}) {
    if (!key.given()) continue;
    if (Status status = key.AddTo(list.get())) {
      words(step, status);
      return status;
    }
    ++added;
  }
  const Status status = read(list.get());
  if (keys.removeKeys) {
    for (; added > 0; --added) KSI_ParamListRemoveLastParam(list.get());
  }
  list.reset();
  if (status != kSuccess) words(ReadStep::read, status);
  return status;
}

// Reads one record of `node`.
template <class Record, class Words>
Status KeyedGet(uint16_t node, const KeyList& keys, Record& record, Words words) {
  return KeyedRead(
      keys, [&](KSI_ParamList* list) { return KSI_Get(node, list, &record, sizeof record); },
      words);
}

// Lists the instances of `node` for `keys` (null: no keys).
inline Status ListInstances(uint16_t node, KSI_ParamList* keys, ParamList& instances) {
  KSI_ParamList* made = nullptr;
  const Status status = KSI_GetInstanceListAlloc(node, keys, &made);
  if (status == kSuccess) instances.reset(made);
  return status;
}

// The same for keys of a list of their own.
template <class Words>
Status KeyedList(uint16_t node, const KeyList& keys, ParamList& instances, Words words) {
  return KeyedRead(
      keys, [&](KSI_ParamList* list) { return ListInstances(node, list, instances); }, words);
}

}  // namespace tally

#endif  // FRAMEWORK_PARAM_LIST_H_
