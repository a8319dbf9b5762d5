#include "tools/ksicache/output.h"

#include <cerrno>
#include <cstdio>
#include <new>
#include <string>

#include "tools/ksicache/error.h"
#include "tools/ksicache/printable.h"

namespace ksicache {
namespace {

[[noreturn]] void ThrowLost() { throw OutputError(SystemError("standard output", errno).what()); }

}  // namespace

// A failed write is an error at once: the rest of a large file would be formatted for nothing.
void Print(std::string_view text) {
  if (std::fwrite(text.data(), 1, text.size(), stdout) != text.size()) {
    ThrowLost();
  }
}

void PrintLine(std::string_view text) { Print(Printable(text) + "\n"); }

void PrintError(std::string_view message) try {
  // More than any message with the longest file name has.
  constexpr size_t kLongest = 8192;
  std::string line = "ksicache: " + Printable(message.substr(0, kLongest));
  line += message.size() > kLongest ? "...\n" : "\n";
  // When even this fails, there is nobody to tell.
  static_cast<void>(std::fputs(line.c_str(), stderr));
} catch (const std::bad_alloc&) {
  PrintNoMemory();
}

void PrintNoMemory() { static_cast<void>(std::fputs("ksicache: out of memory\n", stderr)); }

void FlushOutput() {
  if (std::fflush(stdout) != 0) ThrowLost();
}

void FinishOutput() { FlushOutput(); }

}  // namespace ksicache
