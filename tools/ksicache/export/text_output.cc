#include "tools/ksicache/export/text_output.h"

#include <unistd.h>

#include <algorithm>
#include <span>

#include "tools/ksicache/output.h"

namespace ksicache {

TextOutput::TextOutput(NewFile* file)
    : file_(file), isTerminal_(file == nullptr && isatty(STDOUT_FILENO) == 1) {}

void TextOutput::Flush() {
  if (file_ != nullptr) {
    file_->Write(std::as_bytes(std::span(text_)));
  } else if (!isTerminal_) {
    Print(text_);
  } else {
    // Nothing from outside reaches a terminal as a command.
    std::string_view rest = text_;
    for (size_t end; (end = rest.find('\n')) != std::string_view::npos;) {
      PrintLine(rest.substr(0, end));
      rest.remove_prefix(end + 1);
    }
  }
  text_.clear();
}

void TextOutput::Finish() {
  Flush();
  if (file_ != nullptr) file_->CommitWritten();
}

bool IsSimple(std::string_view text) {
  return std::ranges::all_of(text,
                             [](char c) { return c >= ' ' && c <= '~' && c != '"' && c != '\\'; });
}

}  // namespace ksicache
