// Records all that a library tells of its host.
//
// The host is walked object by object, an object being what a path of keys selects: the host
// itself, a group, a client, a remap type of a client. Of each, every node that takes such keys is
// read and listed, and the instances so found are the objects to come. A read that fails is
// recorded with its status, so that nothing stops a capture and a captured host answers as it did.
#ifndef TOOLS_KSICACHE_HOST_WALK_H_
#define TOOLS_KSICACHE_HOST_WALK_H_

#include <array>
#include <cstdint>
#include <set>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include "knvlibs/catalogue.h"
#include "knvlibs/source.h"
#include "tools/ksicache/failures.h"
#include "tools/ksicache/host_library.h"
#include "tools/ksicache/reading_sink.h"

namespace ksicache {

class HostWalk {
 public:
  HostWalk(HostLibrary& host, ReadingSink& sink) : host_(host), sink_(sink) {}

  // `progress`: whether to show it to people.
  void Run(bool progress);

  const Failures& GetFailures() const { return failures_; }

  // Fails with an Error if nothing was read but nothing, no figure that is not 0 and no instance:
  // that must not pass for a host that has nothing.
  void RequireFound() const;

 private:
  // A key of an object, with what it names.
  struct ObjectKey {
    ksi::Instance instance = ksi::Instance::kNone;
    int64_t number = 0;
    std::string text;

    friend bool operator<(const ObjectKey& a, const ObjectKey& b) {
      return std::tie(a.instance, a.number, a.text) < std::tie(b.instance, b.number, b.text);
    }
  };
  using Object = std::array<ObjectKey, ksi::kMaxKeys>;

  static ksi::Keying KeyingOf(const Object& object);
  static ksi::Keys KeysOf(const Object& object);

  void Find(const Object& object);
  void FindNumber(ksi::Instance instance, int64_t number);
  void FindText(ksi::Instance instance, std::string_view text);
  void FindInValue(const ksi::Node& node, ksi::Buffer record);
  void FindInList(const ksi::Node& node, const Object& object,
                  const std::vector<ksi::Key>& entries);
  void FindMemNodeOf(std::string_view buddy);

  void Read(const Object& object);
  void ReadValue(const ksi::Node& node, const ksi::Keys& keys);
  void ReadList(const ksi::Node& node, const ksi::Keys& keys, const Object& object);
  void AddFailure(const ksi::Node& node, ksi::Kind kind, const ksi::Keys& keys, ksi::Status status);

  HostLibrary& host_;
  ReadingSink& sink_;
  Failures failures_;
  bool foundAnything_ = false;
  std::vector<Object> toRead_;
  std::set<Object> found_;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_HOST_WALK_H_
