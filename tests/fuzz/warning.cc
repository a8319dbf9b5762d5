// Diagnostics are formatted, for that may fail, and thrown away.
#include <cstdarg>
#include <cstdio>

#include <knvlibs/ksi.h>

void Warning(const char* format, ...) {
  char text[512];
  va_list arguments;
  va_start(arguments, format);
  std::vsnprintf(text, sizeof text, format, arguments);
  va_end(arguments);
}
