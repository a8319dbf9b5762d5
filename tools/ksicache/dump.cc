// dump: shows what a cache file holds, to people or as JSON.
#include <algorithm>
#include <set>
#include <string>

#include "tools/ksicache/commands.h"
#include "tools/ksicache/error.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/reading_walk.h"
#include "tools/ksicache/record_json.h"

namespace ksicache {
namespace {

class Dumper {
 public:
  Dumper(const ksi::CacheFile& file, const Options& options)
      : file_(file), instances_(file), json_(options.json) {
    for (size_t i = 1; i < options.arguments.size(); ++i) {
      const ksi::Node* node = ksi::FindNode(options.arguments[i]);
      if (node == nullptr) throw UsageError("there is no node " + options.arguments[i]);
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
      Print("host       " + Printable(capture.host) + "\n");
      Print("taken      " + capture.taken + "\n");
      return;
    }
    Print("{\n  \"ksiCache\": 1,\n  \"host\": " + TextToJson(capture.host).dump() +
          ",\n  \"taken\": " + TextToJson(capture.taken).dump() +
          ",\n  \"built\": " + TextToJson(capture.built).dump() +
          ",\n  \"signature\": " + TextToJson(capture.signature).dump() + ",\n  \"readings\": [");
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
  void PrintJson(const Reading& reading, const char* member, const Json& answer) {
    Json keys = Json::array();
    for (size_t i = 0; i < reading.keys.count; ++i) {
      const ksi::Key& key = reading.keys[i];
      keys.push_back(key.kind == ksi::KeyKind::kNumber ? Json(key.number) : TextToJson(key.text));
    }
    const Json line = {{"node", reading.row->path}, {"keys", keys}, {member, answer}};
    Print(first_ ? "\n    " : ",\n    ");
    Print(line.dump());
    first_ = false;
  }

  void PrintFailure(const Reading& reading) {
    const std::string status = Hex(static_cast<ksi::Status>(reading.status));
    if (json_) {
      PrintJson(reading, "status", status);
    } else {
      Print("\n" + reading.Name() + "\n    failed with " + status + "\n");
    }
  }

  void PrintValue(const Reading& reading) {
    const ksi::Node& node = *reading.row->node;
    if (json_) {
      PrintJson(reading, "value", RecordToJson(node, reading.value));
      return;
    }
    Print("\n" + reading.Name() + "\n");
    size_t width = 0;
    for (const ksi::Field& field : node.fields) {
      width = std::max(width, std::string_view(field.name).size());
    }
    for (const ksi::Field& field : node.fields) {
      std::string line = field.name;
      line.resize(width, ' ');
      if (field.type == ksi::FieldType::kText) {
        line += "  " + Printable(TextOf(field, reading.value));
      } else {
        const std::string number = NumberToText(field, reading.value);
        line += "  " + std::string(20 - std::min<size_t>(20, number.size()), ' ') + number;
        if (*field.unit != '\0') line += std::string(" ") + field.unit;
      }
      Print("    " + line + "\n");
    }
    ForEachUnused(node, reading.value, [](const std::string& name, const std::string& hex) {
      Print("    " + name + "  " + hex + "\n");
    });
  }

  void PrintList(const Reading& reading) {
    Json entries = Json::array();
    int64_t position = 0;
    bool good = true;
    instances_.ForEach(reading, [&](int64_t at, const ksi::Statement& row) {
      good = good && at == position++ && position <= reading.count;
      if (!good) return;
      if (row.Type(1) == SQLITE_INTEGER) {
        entries.push_back(row.Number(1));
      } else {
        entries.push_back(TextToJson(row.Text(1)));
      }
    });
    if (!good || position != reading.count) {
      Complain(reading, "is a list with gaps");
    } else if (json_) {
      PrintJson(reading, "instances", entries);
    } else {
      Print("\n" + reading.Name() + "\n");
      for (const Json& entry : entries) {
        Print("    " + (entry.is_string() ? Printable(entry.get<std::string>()) : entry.dump()) +
              "\n");
      }
    }
  }

  const ksi::CacheFile& file_;
  InstanceWalk instances_;
  bool json_;
  std::set<const ksi::Node*> only_;
  bool first_ = true;
  size_t complaints_ = 0;
};

}  // namespace

int Dump(const Options& options) {
  if (options.arguments.empty()) throw UsageError("dump takes a file");
  const std::unique_ptr<ksi::CacheFile> file = OpenCacheFile(options.arguments[0]);
  return Dumper(*file, options).Run() == 0 ? 0 : 1;
}

}  // namespace ksicache
