// What libknvlibs.so answers, read as any program reads it.
#ifndef TOOLS_KSICACHE_HOST_LIBRARY_H_
#define TOOLS_KSICACHE_HOST_LIBRARY_H_

#include <memory>
#include <span>
#include <string>
#include <vector>

#include <knvlibs/ksi.h>
#include "knvlibs/source.h"

namespace ksicache {

struct DestroyList {
  void operator()(KSI_ParamList* list) const { KSI_ParamListDestroy(list); }
};
using OwnedList = std::unique_ptr<KSI_ParamList, DestroyList>;

// The library is the one that the process has been started with: the bundled one, or that of a host
// of its own. Of the latter nothing is asked but what every such library has, unless a directory is
// to be read as a host.
class HostLibrary {
 public:
  struct Definitions {
    std::string signature;  // 32 zeros where it is not this version's: the library tells no other
    std::string built;
  };

  // The instances that a list names; their texts live as long.
  class Instances {
   public:
    const std::vector<ksi::Key>& Entries() const { return entries_; }

   private:
    friend class HostLibrary;
    OwnedList list_;
    std::vector<ksi::Key> entries_;
  };

  // Whether the library can open hosts, which are Linux hosts then, as is the one that it reads by
  // itself.
  static bool OpensHosts();

  // `root`: the directory of the host's files; null: the host that the library reads by itself.
  // Fails with an Error.
  explicit HostLibrary(const std::string* root);

  // A list that has an entry which cannot be read, or which no cache file can hold, fails as a
  // whole: one without it would be another list.
  [[nodiscard]] ksi::Status Value(const ksi::Node& node, const ksi::Keys& keys, ksi::Buffer record);
  [[nodiscard]] ksi::Status List(const ksi::Node& node, const ksi::Keys& keys,
                                 Instances* instances);

  // Why something that could not be read is left out of the answers; kOk if nothing is, or the
  // library does not tell.
  [[nodiscard]] ksi::Status LossStatus();

  Definitions KernelDefinitions();

 private:
  struct Close {
    void operator()(KSI_Source* source) const;
  };

  std::unique_ptr<KSI_Source, Close> source_;  // null: the library's current one
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_HOST_LIBRARY_H_
