#include "tools/ksicache/failures.h"

#include <knvlibs/ksi_status.h>
#include "tools/ksicache/error.h"

namespace ksicache {

void FailedReads::Add(int64_t status, const std::function<std::string()>& name) {
  if (count_++ < kMostNamed) {
    first_.push_back(name() + " (" + StatusText(static_cast<ksi::Status>(status)) + ")");
  }
}

std::string FailedReads::Text() const {
  std::string text = std::to_string(count_);
  for (const std::string& name : first_) text += (&name == &first_.front() ? ": " : ", ") + name;
  if (count_ > first_.size()) text += " and " + std::to_string(count_ - first_.size()) + " more";
  return text;
}

void Failures::Add(int64_t status, const std::function<std::string()>& name) {
  switch (status) {
    case KSI_STATUS_NOT_FOUND:
    case KSI_STATUS_NO_HANDLER:
    case KSI_STATUS_INVALID_NODE:
      return absent.Add(status, name);
    case KSI_STATUS_PERMISSION_DENIED:
      return refused.Add(status, name);
    default:
      return failed.Add(status, name);
  }
}

}  // namespace ksicache
