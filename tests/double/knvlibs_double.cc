// The test double of libknvlibs.so. It stands in the library's place with LD_LIBRARY_PATH, answers
// what a scenario tells it to, writes a trace of the calls, and watches how its lists are used.
//
// The scenario, whose path is in the environment variable TALLY_DOUBLE_SCENARIO, has one statement
// a line. KEYS is [4] or [2,'name'], without keys []; STATUS and numbers are decimal or 0x...
//
//   trace PATH                      where the trace goes
//   time SECONDS                    what time() returns to the program
//   signature STATUS 'kernel build date' 'application build date'
//   cache STATUS                    what KSI_UseCache returns
//   value NODE KEYS HEX             bytes of a value
//   list NODE KEYS [ENTRY...]       instances: 5, 'name', or !STATUS for one that cannot be read
//   count NODE KEYS NUMBER          how many instances their list says it has
//   status NODE KEYS STATUS         a read that fails
//   others STATUS                   what every read fails with that has no statement; without this
//                                   one, such a read is a misuse
//   fail NUMBER STATUS              the NUMBER-th (from 1) of all fallible calls fails
//   fail OPERATION NUMBER STATUS    the NUMBER-th call of one operation fails
//
// The trace has one call a line, such as "AddInt(4)" or "Get(sched_groups_groupName,[4])"; a
// failure adds "=STATUS" or "=NULL". Calls on an instance list name the read that filled it. Three
// other kinds of line: "Warning 'text'", "! misuse of the interface", and "exit", the last line of
// every process that ended in good order.
//
// Destroyed lists are kept, marked and overwritten, so that each later use of one is found.
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <deque>
#include <fstream>
#include <map>
#include <memory>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <utility>
#include <vector>

#include <knvlibs/ksi.h>
#include <knvlibs/ksi_nodes.h>
#include <knvlibs/ksi_records.h>
#include <knvlibs/ksi_status.h>
#include "tests/double/script.h"

#define TALLY_DOUBLE_EXPORT extern "C" __attribute__((visibility("default")))

namespace {

struct Node {
  const char* name;
  size_t size;
};

constexpr Node kNodes[] = {
#define NODE(name, record, keys, entries, listKeys, meaning) {#name, KSI_SIZE_##record},
    KSI_NODES(NODE)
#undef NODE
};

enum NodeIndex : unsigned {
#define NODE(name, record, keys, entries, listKeys, meaning) kIndexOf_##name,
  KSI_NODES(NODE)
#undef NODE
};

// Scattered over 16 bits, so that nobody gets by with assumed values. The factor is odd: no two
// nodes share a value.
constexpr uint16_t NodeValue(unsigned index) { return static_cast<uint16_t>(40503U * (index + 1)); }

struct Entry {
  enum Kind { kNumber, kText, kUnreadable };
  Kind kind = kNumber;
  uint64_t number = 0;
  std::string text;
  uint32_t status = 0;
};

}  // namespace

struct KSI_ParamList {
  std::deque<Entry> entries;  // a deque: handed out texts stay where they are
  size_t capacity = 0;
  size_t textRoom = 0;
  std::string madeBy;     // for messages
  std::string instances;  // of an instance list: "node,keys"
  bool destroyed = false;
};

namespace {

uint64_t Number(const std::string& word) { return std::strtoull(word.c_str(), nullptr, 0); }

uint32_t StatusOf(const std::string& word) { return static_cast<uint32_t>(Number(word)); }

// Lists whose makers do not say get room for this much text.
constexpr size_t kDefaultTextRoom = 4096;

std::string KeysText(const KSI_ParamList* keys) {
  std::string text = "[";
  for (const Entry& entry : keys->entries) {
    if (text.size() > 1) text += ',';
    text += entry.kind == Entry::kText ? script::Quote(entry.text)
                                       : std::to_string(static_cast<int64_t>(entry.number));
  }
  return text + "]";
}

class Double {
 public:
  Double() {
    const char* path = std::getenv(script::kScenarioVariable);
    std::ifstream scenario(path == nullptr ? "" : path);
    if (!scenario) {
      std::fprintf(stderr, "the test double needs a scenario: set %s\n", script::kScenarioVariable);
      std::abort();
    }
    for (std::string line; std::getline(scenario, line);) {
      const std::vector<std::string> words = script::Words(line);
      if (!words.empty() && !Statement(words)) Misuse("scenario not understood: " + line);
    }
  }

