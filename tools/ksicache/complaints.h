#ifndef TOOLS_KSICACHE_COMPLAINTS_H_
#define TOOLS_KSICACHE_COMPLAINTS_H_

#include <cstddef>
#include <set>
#include <string>

#include "tools/ksicache/diagnostics.h"
#include "tools/ksicache/opened_file.h"
#include "tools/ksicache/output.h"
#include "tools/ksicache/printable.h"

namespace ksicache {

// Says what is wrong with files, each thing once however many moments have it.
class Complaints {
 public:
  // `name`: empty for the host itself.
  void BeginFile(const std::string& name) {
    before_ = name.empty() ? "" : name + ": ";
    file_ = name.empty() ? "" : Printable(FileNameOf(name));
  }

  void Say(const std::string& text) {
    isEmpty_ = false;
    if (said_.insert(before_ + text).second) PrintError(before_ + text);
  }

  // What the library has said meanwhile: what it could not read.
  void SayDiagnostics() {
    for (const std::string& text : diagnostics_.TakeKept()) Say(WithoutFile(text));
  }

  bool IsEmpty() const { return isEmpty_; }

 private:
  // The library names the file and the moment that it was given, which need not be the one that
  // was asked for.
  std::string WithoutFile(const std::string& text) const {
    const bool isOfFile = !file_.empty() && text.starts_with(file_) &&
                          (text[file_.size()] == ':' || text[file_.size()] == '@');
    const size_t end = isOfFile ? text.find(": ", file_.size()) : std::string::npos;
    return end == std::string::npos ? text : text.substr(end + 2);
  }

  std::string before_;
  std::string file_;
  Diagnostics diagnostics_;
  std::set<std::string> said_;
  bool isEmpty_ = true;
};

}  // namespace ksicache

#endif  // TOOLS_KSICACHE_COMPLAINTS_H_
