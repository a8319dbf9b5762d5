// The catalogue of the kernel information tree: the tables of ksi_nodes.h and ksi_records.h as
// data. The size of a record, the signature of the definitions, and how a record is shown and
// written down derive from it.
#ifndef KNVLIBS_CATALOGUE_H_
#define KNVLIBS_CATALOGUE_H_

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>

namespace ksi {

enum class KeyKind : uint8_t { kNumber, kText };

// What a key, or an entry of an instance list, names.
enum class Instance : uint8_t {
  kNone,
#define KSI_INSTANCE(identifier, kind, name) identifier,
  KSI_INSTANCES(KSI_INSTANCE)
#undef KSI_INSTANCE
};

// REQUIRES: `instance` is not kNone.
constexpr KeyKind KindOf(Instance instance) {
#define KSI_INSTANCE(identifier, kind, name) KeyKind::kind,
  constexpr KeyKind kKinds[] = {KSI_INSTANCES(KSI_INSTANCE)};
#undef KSI_INSTANCE
  return kKinds[static_cast<size_t>(instance) - 1];
}

const char* NameOf(Instance instance);

// The memory states of a host, best first; a state's index is its number.
#define KSI_STATE(number, identifier, name, title) name,
constexpr std::string_view kMemoryStates[] = {KSI_MEMORY_STATES(KSI_STATE)};
#undef KSI_STATE

// What a node can be asked for.
enum class Kind : uint8_t { kValue, kList };

// The longest path of keys that selects an instance.
constexpr size_t kMaxKeys = 2;

// The keys that a node takes, in path order.
struct Keying {
  Instance at[kMaxKeys] = {Instance::kNone, Instance::kNone};

  constexpr size_t Count() const {
    return at[0] == Instance::kNone ? 0 : at[1] == Instance::kNone ? 1 : 2;
  }
  friend constexpr bool operator==(const Keying&, const Keying&) = default;
};

enum class FieldType : uint8_t { kUnsigned, kSigned, kBits, kText };

// A named part of a record. `unit` is empty where the meaning says it all.
struct Field {
  const char* name;
  const char* unit;
  const char* meaning;
  uint16_t offset;
  uint16_t width;
  FieldType type;
};

struct Node {
  std::string_view path;
  const char* meaning;

  // The value, a record of `recordSize` bytes; 0: the node has none.
  uint16_t recordSize = 0;
  std::span<const Field> fields;
  Keying valueKeys;

  // What the node's instance list names; kNone: the node has no list.
  Instance entries = Instance::kNone;
  Keying listKeys;

  constexpr bool HasValue() const { return recordSize != 0; }
  constexpr bool HasList() const { return entries != Instance::kNone; }
};

// The largest record of the catalogue fits.
constexpr size_t kMaxRecordSize = 512;

// All nodes; the one at index i has the identifier i + 1.
std::span<const Node> Catalogue();

// The node with this identifier or path, null if there is none.
const Node* FindNode(uint16_t id);
const Node* FindNode(std::string_view path);

// The identifier of a node of the catalogue.
uint16_t IdOf(const Node& node);

}  // namespace ksi

#endif  // KNVLIBS_CATALOGUE_H_