  time_t Now() const { return now_; }
  const std::string& AppBuild() const { return appBuild_; }
  const std::string& KernelBuild() const { return kernelBuild_; }
  uint32_t SignatureStatus() const { return signatureStatus_; }
  uint32_t CacheStatus() const { return cacheStatus_; }

  void Trace(const std::string& line) const {
    if (trace_ < 0) return;
    const std::string text = line + "\n";
    if (write(trace_, text.data(), text.size()) < 0) std::abort();
  }

  void Misuse(const std::string& what) const { Trace("! " + what); }

  // Whether the scenario makes this fallible call of `operation` fail, and how. Counts the call.
  uint32_t Injected(const std::string& operation) {
    const int call = ++calls_;
    const int ofOperation = ++callsOf_[operation];
    const auto byCall = failures_.find({"", call});
    if (byCall != failures_.end()) return byCall->second;
    const auto byOperation = failures_.find({operation, ofOperation});
    return byOperation == failures_.end() ? 0 : byOperation->second;
  }

  // `list` if it can be used, otherwise nullptr and a misuse.
  KSI_ParamList* Usable(KSI_ParamList* list, const char* operation) const {
    if (!known_.contains(list)) {
      Misuse(std::string(operation) + " of what is no list");
      return nullptr;
    }
    if (list->destroyed) {
      Misuse(std::string(operation) + " of a destroyed list: " + list->madeBy);
      return nullptr;
    }
    return list;
  }

  KSI_ParamList* Make(size_t capacity, size_t textRoom, std::string madeBy) {
    lists_.push_back(std::make_unique<KSI_ParamList>());
    KSI_ParamList* list = lists_.back().get();
    known_.insert(list);
    list->capacity = capacity;
    list->textRoom = textRoom;
    list->madeBy = std::move(madeBy);
    return list;
  }

  const Node* Find(uint16_t value, const char* operation) const {
    for (unsigned i = 0; i < std::size(kNodes); ++i) {
      if (NodeValue(i) == value) return &kNodes[i];
    }
    Misuse(std::string(operation) + " of no node: " + std::to_string(value));
    return nullptr;
  }

  // The status scripted for a read, and the value or instances if it is 0.
  uint32_t Value(const std::string& read, std::string* bytes) const {
    return Answer(values_, read, bytes);
  }
  uint32_t Instances(const std::string& read, std::vector<Entry>* entries) const {
    return Answer(instances_, read, entries);
  }

  // How many entries the list says it has.
  uint32_t Count(const KSI_ParamList* list) const {
    const auto count = counts_.find(list->instances);
    return count == counts_.end() ? static_cast<uint32_t>(list->entries.size()) : count->second;
  }

  void Exit() const {
    for (const auto& list : lists_) {
      if (!list->destroyed) {
        Misuse("leaked list: " + (list->instances.empty()
                                      ? list->madeBy + " " + KeysText(list.get())
                                      : list->instances));
      }
    }
    Trace("exit");
  }

 private:
  template <class Content>
  uint32_t Answer(const std::unordered_map<std::string, Content>& answers, const std::string& read,
                  Content* content) const {
    const auto status = statuses_.find(read);
    if (status != statuses_.end()) return status->second;
    const auto answer = answers.find(read);
    if (answer == answers.end()) {
      if (othersStatus_ != 0) return othersStatus_;
      Misuse("the scenario has no answer: " + read);
      return KSI_STATUS_NOT_FOUND;
    }
    *content = answer->second;
    return 0;
  }

