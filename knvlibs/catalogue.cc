#include "knvlibs/catalogue.h"

#include <algorithm>
#include <array>
#include <type_traits>

#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>

namespace ksi {
namespace {

template <class T>
constexpr FieldType TypeOf(std::string_view unit) {
  if (unit == "bits") return FieldType::kBits;
  return std::is_signed_v<T> ? FieldType::kSigned : FieldType::kUnsigned;
}

// What is known of the value of a node.
struct Layout {
  uint16_t size = 0;
  std::span<const Field> fields = {};
};

#define FIELD(offset, type, name, unit, meaning) \
  {#name, unit, meaning, offset, sizeof(type), TypeOf<type>(unit)},
#define TEXT(offset, size, name, meaning) {#name, "", meaning, offset, size, FieldType::kText},
#define GAP(offset, size)
#define ONE(...) +1  // NOLINT(bugprone-macro-parentheses): a term
#define RECORD(record, size)                                                              \
  constexpr std::array<Field, 0 KSI_RECORD_##record(ONE, ONE, GAP)> k##record##Fields = { \
      {KSI_RECORD_##record(FIELD, TEXT, GAP)}};                                           \
  constexpr Layout k##record##Layout = {size, k##record##Fields};
#define NUMBER(record, type, name, unit, meaning)                              \
  constexpr Field k##record##Fields[] = {FIELD(0, type, name, unit, meaning)}; \
  constexpr Layout k##record##Layout = {sizeof(type), k##record##Fields};
KSI_RECORDS(RECORD)
KSI_NUMBERS(NUMBER)
constexpr Layout kNoneLayout;

// A buddy's buffers are named by their size, as "free4KB" and "used4KB".
#define BUFFERS(size) "free" size, "used" size,
constexpr const char* kBufferNames[] = {KSI_BUDDY_SIZE_TABLE(BUFFERS)};

constexpr auto kBuddyStatsFields = [] {
  std::array<Field, std::size(kBufferNames)> fields{};
  for (size_t i = 0; i < fields.size(); ++i) {
    const size_t at = offsetof(KSI_BuddyStats, buffers) + i / 2 * kBuddyBuffersLayout.size;
    fields[i] = kBuddyBuffersLayout.fields[i % 2];
    fields[i].name = kBufferNames[i];
    fields[i].offset = static_cast<uint16_t>(fields[i].offset + at);
  }
  return fields;
}();
constexpr Layout kBuddyStatsLayout = {sizeof(KSI_BuddyStats), kBuddyStatsFields};

constexpr Keying Keys() { return {}; }
constexpr Keying Keys(Instance first, Instance second = Instance::kNone) {
  return {{first, second}};
}

// A path is a node's name with '/' for '_'.
template <size_t size>
struct Path {
  char text[size];
};
template <size_t size>
constexpr Path<size> MakePath(const char (&name)[size]) {
  Path<size> path{};
  std::transform(name, name + size, path.text, [](char c) { return c == '_' ? '/' : c; });
  return path;
}
#define PATH(name, record, keys, entries, listKeys, meaning) \
  constexpr auto kPath_##name = MakePath(#name);
KSI_NODES(PATH)

constexpr Node MakeNode(std::string_view path, const char* meaning, const Layout& value,
                        const Keying& keys, Instance entries, const Keying& listKeys) {
  return {path, meaning, value.size, value.fields, keys, entries, listKeys};
}

using enum Instance;
#define ROW(name, record, keys, entries, listKeys, meaning) \
  MakeNode(kPath_##name.text, meaning, k##record##Layout, Keys keys, entries, Keys listKeys),
constexpr Node kNodes[] = {KSI_NODES(ROW)};

static_assert(std::ranges::all_of(kNodes, [](const Node& node) {
  return node.recordSize <= kMaxRecordSize && (node.HasValue() || node.HasList());
}));
// Fields stand in the order of their offsets, inside the record, and do not overlap.
static_assert(std::ranges::all_of(kNodes, [](const Node& node) {
  size_t end = 0;
  for (const Field& field : node.fields) {
    if (field.offset < end) return false;
    end = size_t{field.offset} + field.width;
  }
  return end <= node.recordSize;
}));

}  // namespace

const char* NameOf(Instance instance) {
#define NAME(identifier, kind, name) name,
  static constexpr const char* kNames[] = {"none", KSI_INSTANCES(NAME)};
  return kNames[static_cast<size_t>(instance)];
}

std::span<const Node> Catalogue() { return kNodes; }

const Node* FindNode(uint16_t id) {
  return id >= 1 && id <= std::size(kNodes) ? &kNodes[id - 1] : nullptr;
}

const Node* FindNode(std::string_view path) {
  const auto* found = std::ranges::find(kNodes, path, &Node::path);
  return found == std::end(kNodes) ? nullptr : found;
}

uint16_t IdOf(const Node& node) { return static_cast<uint16_t>(&node - kNodes + 1); }

}  // namespace ksi
