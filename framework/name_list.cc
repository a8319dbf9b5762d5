#include "framework/name_list.h"

#include <strings.h>

#include <algorithm>

namespace tally {

bool NameReader::Next(std::string_view& name) {
  const size_t start = rest_.find_first_not_of(':');
  if (start == std::string_view::npos) return false;
  const size_t end = std::min(rest_.find(':', start), rest_.size());
  name = rest_.substr(start, end - start);
  rest_.remove_prefix(end);
  return true;
}

bool SameName(std::string_view a, std::string_view b) {
  return a.size() == b.size() && strncasecmp(a.data(), b.data(), a.size()) == 0;
}

void NameWriter::Put(std::string_view name, bool taken) {
  if (!taken) {
    takenAll_ = false;
    return;
  }
  if (takenAny_ && size_ < buffer_.size()) buffer_[size_++] = ':';
  takenAny_ = true;
  size_ += name.copy(buffer_.data() + size_, buffer_.size() - size_);
}

std::string_view NameWriter::text() const {
  if (takenAll_) return "(all)";
  if (!takenAny_) return "(none)";
  return {buffer_.data(), size_};
}

}  // namespace tally
