#include "webapi/runner/APIRunnerPrivate.h"

#include <errno.h>
#include <fcntl.h>
#include <libgen.h>
#include <sys/prctl.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cstring>

#include "webapi/base/Log.h"

namespace QELO {
namespace {

constexpr size_t kLongestArgument = 1023;

/// The process's arguments as the kernel shows them, up to the first NUL; "" when they cannot be
/// read.
std::string shownArgument() {
  char text[kLongestArgument + 1] = {};
  const int fd = open("/proc/self/cmdline", O_RDONLY | O_CLOEXEC);
  if (fd < 0) {
    return "";
  }
  const ssize_t count = read(fd, text, kLongestArgument);
  close(fd);
  return count > 0 ? text : "";
}

/// The first argument up to its first space. The kernel shows the memory that the C library's
/// pointer leads to, but makes files for it that each process pays for: a hundredth of a call.
/// Whether they can be read matters with a space alone, up to which the C library's name goes on.
std::string firstArgument() {
  const std::string own(program_invocation_name,
                        strnlen(program_invocation_name, kLongestArgument));
  if (own.find(' ') == std::string::npos) {
    return own;
  }
  const std::string shown = shownArgument();
  return shown.substr(0, shown.find(' '));
}

/// Names are C text to the system: each part ends at its NUL, and none is endless.
std::string shownPart(const std::string& name) {
  return name.substr(0, strnlen(name.c_str(), APIRunnerPrivate::kLongestName));
}

}  // namespace

APIRunnerPrivate::APIRunnerPrivate(APIRunner* owner)
    : owner_(owner), procName(program_invocation_short_name), origProcName(procName) {
  std::string argument = firstArgument();
  if (!argument.empty()) {
    procName = origProcName = basename(argument.data());
  }
}

void APIRunnerPrivate::SetArgs(int argc, char** argv) {
  if (argc < 1) {
    return;
  }
  ForgetCallName();
  argv0_ = argv[0];
  argv0Length_ = static_cast<uint32_t>(strlen(argv[0]));
  if (origProcName.find("__") != std::string::npos) {
    procName = origProcName.substr(0, origProcName.find('_'));
  }
}

void APIRunnerPrivate::SetArgv0(const std::string& name) {
  if (argv0_ == nullptr) {
    return;
  }
  memset(argv0_, 0, argv0Length_);
  if (argv0Length_ > 0) {
    memcpy(argv0_, name.c_str(), std::min<size_t>(strlen(name.c_str()), argv0Length_ - 1));
  }
}

bool APIRunnerPrivate::SetCallName(const std::string& api, int version, const std::string& method) {
  const std::string call = shownPart(api) + "_" + std::to_string(version) + "_" + shownPart(method);
  if (call == shownCall_) {
    return true;
  }
  std::string full = procName + "_" + call;
  full.resize(std::min(full.size(), kLongestName));
  SetLogIdentity(full);
  SetArgv0(full);
  const bool shown = prctl(PR_SET_NAME, call.substr(0, 16).c_str()) == 0;
  shownCall_ = shown ? call : "";
  return shown;
}

void APIRunnerPrivate::SetLogIdentity(const std::string& text) {
  static char identity[kLongestName + 1];  // syslog keeps the pointer
  closelog();
  std::string shown = PrintableText(text).c_str();
  // A log's reader takes these for the identity's end, and what follows for the message.
  std::replace_if(
      shown.begin(), shown.end(),
      [](char c) { return c == ' ' || c == ':' || c == '[' || c == ']'; }, '?');
  const size_t length = std::min(shown.size(), sizeof identity - 1);
  memcpy(identity, shown.data(), length);
  identity[length] = '\0';
  openlog(identity, LOG_PID | LOG_CONS, 0);
}

}  // namespace QELO
