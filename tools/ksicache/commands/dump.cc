// dump: shows what a cache file holds, to people or as JSON.
#include <algorithm>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "tools/ksicache/commands/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/json_writer.h"
#include "tools/ksicache/node_names.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/reading_walk.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {
namespace {

class Dumper {
 public:
  Dumper(const ksi::CacheFile& file, const CommandLine& line)
      : file_(file), instances_(file), json_(line.Has(kJson)) {
    for (size_t i = 1; i < line.arguments.size(); ++i) {
      const ksi::Node* node = ksi::FindNode(line.arguments[i]);
      if (node == nullptr) throw NoNode(line.arguments[i]);
      only_.insert(node);
    }
  }

  // The number of readings that could not be shown.
  size_t Run() {
    PrintHead();
    ForEachReading(file_, [&](const Reading& reading) {
      if (reading.row == nullptr || reading.row->node == nullptr) {
        if (only_.empty()) Complain(reading, "is of no known node");
        return;
      }
      if (only_.empty() || only_.contains(reading.row->node)) PrintReading(reading);
    });
    if (json_) Print(first_ ? "]\n}\n" : "\n  ]\n}\n");
    return complaints_;
  }

 private:
  void PrintHead() {
    const ksi::CacheFile::Capture& capture = file_.GetCapture();
    if (!json_) {
      if (!only_.empty()) return;
      PrintLine("host       " + capture.host);
      PrintLine("taken      " + capture.taken);
      return;
    }
    Print("{\n  \"ksiCache\": 1,\n  \"host\": " + TextToJson(capture.host) + ",\n  \"taken\": " +
          TextToJson(capture.taken) + ",\n  \"built\": " + TextToJson(capture.built) +
          ",\n  \"signature\": " + TextToJson(capture.signature) + ",\n  \"readings\": [");
  }

  static void PrintName(const Reading& reading) {
    PrintLine("");
    PrintLine(reading.Name());
  }

  void Complain(const Reading& reading, const std::string& what) {
    PrintError(reading.Name() + ": " + what);
    ++complaints_;
  }

  void PrintReading(const Reading& reading) {
    const ksi::Node& node = *reading.row->node;
    const bool value = reading.row->kind == ksi::Kind::kValue;
    if (!reading.goodKeys) {
      Complain(reading, "has keys that the node does not take");
    } else if (reading.status < 0 || reading.status > int64_t{0xffffffff}) {
      Complain(reading, "has no good status");
    } else if (reading.status != ksi::kOk) {
      PrintFailure(reading);
    } else if (value && reading.value.size() != node.recordSize) {
      Complain(reading, "has " + std::to_string(reading.value.size()) + " bytes, its record " +
                            std::to_string(node.recordSize));
    } else if (!value && reading.type != SQLITE_INTEGER) {
      Complain(reading, "has no number of instances");
    } else if (value) {
      PrintValue(reading);
    } else {
      PrintList(reading);
    }
  }

  // One reading, one line: such files compare well.
  void PrintJson(const Reading& reading, std::string_view member, const std::string& answer) {
    JsonWriter keys;
    for (size_t i = 0; i < reading.keys.count; ++i) {
      const ksi::Key& key = reading.keys[i];
      key.kind == ksi::KeyKind::kNumber ? keys.Number("", key.number) : keys.Text("", key.text);
    }
    const std::string line = JsonWriter()
                                 .Text("node", reading.row->path)
                                 .Json("keys", keys.Array())
                                 .Json(member, answer)
                                 .Object();
    Print(first_ ? "\n    " : ",\n    ");
    Print(line);
    first_ = false;
  }

  void PrintFailure(const Reading& reading) {
    const std::string status = Hex(static_cast<ksi::Status>(reading.status));
    if (json_) {
      PrintJson(reading, "status", TextToJson(status));
    } else {
      PrintName(reading);
      PrintLine("    failed with " + status);
    }
  }

  void PrintValue(const Reading& reading) {
    const ksi::Node& node = *reading.row->node;
    if (json_) {
      PrintJson(reading, "value", RecordToJson(node, reading.value));
      return;
    }
    PrintName(reading);
    size_t width = 0;
    for (const ksi::Field& field : node.fields) {
      width = std::max(width, std::string_view(field.name).size());
    }
    for (const ksi::Field& field : node.fields) {
      std::string line = field.name;
      line.resize(width, ' ');
      if (field.type == ksi::FieldType::kText) {
        line += "  " + std::string(TextOf(field, reading.value));
      } else {
        const std::string number = NumberToText(field, reading.value);
        line += "  " + std::string(20 - std::min<size_t>(20, number.size()), ' ') + number;
        if (*field.unit != '\0') line += std::string(" ") + field.unit;
      }
      PrintLine("    " + line);
    }
    ForEachUnused(node, reading.value, [](const std::string& name, const std::string& hex) {
      PrintLine("    " + name + "  " + hex);
    });
  }

  // Text that is not UTF-8 looks the same in both.
  std::string EntryOf(const ksi::Statement& row) const {
    if (row.Type(1) == SQLITE_INTEGER) return std::to_string(row.Number(1));
    const std::string_view text = row.Text(1);
    return json_ || !IsUtf8(text) ? TextToJson(text) : std::string(text);
  }

  void PrintEntries(const Reading& reading, const std::vector<std::string>& entries) {
    if (!json_) {
      PrintName(reading);
      for (const std::string& entry : entries) PrintLine("    " + entry);
      return;
    }
    JsonWriter list;
    for (const std::string& entry : entries) list.Json("", entry);
    PrintJson(reading, "instances", list.Array());
  }

  void PrintList(const Reading& reading) {
    std::vector<std::string> entries;
    int64_t position = 0;
    bool good = true;
    instances_.ForEach(reading, [&](int64_t at, const ksi::Statement& row) {
      good = good && at == position++ && position <= reading.count;
      if (good) entries.push_back(EntryOf(row));
    });
    if (!good || position != reading.count) {
      Complain(reading, "is a list with gaps");
    } else {
      PrintEntries(reading, entries);
    }
  }

  const ksi::CacheFile& file_;
  InstanceWalk instances_;
  bool json_;
  std::set<const ksi::Node*> only_;
  bool first_ = true;
  size_t complaints_ = 0;
};

constexpr const Option* kOptions[] = {&kJson};

int Dump(const CommandLine& line) {
  return ForEachFile({line.arguments[0]}, [&line](const std::string& fileName) {
    const OpenedFile opened(fileName);
    return Dumper(opened.File(), line).Run() == 0;
  });
}

}  // namespace

const Command kDump = {
    .name = "dump",
    .arguments = "FILE [NODE...]",
    .summary = "show what FILE holds, of all nodes or of those named",
    .help = R"(Shows what FILE holds, each field of each record with its unit, of all nodes or
of those named, such as sched/groups/groupName.
)",
    .options = kOptions,
    .fewest = 1,
    .most = Command::kAnyNumber,
    .run = Dump,
};

}  // namespace ksicache
