#include "tests/support/SyslogCapture.h"

#include <syslog.h>
#include <unistd.h>

#include <cstdarg>
#include <cstdio>

namespace {

int closings = 0;

}  // namespace

std::vector<SyslogCapture::Message>& SyslogCapture::Messages() {
  static std::vector<Message> messages;
  return messages;
}

std::vector<SyslogCapture::Opening>& SyslogCapture::Openings() {
  static std::vector<Opening> openings;
  return openings;
}

std::string& SyslogCapture::Identity() {
  static std::string identity;
  return identity;
}

int& SyslogCapture::Copy() {
  static int descriptor = -1;
  return descriptor;
}

void SyslogCapture::Clear() {
  Messages().clear();
  Openings().clear();
  closings = 0;
}

int SyslogCapture::Count(const std::string& part) {
  int count = 0;
  for (const Message& message : Messages()) {
    count += message.text.find(part) != std::string::npos ? 1 : 0;
  }
  return count;
}

namespace {

void collect(int priority, const char* format, va_list args) {
  char text[4096];
  vsnprintf(text, sizeof text, format, args);  // NOLINT: "%m" is glibc's here as in syslog
  SyslogCapture::Messages().push_back({priority, text});
  if (SyslogCapture::Copy() >= 0) {
    const std::string line = "<" + std::to_string(priority) + ">" + text + "\n";
    [[maybe_unused]] const ssize_t count = write(SyslogCapture::Copy(), line.data(), line.size());
  }
}

}  // namespace

// These take the place of the C library's for the whole test program.
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wformat-nonliteral"
extern "C" __attribute__((visibility("default"))) void syslog(int priority, const char* format,
                                                              ...) {
  va_list args;
  va_start(args, format);
  collect(priority, format, args);
  va_end(args);
}

extern "C" __attribute__((visibility("default"))) void __syslog_chk(int priority, int,
                                                                    const char* format, ...) {
  va_list args;
  va_start(args, format);
  collect(priority, format, args);
  va_end(args);
}
#pragma GCC diagnostic pop

extern "C" __attribute__((visibility("default"))) void openlog(const char* identity, int options,
                                                               int facility) {
  SyslogCapture::Identity() = identity;
  SyslogCapture::Openings().push_back({identity, options, facility, closings});
}

extern "C" __attribute__((visibility("default"))) void closelog() {
  ++closings;
}
