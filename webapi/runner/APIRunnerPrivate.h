#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace QELO {

class APIRunner;

/// What the process is called, and its name while it serves a call.
class APIRunnerPrivate {
 public:
  static constexpr size_t kLongestName = 1023;  ///< bytes of what a process is called for a call

  explicit APIRunnerPrivate(APIRunner* owner);

  /// Remembers where the process's arguments stand; nothing when `argc` is below 1.
  void SetArgs(int argc, char** argv);
  /// Shows `name` as the process's first argument, cut to the room that is there. Nothing before
  /// SetArgs.
  void SetArgv0(const std::string& name);

  const std::string& GetProcName() const { return procName; }
  const std::string& GetOrigProcName() const { return origProcName; }

  /// Names process, thread and syslog identity after a call, unless they are so named already.
  /// @return false, with errno, when the thread cannot be named
  bool SetCallName(const std::string& api, int version, const std::string& method);
  /// Foreign code ran, which may have named the process otherwise.
  void ForgetCallName() { shownCall_.clear(); }
  /// Makes `text` the syslog identity, cut to kLongestName.
  static void SetLogIdentity(const std::string& text);

 private:
  APIRunner* owner_;
  char* argv0_ = nullptr;
  uint32_t argv0Length_ = 0;
  std::string procName;
  std::string origProcName;
  std::string shownCall_;  ///< the call that the process is named after; "": not known
};

}  // namespace QELO
