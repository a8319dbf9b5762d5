#include "tests/fuzz/node_walk.h"

#include <algorithm>
#include <array>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "knvlibs/catalogue.h"
#include "knvlibs/param_list.h"

namespace fuzz {
namespace {

using ksi::Instance;
using ksi::Key;
using ksi::KeyKind;
using ksi::Keys;
using ksi::ParamList;

// A list may name as many instances as it likes.
constexpr size_t kMostOfInstance = 24;

class Walk {
 public:
  Walk(ksi::Source& source, std::string_view path) : source_(source), path_(path) {
    for (const int64_t number : {0, 1, -1}) {
      for (const Instance instance : {Instance::kGroup, Instance::kClient, Instance::kMemNode}) {
        Add(instance, {KeyKind::kNumber, number, {}});
      }
    }
    for (const std::string_view state : ksi::kMemoryStates) {
      Add(Instance::kState, {KeyKind::kText, 0, state});
    }
  }

  void Run() {
    // Groups that are listed below groups found before are for the next round.
    size_t before = 0;
    do {
      before = found_;
      ForEachNode([this](const ksi::Node& node) {
        if (node.HasList()) ForEachKeys(node.listKeys, [&](const Keys& keys) { List(node, keys); });
      });
    } while (found_ != before);
    ForEachNode([this](const ksi::Node& node) {
      if (node.HasValue()) ForEachKeys(node.valueKeys, [&](const Keys& keys) { Read(node, keys); });
    });
  }

 private:
  template <class Visit>
  void ForEachNode(Visit visit) {
    for (const ksi::Node& node : ksi::Catalogue()) {
      if (node.path.starts_with(path_)) visit(node);
    }
  }

  template <class Visit>
  void ForEachKeys(const ksi::Keying& keying, Visit visit, Keys keys = {}) {
    if (keys.count == keying.Count()) return visit(keys);
    // By index: what is visited may find more.
    const std::vector<Key>& known = known_[keying.at[keys.count]];
    for (size_t i = 0; i < known.size(); ++i) {
      Keys longer = keys;
      longer.at[longer.count++] = known[i];
      ForEachKeys(keying, visit, longer);
    }
  }

  void Read(const ksi::Node& node, const Keys& keys) {
    std::array<std::byte, ksi::kMaxRecordSize> record = {};
    // Any status will do: only that it comes back.
    static_cast<void>(source_.Value(node, keys, ksi::Buffer(record).first(node.recordSize)));
  }

  void List(const ksi::Node& node, const Keys& keys) {
    ParamList list(ParamList::kNoLimit);
    if (source_.Instances(node, keys, list) != ksi::kOk) return;
    for (size_t i = 0; i < list.Count(); ++i) {
      if (list.Kind(i) == KeyKind::kNumber) {
        Add(node.entries, {KeyKind::kNumber, static_cast<int64_t>(list.Number(i)), {}});
      } else {
        Add(node.entries, {KeyKind::kText, 0, list.Text(i)});
      }
    }
  }

  void Add(Instance instance, const Key& key) {
    std::vector<Key>& known = known_[instance];
    const auto same = [&](const Key& other) {
      return key.kind == other.kind && key.number == other.number && key.text == other.text;
    };
    if (known.size() == kMostOfInstance || std::ranges::any_of(known, same)) return;
    known.push_back(key);
    // The text has to live as long as its key.
    if (key.kind == KeyKind::kText) known.back().text = *texts_.emplace(key.text).first;
    ++found_;
  }

  ksi::Source& source_;
  std::string_view path_;
  std::map<Instance, std::vector<Key>> known_;
  std::set<std::string, std::less<>> texts_;
  size_t found_ = 0;
};

}  // namespace

void ReadAllNodes(ksi::Source& source, std::string_view path) { Walk(source, path).Run(); }

}  // namespace fuzz
