// Preloaded into a program: its messages to the system log go to the file that LOG_FILE names, a
// line each.

#include <cstdarg>
#include <cstdio>
#include <cstdlib>

/// Read at once, since a program may drop the variable.
static const char* const path = getenv("LOG_FILE");

static void add(const char* format, va_list args) {
  FILE* file = path != nullptr ? fopen(path, "ae") : nullptr;
  if (file != nullptr) {
    vfprintf(file, format, args);
    fputc('\n', file);
    fclose(file);
  }
}

extern "C" __attribute__((visibility("default"))) void syslog(int, const char* format, ...) {
  va_list args;
  va_start(args, format);
  add(format, args);
  va_end(args);
}

extern "C" __attribute__((visibility("default"))) void __syslog_chk(int, int, const char* format,
                                                                    ...) {
  va_list args;
  va_start(args, format);
  add(format, args);
  va_end(args);
}
