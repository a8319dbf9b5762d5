#ifndef TOOLS_KSICACHE_COMPLAINTS_H_
#define TOOLS_KSICACHE_COMPLAINTS_H_

#include <set>
#include <string>

#include "tools/ksicache/diagnostics.h"
#include "tools/ksicache/output.h"

namespace ksicache {

// Says what is wrong with files, each thing once however many moments have it.
class Complaints {
 public:
  // `name`: empty for the host itself.
  void BeginFile(const std::string& name) { before_ = name.empty() ? "" : name + ": "; }

  void Say(const std::string& text) {
    isEmpty_ = false;
    if (said_.insert(before_ + text).second) PrintError(before_ + text);
  }

  // What the library has said meanwhile: what it could not read.
  void SayDiagnostics() {
    for (const std::string& text : diagnostics_.TakeKept()) Say(text);
  }

  bool IsEmpty() const { return isEmpty_; }

 private:
  std::string before_;
  Diagnostics diagnostics_;
  std::set<std::string> said_;
  bool isEmpty_ = true;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_COMPLAINTS_H_
