#pragma once

#include <sys/types.h>

namespace QELO {

/// A process that is held: its number may become another's, but no signal goes to that one. Kernels
/// that hold none are given the number.
class HeldProcess {
 public:
  explicit HeldProcess(pid_t pid);
  HeldProcess(const HeldProcess&) = delete;
  HeldProcess& operator=(const HeldProcess&) = delete;
  ~HeldProcess();

  /// Sends SIGTERM. @return 0, or errno
  int Terminate() const;

 private:
  pid_t pid_;
  int handle_;
  int error_;  ///< why there is no handle
};

}  // namespace QELO
