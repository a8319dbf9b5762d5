#include "tools/ksicache/output.h"

#include <cerrno>
#include <cstdio>

#include "tools/ksicache/error.h"

namespace ksicache {

// A failed write is an error at once: the rest of a large file would be formatted for nothing.
void Print(std::string_view text) {
  if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size()) {
    throw SystemError("standard output", errno);
  }
}

void PrintError(const std::string& message) {
  // When even this fails, there is nobody to tell.
  static_cast<void>(std::fprintf(stderr, "ksicache: %s\n", message.c_str()));
}

void FinishOutput() {
  if (std::fflush(stdout) != 0) throw SystemError("standard output", errno);
}

}  // namespace ksicache
