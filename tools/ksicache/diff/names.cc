#include "tools/ksicache/diff/names.h"

#include "tools/ksicache/diff/text.h"

namespace ksicache {

void NameColumn::Add(const std::string& start, const std::string& name) {
  const std::string whole = start + NameText(name, -1);
  Lookalikes& alike = shown_[OnTheLeft(whole, width_)];
  if (alike.count++ == 0) alike.name = whole;
  if (alike.name != whole) alike.areAlike = false;
}

NameColumn::Cell NameColumn::CellOf(const std::string& start, const std::string& name,
                                    int64_t number) const {
  const std::string text = OnTheLeft(start + NameText(name, -1), width_);
  const Lookalikes& alike = shown_.at(text);
  if (alike.count == 1) return {"", text};
  const std::string numbered = start + NameText(name, number);
  if (alike.areAlike) return {"", OnTheLeft(numbered, width_)};
  return {numbered, std::string(width_, ' ')};
}

}  // namespace ksicache
