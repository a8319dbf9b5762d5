#include "tools/ksicache/diagnostics.h"

#include <new>
#include <string_view>
#include <utility>

#include <knvlibs/ksi.h>
#include "tools/ksicache/output.h"

// A host's own library has none.
#pragma weak KSI_SetDiagnosticHandler

namespace ksicache {
namespace {

// By the library's words for it.
bool IsRefusal(std::string_view text) {
  constexpr size_t kNone = std::string_view::npos;
  return text.find(": not permitted") != kNone || text.find(": permission denied") != kNone;
}

}  // namespace

Diagnostics::Diagnostics() {
  if (&KSI_SetDiagnosticHandler != nullptr) KSI_SetDiagnosticHandler(Receive, this);
}

Diagnostics::~Diagnostics() {
  if (&KSI_SetDiagnosticHandler != nullptr) KSI_SetDiagnosticHandler(nullptr, nullptr);
  Say();
}

void Diagnostics::Say() {
  for (const std::string& text : kept_) PrintError(text);
  if (dropped_ != 0) PrintError(std::to_string(dropped_) + " more of these");
  kept_.clear();
  dropped_ = 0;
}

// No exception may pass through the library.
void Diagnostics::Receive(void* context, const char* text) {
  auto& self = *static_cast<Diagnostics*>(context);
  ++self.count_;
  if (IsRefusal(text)) self.tellRefusals_ = true;
  try {
    self.Keep(text);
  } catch (const std::bad_alloc&) {
    ++self.dropped_;
  }
}

void Diagnostics::Keep(const char* text) {
  if (kept_.size() == kMostKept) {
    ++dropped_;
    return;
  }
  std::string line(text);
  if (line.ends_with('\n')) line.pop_back();
  kept_.push_back(std::move(line));
}

}  // namespace ksicache