  bool Statement(const std::vector<std::string>& words) {
    const std::string& verb = words[0];
    const size_t count = words.size();
    if (verb == "trace" && count == 2) {
      // Out of the way of standard streams, which may be closed.
      constexpr int kFirstOwnFile = 50;
      const int file = open(words[1].c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
      trace_ = fcntl(file, F_DUPFD_CLOEXEC, kFirstOwnFile);
      close(file);
      return trace_ >= 0;
    }
    if (verb == "time" && count == 2) {
      now_ = static_cast<time_t>(Number(words[1]));
      return true;
    }
    if (verb == "signature" && count == 4) {
      signatureStatus_ = StatusOf(words[1]);
      kernelBuild_ = script::Unquote(words[2]);
      appBuild_ = script::Unquote(words[3]);
      return true;
    }
    if (verb == "cache" && count == 2) {
      cacheStatus_ = StatusOf(words[1]);
      return true;
    }
    if (verb == "others" && count == 2) {
      othersStatus_ = StatusOf(words[1]);
      return true;
    }
    if (verb == "fail" && (count == 3 || count == 4)) {
      const std::string operation = count == 4 ? words[1] : "";
      const int number = static_cast<int>(Number(words[count - 2]));
      failures_[{operation, number}] = StatusOf(words[count - 1]);
      return true;
    }
    return count >= 3 && Read(words);
  }

  bool Read(const std::vector<std::string>& words) {
    const bool known = std::any_of(std::begin(kNodes), std::end(kNodes),
                                   [&words](const Node& node) { return node.name == words[1]; });
    if (!known) return false;
    const std::string read = words[1] + "," + words[2];
    if (words[0] == "status" && words.size() == 4) {
      statuses_[read] = StatusOf(words[3]);
      return true;
    }
    if (words[0] == "count" && words.size() == 4) {
      counts_[read] = static_cast<uint32_t>(Number(words[3]));
      return true;
    }
    statuses_.erase(read);
    if (words[0] == "value" && words.size() == 4) {
      values_[read] = script::Unhex(words[3]);
      return true;
    }
    if (words[0] != "list") return false;
    std::vector<Entry>& entries = instances_[read];
    entries.clear();
    for (size_t i = 3; i < words.size(); ++i) {
      Entry entry;
      if (words[i][0] == '\'') {
        entry.kind = Entry::kText;
        entry.text = script::Unquote(words[i]);
      } else if (words[i][0] == '!') {
        entry.kind = Entry::kUnreadable;
        entry.status = StatusOf(words[i].substr(1));
      } else {
        entry.number = Number(words[i]);
      }
      entries.push_back(std::move(entry));
    }
    return true;
  }

  int trace_ = -1;
  time_t now_ = 0;
  std::string kernelBuild_ = "Nov 21 2026 10:00:00";
  std::string appBuild_ = "Nov 21 2026 10:00:00";
  uint32_t signatureStatus_ = 0;
  uint32_t cacheStatus_ = 0;
  uint32_t othersStatus_ = 0;
  std::unordered_map<std::string, std::string> values_;
  std::unordered_map<std::string, std::vector<Entry>> instances_;
  std::unordered_map<std::string, uint32_t> statuses_;
  std::unordered_map<std::string, uint32_t> counts_;
  std::map<std::pair<std::string, int>, uint32_t> failures_;
  std::map<std::string, int> callsOf_;
  int calls_ = 0;
  std::vector<std::unique_ptr<KSI_ParamList>> lists_;  // in the order they were made
  std::unordered_set<const KSI_ParamList*> known_;
};

// Never destroyed: the program may use lists until its very end.
Double& TheDouble() {
  static Double& instance = *new Double;
  return instance;
}

__attribute__((constructor)) void Start() { TheDouble(); }
__attribute__((destructor)) void End() { TheDouble().Exit(); }

// Traces a fallible call that ended with `status`.
uint32_t Ended(const std::string& call, uint32_t status) {
  TheDouble().Trace(status == 0 ? call : call + "=" + script::Status(status));
  return status;
}

std::string Call(const std::string& operation, const std::string& arguments) {
  return operation + "(" + arguments + ")";
}

KSI_ParamList* Create(const char* operation, int version, const std::string& arguments,
                      int capacity, size_t textRoom) {
  Double& the = TheDouble();
  const std::string call = Call(operation, std::to_string(version) + "," + arguments);
  if (version != 1) the.Misuse(call + ": the version is not 1");
  if (capacity < 0) the.Misuse(call + ": the capacity is negative");
  if (the.Injected(operation) != 0 || version != 1 || capacity < 0) {
    the.Trace(call + "=NULL");
    return nullptr;
  }
  the.Trace(call);
  return the.Make(static_cast<size_t>(capacity), textRoom, call);
}

uint32_t Add(KSI_ParamList* list, const char* operation, const std::string& argument, Entry entry) {
  Double& the = TheDouble();
  const std::string call = Call(operation, argument);
  const uint32_t injected = the.Injected(operation);
  if (the.Usable(list, operation) == nullptr) return Ended(call, KSI_STATUS_BAD_PARAM);
  if (!list->instances.empty()) the.Misuse(call + " to an instance list");
  if (injected != 0) return Ended(call, injected);
  size_t text = entry.kind == Entry::kText ? entry.text.size() + 1 : 0;
  for (const Entry& other : list->entries) text += other.text.size() + 1;
  if (list->entries.size() == list->capacity || text > list->textRoom) {
    the.Misuse(call + " to a full list: " + list->madeBy);
    return Ended(call, KSI_STATUS_TOO_MANY_ELEMENTS);
  }
  list->entries.push_back(std::move(entry));
  return Ended(call, 0);
}

// A read up to the point where its answer is known.
struct Read {
  const Node* node = nullptr;
  std::string key;   // of the scenario
  std::string call;  // of the trace
  uint32_t status = 0;
};

Read StartRead(const char* operation, uint16_t nodeValue, KSI_ParamList* keys,
               const std::string& more) {
  Double& the = TheDouble();
  Read read;
  const uint32_t injected = the.Injected(operation);
  read.node = the.Find(nodeValue, operation);
  const bool usable = keys == nullptr || the.Usable(keys, operation) != nullptr;
  if (read.node == nullptr || !usable) {
    read.call = Call(operation, "?");
    read.status = KSI_STATUS_INVALID_NODE;
    return read;
  }
  const std::string keysText = keys == nullptr ? "" : "," + KeysText(keys);
  read.key = std::string(read.node->name) + (keys == nullptr ? ",[]" : keysText);
  read.call = Call(operation, read.node->name + keysText + more);
  read.status = injected;
  return read;
}

// Reads the instances into `list`, or into one made to fit if it is null.
uint32_t ReadInstances(Read read, KSI_ParamList* list, KSI_ParamList** made) {
  Double& the = TheDouble();
  std::vector<Entry> entries;
  if (read.status == 0) read.status = the.Instances(read.key, &entries);
  size_t text = 0;
  for (const Entry& entry : entries) text += entry.text.size() + 1;
  if (read.status == 0 && list != nullptr &&
      (entries.size() > list->capacity || text > list->textRoom)) {
    read.status = KSI_STATUS_TOO_MANY_ELEMENTS;
  }
  if (read.status == 0) {
    if (list == nullptr) {
      list = the.Make(entries.size(), text, read.call);
      *made = list;
    }
    list->entries.assign(entries.begin(), entries.end());
    list->instances = read.key;
  }
  return Ended(read.call, read.status);
}

// Gives the entry at `index` to `take` if it is one of `kind`.
template <class Take>
uint32_t ReadEntry(KSI_ParamList* list, const char* operation, uint32_t index, Entry::Kind kind,
                   Take take) {
  Double& the = TheDouble();
  const uint32_t injected = the.Injected(operation);
  if (the.Usable(list, operation) == nullptr) {
    return Ended(Call(operation, "?"), KSI_STATUS_BAD_PARAM);
  }
  const std::string call = Call(operation, list->instances + "," + std::to_string(index));
  if (injected != 0) return Ended(call, injected);
  if (index >= list->entries.size()) return Ended(call, KSI_STATUS_NOT_FOUND);
  const Entry& entry = list->entries[index];
  if (entry.kind == Entry::kUnreadable) return Ended(call, entry.status);
  if (entry.kind != kind) return Ended(call, KSI_STATUS_BAD_PARAM_TYPE);
  take(entry);
  return Ended(call, 0);
}

}  // namespace

#define NODE(name, record, keys, entries, listKeys, meaning)                         \
  extern "C" __attribute__((visibility("default"))) const uint16_t KSI_NODE_##name = \
      NodeValue(kIndexOf_##name);
KSI_NODES(NODE)
#undef NODE

TALLY_DOUBLE_EXPORT uint32_t KSI_UseCache(const char* fileName, int flags) {
  Double& the = TheDouble();
  const std::string call = Call("UseCache", script::Quote(fileName) + "," + std::to_string(flags));
  const uint32_t injected = the.Injected("UseCache");
  return Ended(call, injected != 0 ? injected : the.CacheStatus());
}

TALLY_DOUBLE_EXPORT uint32_t KSI_CheckSig(char* buildBuffer, size_t size, const char** appBuild) {
  Double& the = TheDouble();
  constexpr size_t kBuildSize = 21;
  if (size != kBuildSize) the.Misuse("CheckSig: a buffer of " + std::to_string(size) + " bytes");
  // A longer text fills the buffer to its last byte, without a NUL.
  const std::string& kernelBuild = the.KernelBuild();
  std::memcpy(buildBuffer, kernelBuild.c_str(),
              std::min({size, kBuildSize, kernelBuild.size() + 1}));
  *appBuild = the.AppBuild().c_str();
  const uint32_t injected = the.Injected("CheckSig");
  return Ended("CheckSig()", injected != 0 ? injected : the.SignatureStatus());
}

TALLY_DOUBLE_EXPORT uint32_t KSI_Get(uint16_t node, KSI_ParamList* keys, void* buffer,
                                     size_t size) {
  Double& the = TheDouble();
  Read read = StartRead("Get", node, keys, "");
  std::string bytes;
  if (read.status == 0) read.status = the.Value(read.key, &bytes);
  if (read.node != nullptr && size != read.node->size) {
    the.Misuse(read.call + ": a buffer of " + std::to_string(size) + " bytes for a value of " +
               std::to_string(read.node->size));
    read.status = KSI_STATUS_LENGTH_MISMATCH;
  }
  if (read.status == 0 && bytes.size() != size) {
    the.Misuse(read.call + ": the scenario's value has " + std::to_string(bytes.size()) + " bytes");
    read.status = KSI_STATUS_LENGTH_MISMATCH;
  }
  if (read.status == 0) std::memcpy(buffer, bytes.data(), size);
  return Ended(read.call, read.status);
}

TALLY_DOUBLE_EXPORT uint32_t KSI_GetInstanceList(uint16_t node, KSI_ParamList* keys,
                                                 KSI_ParamList* list) {
  Read read = StartRead("GetInstanceList", node, keys, "");
  if (TheDouble().Usable(list, "GetInstanceList") == nullptr) {
    return Ended(read.call, KSI_STATUS_BAD_PARAM);
  }
  return ReadInstances(std::move(read), list, nullptr);
}

TALLY_DOUBLE_EXPORT uint32_t KSI_GetInstanceListAlloc(uint16_t node, KSI_ParamList* keys,
                                                      KSI_ParamList** list) {
  return ReadInstances(StartRead("GetInstanceListAlloc", node, keys, ""), nullptr, list);
}

TALLY_DOUBLE_EXPORT uint32_t KSI_GetInstanceListAllocHint(uint16_t node, KSI_ParamList* keys,
                                                          uint32_t hint, KSI_ParamList** list) {
  const std::string more = "," + std::to_string(hint);
  return ReadInstances(StartRead("GetInstanceListAllocHint", node, keys, more), nullptr, list);
}

TALLY_DOUBLE_EXPORT KSI_ParamList* KSI_ParamListCreate(int version, int capacity) {
  return Create("Create", version, std::to_string(capacity), capacity, kDefaultTextRoom);
}

TALLY_DOUBLE_EXPORT KSI_ParamList* KSI_ParamListCreateAndAllocateParams(int version, int capacity,
                                                                        size_t bytes) {
  const std::string arguments = std::to_string(capacity) + "," + std::to_string(bytes);
  return Create("CreateAndAllocateParams", version, arguments, capacity, bytes);
}

TALLY_DOUBLE_EXPORT uint32_t KSI_ParamListAddInt(KSI_ParamList* list, uint64_t value) {
  return Add(list, "AddInt", std::to_string(static_cast<int64_t>(value)),
             Entry{Entry::kNumber, value, "", 0});
}

TALLY_DOUBLE_EXPORT uint32_t KSI_ParamListAddString(KSI_ParamList* list, const char* text) {
  return Add(list, "AddString", script::Quote(text), Entry{Entry::kText, 0, text, 0});
}

TALLY_DOUBLE_EXPORT void KSI_ParamListRemoveLastParam(KSI_ParamList* list) {
  Double& the = TheDouble();
  if (the.Usable(list, "RemoveLast") == nullptr) return;
  the.Trace("RemoveLast()");
  if (!list->entries.empty()) list->entries.pop_back();
}

TALLY_DOUBLE_EXPORT uint32_t KSI_ParamListUsedCount(KSI_ParamList* list) {
  Double& the = TheDouble();
  if (the.Usable(list, "UsedCount") == nullptr) return 0;
  the.Trace(Call("UsedCount", list->instances));
  return the.Count(list);
}

TALLY_DOUBLE_EXPORT uint32_t KSI_ParamListGetInt64(KSI_ParamList* list, uint32_t index,
                                                   int64_t* out) {
  return ReadEntry(list, "GetInt64", index, Entry::kNumber,
                   [out](const Entry& entry) { *out = static_cast<int64_t>(entry.number); });
}

TALLY_DOUBLE_EXPORT uint32_t KSI_ParamListGetUInt32(KSI_ParamList* list, uint32_t index,
                                                    uint32_t* out) {
  return ReadEntry(list, "GetUInt32", index, Entry::kNumber,
                   [out](const Entry& entry) { *out = static_cast<uint32_t>(entry.number); });
}

TALLY_DOUBLE_EXPORT uint32_t KSI_ParamListGetString(KSI_ParamList* list, uint32_t index,
                                                    const char** out) {
  return ReadEntry(list, "GetString", index, Entry::kText,
                   [out](const Entry& entry) { *out = entry.text.c_str(); });
}

TALLY_DOUBLE_EXPORT void KSI_ParamListDestroy(KSI_ParamList* list) {
  Double& the = TheDouble();
  if (the.Usable(list, "Destroy") == nullptr) return;
  the.Trace(Call("Destroy", list->instances));
  list->destroyed = true;
  for (Entry& entry : list->entries) std::fill(entry.text.begin(), entry.text.end(), '\xdb');
}

TALLY_DOUBLE_EXPORT void Warning(const char* format, ...) {
  std::va_list arguments;
  va_start(arguments, format);
  std::va_list again;
  va_copy(again, arguments);
  const int length = std::vsnprintf(nullptr, 0, format, arguments);
  va_end(arguments);
  std::string text(static_cast<size_t>(length) + 1, '\0');
  std::vsnprintf(text.data(), text.size(), format, again);
  va_end(again);
  text.pop_back();
  TheDouble().Trace("Warning " + script::Quote(text));
  std::fwrite(text.data(), 1, text.size(), stderr);
}

TALLY_DOUBLE_EXPORT char* Str_Strcpy(char* destination, const char* source, size_t size) {
  if (size == 0) {
    TheDouble().Misuse("Str_Strcpy into no room");
    return destination;
  }
  const size_t length = std::min(std::strlen(source), size - 1);
  std::memcpy(destination, source, length);
  destination[length] = '\0';
  return destination;
}

// The program finds this `time` before that of the C library, so that the second printed in a
// title block is the scenario's.
TALLY_DOUBLE_EXPORT time_t time(time_t* out) noexcept {
  const time_t now = TheDouble().Now();
  if (out != nullptr) *out = now;
  return now;
}
