#include "tools/ksicache/page/memory_rows.h"

#include <optional>
#include <utility>
#include <vector>

#include "tools/ksicache/diff/memory.h"
#include "tools/ksicache/diff/text.h"
#include "tools/ksicache/json_writer.h"

namespace ksicache {
namespace {

using tally::Kind;

constexpr RowColumn kColumns[] = {
    {"part",
     "number of the part, of the host or of what is not known",
     Kind::id,
     true,
     false,
     false,
     "",
     {}},
    {"identity", "what tells things of a part apart", Kind::text, true, false, false, "", {}},
    {"path", "the same after the host was started anew", Kind::text, false, false, false, "", {}},
    {"name", "what it is called", Kind::text, false, false, false, "", {}},
    {"number", "the kernel's number of the group", Kind::id, false, false, true, "", {}},
    {"bytes", "memory", Kind::bytes, false, false, true, "Bytes", {}},
};

// Those that two moments are compared by, in the order of their numbers.
constexpr Part kCompared[] = {Part::machines,   Part::overheads, Part::userWorlds,
                              Part::pageTables, Part::heaps,     Part::groups};

// Behind these: figures of the host, and the parts of which something is missing.
constexpr uint64_t kHost = std::size(kCompared);
constexpr uint64_t kUnknown = kHost + 1;

Value TextOf(std::string_view text) { return {ValueType::text, 0, text}; }

Value NumberOf(std::optional<int64_t> number) {
  if (!number) return {ValueType::none, 0, {}};
  return {ValueType::signedNumber, static_cast<uint64_t>(*number), {}};
}

class Writer {
 public:
  Writer(TableStream& stream, const Names& names) : stream_(stream), names_(names) {
    stream_.Begin(kColumns);
  }

  // `byPath`: the same with paths as identities, if there are any.
  void Put(const Memory& memory, const Memory* byPath) {
    PutHost(memory.host);
    for (size_t i = 0; i < std::size(kCompared); ++i) PutPart(i, memory, byPath);
  }

 private:
  void PutPart(uint64_t number, const Memory& memory, const Memory* byPath) {
    const PartInfo& info = InfoOf(kCompared[number]);
    const auto& [things, isWhole] = memory.Of(info.part);
    if (!isWhole) {
      PutRow(kUnknown, info.name, std::nullopt, info.name, std::nullopt, std::nullopt);
    }
    for (size_t i = 0; i < things.size(); ++i) {
      const Amount& thing = things[i];
      PutRow(number, thing.identity, PathOf(byPath, info.part, i), NameOf(info, thing),
             thing.number < 0 ? std::nullopt : std::make_optional(thing.number), thing.bytes);
    }
  }

  std::string NameOf(const PartInfo& info, const Amount& thing) const {
    const std::string_view source = info.source;
    const auto names = names_.find(source.substr(0, source.find(' ')));
    return names == names_.end() ? NameText(thing.name, -1)
                                 : names->second.Of(thing.name, thing.number);
  }

  static std::optional<std::string_view> PathOf(const Memory* byPath, Part part, size_t place) {
    if (byPath == nullptr) return std::nullopt;
    const std::vector<Amount>& things = byPath->Of(part).amounts;
    return place < things.size() ? std::make_optional<std::string_view>(things[place].identity)
                                 : std::nullopt;
  }

  void PutHost(const HostMemory& host) {
    const std::pair<const char*, std::optional<int64_t>> figures[] = {{"total", host.total},
                                                                      {"free", host.free},
                                                                      {"kernel", host.kernel},
                                                                      {"caches", host.caches},
                                                                      {"others", host.others}};
    for (const auto& [name, bytes] : figures) {
      PutRow(kHost, name, std::nullopt, name, std::nullopt, bytes);
    }
  }

  void PutRow(uint64_t part, std::string_view identity, std::optional<std::string_view> path,
              std::string_view name, std::optional<int64_t> number, std::optional<int64_t> bytes) {
    const Value values[] = {{ValueType::unsignedNumber, part, {}},
                            TextOf(identity),
                            path ? TextOf(*path) : Value{ValueType::none, 0, {}},
                            TextOf(name),
                            NumberOf(number),
                            NumberOf(bytes)};
    stream_.Row(values);
  }

  TableStream& stream_;
  const Names& names_;
};

}  // namespace

void PutMemoryRows(const Origin& origin, bool hasPaths, TableStream& stream, std::string& bytes,
                   const Names& names, Problems& problems) {
  const Memory memory = ReadMemory(origin, {});
  std::optional<Memory> byPath;
  if (hasPaths) byPath = ReadMemory(origin, {.byPath = true});
  problems.AddDiagnostics();
  for (const std::string& complaint : memory.complaints) problems.Add(complaint);
  Writer(stream, names).Put(memory, byPath ? &*byPath : nullptr);
  stream.End(true, bytes);
}

std::string PartsToJson() {
  JsonWriter parts;
  for (const Part part : kCompared) {
    const PartInfo& info = InfoOf(part);
    parts.Json("", JsonWriter()
                       .Text("name", info.name)
                       .Text("source", info.source)
                       .Flag("isAdded", info.isAdded)
                       .Object());
  }
  return parts.Array();
}

}  // namespace ksicache
