#include "tools/ksicache/page/names.h"

#include "tools/ksicache/diff/text.h"

namespace ksicache {

void ThingNames::Add(std::string_view name, int64_t number) {
  const auto [found, isFirst] = bearers_.try_emplace(std::string(name), Bearer{number, false});
  if (found->second.first != number) found->second.isOneOfSeveral = true;
}

std::string ThingNames::Of(std::string_view name, int64_t number) const {
  const auto found = bearers_.find(std::string(name));
  const bool isTold = found != bearers_.end() && found->second.isOneOfSeveral;
  return NameText(name, isTold ? number : -1);
}

}  // namespace ksicache
