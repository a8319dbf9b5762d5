// What the test double answers in one run of tally.
#ifndef TESTS_HARNESS_SCENARIO_H_
#define TESTS_HARNESS_SCENARIO_H_

#include <algorithm>
#include <concepts>
#include <cstdint>
#include <cstring>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

namespace harness {

// A key of a read, or an entry of an instance list: a number or a text.
class Item {
 public:
  template <std::integral Integer>
  Item(Integer number) : text_(std::to_string(static_cast<int64_t>(number))) {}  // NOLINT: implicit
  Item(const char* text) : Item(std::string_view(text)) {}                       // NOLINT: implicit
  Item(const std::string& text) : Item(std::string_view(text)) {}                // NOLINT: implicit
  Item(std::string_view text);                                                   // NOLINT: implicit

  // An entry that fails with `status` when it is read.
  static Item Unreadable(uint32_t status);

  const std::string& Text() const { return text_; }

 private:
  Item() = default;
  std::string text_;
};

using Items = std::vector<Item>;

// A scenario is built statement by statement; a later statement on the same read replaces an
// earlier one. Nodes are named without KSI_NODE_. A read that the scenario does not answer fails
// the test.
class Scenario {
 public:
  // A clock at Sat Nov 21 10:00:00 2026 and a kernel that matches.
  Scenario();

  Scenario& Time(int64_t seconds);
  Scenario& Signature(uint32_t status, std::string_view kernelBuild, std::string_view appBuild);
  Scenario& Cache(uint32_t status);

  // The value of a node: a record or a number of the node's exact type.
  template <class Record>
  Scenario& Value(std::string_view node, const Items& keys, const Record& record) {
    static_assert(std::is_trivially_copyable_v<Record> && !std::is_pointer_v<Record>);
    return Bytes(node, keys, {reinterpret_cast<const char*>(&record), sizeof record});
  }
  Scenario& Bytes(std::string_view node, const Items& keys, std::string_view bytes);

  // The instances of a node.
  Scenario& List(std::string_view node, const Items& keys, const Items& entries);

  // How many instances a node's list says it has, whatever it has.
  Scenario& Count(std::string_view node, const Items& keys, uint32_t count);

  // A read of a value or of instances that fails.
  Scenario& Fails(std::string_view node, const Items& keys, uint32_t status);

  // All reads that have no statement fail so, and fail no test: for programs that read all there
  // is.
  Scenario& OthersFail(uint32_t status);

  // The `number`-th fallible call from 1, or that of one operation ("Create", "AddInt", "Get",
  // ...), fails; one that makes a list returns none.
  Scenario& FailCall(int number, uint32_t status);
  Scenario& FailCall(std::string_view operation, int number, uint32_t status);

  const std::string& Text() const { return text_; }

 private:
  Scenario& Statement(std::string_view statement);

  std::string text_;
};

// A record of one text field, cut at the field's size and, as kernels do, without a NUL if it
// fills it.
template <class Record>
Record TextRecord(std::string_view text) {
  Record record{};
  std::memcpy(record.text, text.data(), std::min(text.size(), sizeof record.text));
  return record;
}

}  // namespace harness

#endif  // TESTS_HARNESS_SCENARIO_H_
