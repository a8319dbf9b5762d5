// The parts of the interface that have nothing to do with the kernel.
#pragma GCC visibility push(default)
#include <knvlibs/ksi.h>
#pragma GCC visibility pop

#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <memory>
#include <mutex>
#include <new>

namespace {

struct Diagnostics {
  KSI_DiagnosticHandler handler = nullptr;
  void* context = nullptr;
};

// Never destroyed: something may be said until the process ends.
constinit std::mutex diagnosticsMutex;
constinit Diagnostics diagnostics;

Diagnostics CurrentDiagnostics() {
  const std::lock_guard lock(diagnosticsMutex);
  return diagnostics;
}

// The formatted text, null if there is no memory for it.
std::unique_ptr<char[]> Format(const char* format, va_list arguments) {
  va_list again;
  va_copy(again, arguments);
  const int length = std::vsnprintf(nullptr, 0, format, again);  // NOLINT: as below
  va_end(again);
  if (length < 0) return nullptr;
  const auto size = static_cast<size_t>(length) + 1;
  std::unique_ptr<char[]> text(new (std::nothrow) char[size]);
  // NOLINTNEXTLINE: va_start is not seen
  if (text) static_cast<void>(std::vsnprintf(text.get(), size, format, arguments));
  return text;
}

}  // namespace

void Warning(const char* format, ...) {
  if (format == nullptr) return;
  const Diagnostics to = CurrentDiagnostics();
  va_list arguments;
  va_start(arguments, format);
  const std::unique_ptr<char[]> text = to.handler == nullptr ? nullptr : Format(format, arguments);
  if (text) {
    to.handler(to.context, text.get());
  } else {
    // Nobody is left to tell of a failure. NOLINTNEXTLINE: va_start is not seen
    static_cast<void>(std::vfprintf(stderr, format, arguments));
  }
  va_end(arguments);
}

void KSI_SetDiagnosticHandler(KSI_DiagnosticHandler handler, void* context) {
  const std::lock_guard lock(diagnosticsMutex);
  diagnostics = {handler, context};
}

char* Str_Strcpy(char* destination, const char* source, size_t size) {
  if (destination == nullptr || size == 0) return destination;
  const size_t length = source == nullptr ? 0 : strnlen(source, size - 1);
  std::memcpy(destination, source == nullptr ? "" : source, length);
  destination[length] = '\0';
  return destination;
}
