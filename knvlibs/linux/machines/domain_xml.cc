#include "knvlibs/linux/machines/domain_xml.h"

#include <algorithm>
#include <string>
#include <utility>

#include "knvlibs/linux/host/text.h"

namespace ksi {
namespace {

// Takes what stands before `mark`, and the mark; false if it does not come.
bool TakeUntil(std::string_view& text, std::string_view mark, std::string_view& before) {
  const size_t at = text.find(mark);
  if (at == std::string_view::npos) return false;
  before = text.substr(0, at);
  text.remove_prefix(at + mark.size());
  return true;
}

// The value of an attribute in "memory model='dimm' access='shared'"; empty if there is none.
std::string_view AttributeOf(std::string_view tag, std::string_view name) {
  std::string_view key;
  std::string_view value;
  TakeWord(tag);
  while (TakeUntil(tag, "=", key) && !tag.empty()) {
    const std::string_view quote = tag.substr(0, 1);
    tag.remove_prefix(1);
    if (!TakeUntil(tag, quote, value)) break;
    key.remove_prefix(std::min(key.find_first_not_of(" \t\n"), key.size()));
    if (key == name) return value;
  }
  return {};
}

// Walks the elements of a description. Names of elements are those of libvirt; text and attributes
// are wanted where they are numbers, so that nothing needs to be decoded.
class DomainWalk {
 public:
  explicit DomainWalk(std::string_view xml) : rest_(xml) {}

  DomainXml Run() {
    DomainXml domain;
    std::string_view text;
    std::string_view tag;
    while (TakeUntil(rest_, "<", text)) {
      bool isUnderstood = true;
      if (!SkipRemark(isUnderstood)) {
        isUnderstood = TakeUntil(rest_, ">", tag) && TakeTag(tag, text, domain);
      }
      if (!isUnderstood) return {};
    }
    if (!path_.empty() || !hasDomain_) return {};
    domain.modules = modules_;
    return domain;
  }

 private:
  // Whether it is one; `isWhole` if it also ends.
  bool SkipRemark(bool& isWhole) {
    constexpr std::pair<std::string_view, std::string_view> kRemarks[] = {
        {"!--", "-->"}, {"![CDATA[", "]]>"}, {"?", "?>"}};
    std::string_view remark;
    for (const auto& [begin, end] : kRemarks) {
      if (!TakePrefix(rest_, begin)) continue;
      isWhole = TakeUntil(rest_, end, remark);
      return true;
    }
    return false;
  }

  bool TakeTag(std::string_view tag, std::string_view text, DomainXml& domain) {
    if (TakePrefix(tag, "/")) {
      const bool isOurs = path_.ends_with("/" + std::string(tag));
      return isOurs && End(text);
    }
    const bool isEmpty = tag.ends_with('/');
    if (isEmpty) tag.remove_suffix(1);
    Start(tag, domain);
    return !isEmpty || End("");
  }

  void Start(std::string_view tag, DomainXml& domain) {
    std::string_view words = tag;
    path_ += '/';
    path_ += TakeWord(words);
    isKB_ = AttributeOf(tag, "unit") == "KiB";
    if (path_ == "/domain") hasDomain_ = true;
    if (path_ == "/domain/devices/memory") {
      modules_.emplace_back().isDimm = AttributeOf(tag, "model") == "dimm";
      isCurrentTold_ = false;
    }
    uint64_t seconds = 0;
    if (path_ == "/domain/devices/memballoon/stats" &&
        ParseNumber(AttributeOf(tag, "period"), seconds)) {
      domain.period = seconds;
    }
  }

  // False if a size is not understood.
  bool End(std::string_view text) {
    constexpr std::string_view kTarget = "/domain/devices/memory/target/";
    bool isUnderstood = true;
    if (path_.starts_with(kTarget)) {
      isUnderstood = TakeSize(std::string_view(path_).substr(kTarget.size()), text);
    }
    path_.erase(path_.rfind('/'));
    return isUnderstood;
  }

  // What is current of a size stands behind it; the label of persistent memory is none of it.
  bool TakeSize(std::string_view what, std::string_view text) {
    uint64_t size = 0;
    if (what != "size" && what != "current" && what != "label/size") return true;
    if (!isKB_ || !ParseNumber(text, size)) return false;
    MemoryModule& module = modules_.back();
    if (what == "size") {
      module.block.size = size;
      if (!isCurrentTold_) module.size = size;
    } else if (what == "current") {
      module.size = size;
      isCurrentTold_ = true;
    } else {
      module.size = DifferenceOf(module.block.size, size);
    }
    return true;
  }

  std::string_view rest_;
  std::string path_;  // of the element that is open
  std::vector<MemoryModule> modules_;
  bool hasDomain_ = false;
  bool isKB_ = false;
  bool isCurrentTold_ = false;
};

}  // namespace

DomainXml ParseDomainXml(std::string_view xml) { return DomainWalk(xml).Run(); }

}  // namespace ksi
