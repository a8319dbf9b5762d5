// Reads the JSON of a cache file as a stream: the memory it takes does not grow with the number of
// readings, and is a small multiple of the longest one.
#ifndef TOOLS_KSICACHE_JSON_READER_H_
#define TOOLS_KSICACHE_JSON_READER_H_

#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <deque>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

#include "tools/ksicache/record_json.h"

namespace ksicache {

// The entries of a list. What they ought to be is known when the whole reading is, so they are
// kept as what they can be.
class JsonEntries {
 public:
  void Add(const Json& entry);

  size_t Count() const { return count_; }

  // Calls for every entry. Fails with a DataError on the first that is no such thing.
  void ForEachNumber(const std::function<void(int64_t)>& visit) const;
  void ForEachText(const std::function<void(std::string_view)>& visit) const;

 private:
  size_t count_ = 0;
  std::deque<int64_t> numbers_;
  std::string texts_;  // each with its NUL
  // Why not all are numbers, or texts.
  std::string noNumber_;
  std::string noText_;
};

class JsonReader : private ksi::JsonEvents {
 public:
  // Takes a reading: its members, of which "instances" is empty, and the entries of that.
  using TakeReading = std::function<void(const Json& reading, const JsonEntries& entries)>;

  explicit JsonReader(TakeReading take) : take_(std::move(take)) {}

  // Reads a file to its end, gives each reading to be taken and returns the rest, where "readings"
  // is empty. Fails with a DataError, which says in which reading if it is in one.
  Json Read(std::FILE* file);

 private:
  // A container that is not closed yet.
  struct Open {
    Json json;
    std::string name;  // of the member that comes
  };

  // These fail with a DataError, and never with false.
  bool OnValue(Json value) override;
  bool OnStart(Json::Kind kind) override;
  bool OnName(std::string name) override;
  bool OnEnd() override;
  void OnError(std::string_view reason) override;

  bool InReadings() const;
  bool InEntries() const;
  void AddToParent(Json value);
  [[noreturn]] void Fail(const std::string& what) const;
  void Take(const Json& reading);

  TakeReading take_;
  std::vector<Open> open_;
  Json document_;
  JsonEntries entries_;
  size_t count_ = 0;  // of readings
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_JSON_READER_H_
