// The two helpers of the interface that have nothing to do with the kernel.
#pragma GCC visibility push(default)
#include <knvlibs/ksi.h>
#pragma GCC visibility pop

#include <cstdarg>
#include <cstdio>
#include <cstring>

void Warning(const char* format, ...) {
  if (format == nullptr) return;
  va_list arguments;
  va_start(arguments, format);
  // Nobody is left to tell of a failure. NOLINTNEXTLINE: va_start is not seen
  static_cast<void>(std::vfprintf(stderr, format, arguments));
  va_end(arguments);
}

char* Str_Strcpy(char* destination, const char* source, size_t size) {
  if (destination == nullptr || size == 0) return destination;
  const size_t length = source == nullptr ? 0 : strnlen(source, size - 1);
  std::memcpy(destination, source == nullptr ? "" : source, length);
  destination[length] = '\0';
  return destination;
}
