// Hosts made up for benchmarks and tests: the readings of one, record by record.
#ifndef TESTS_HARNESS_MADE_HOST_H_
#define TESTS_HARNESS_MADE_HOST_H_

#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

#include "knvlibs/catalogue.h"
#include "knvlibs/source.h"
#include "tools/ksicache/reading_sink.h"

namespace tally::testing {

class MadeHost {
 public:
  explicit MadeHost(ksicache::ReadingSink& sink) : sink_(sink) {}

  // A node's record; `keys` are numbers or texts, in the order of the path.
  template <class Record, class... Key>
  void Value(std::string_view path, const Record& record, const Key&... keys) {
    sink_.AddValue(Node(path), KeysOf(keys...), std::as_bytes(std::span(&record, 1)));
  }

  // A node's list, of numbers or of texts.
  template <class Entries, class... Key>
  void List(std::string_view path, const Entries& entries, const Key&... keys) {
    std::vector<ksi::Key> list;
    for (const auto& entry : entries) list.push_back(KeyOf(entry));
    sink_.AddList(Node(path), KeysOf(keys...), list);
  }

 private:
  static const ksi::Node& Node(std::string_view path) { return *ksi::FindNode(path); }

  static ksi::Key KeyOf(int64_t number) { return {ksi::KeyKind::kNumber, number, {}}; }
  static ksi::Key KeyOf(std::string_view text) { return {ksi::KeyKind::kText, 0, text}; }

  template <class... Key>
  static ksi::Keys KeysOf(const Key&... keys) {
    return {{KeyOf(keys)...}, sizeof...(keys)};
  }

  ksicache::ReadingSink& sink_;
};

}  // namespace tally::testing

#endif  // TESTS_HARNESS_MADE_HOST_H_
