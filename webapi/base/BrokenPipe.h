#pragma once

#include <csignal>

namespace QELO {

/// While it lives, writing to somebody who has gone away fails instead of ending the process, which
/// may have work left to do. The signal is handled as before afterwards, by its flags too.
class BrokenPipe {
 public:
  BrokenPipe() {
    struct sigaction ignored {};
    ignored.sa_handler = SIG_IGN;
    isSet_ = sigaction(SIGPIPE, &ignored, &former_) == 0;
  }
  BrokenPipe(const BrokenPipe&) = delete;
  BrokenPipe& operator=(const BrokenPipe&) = delete;
  ~BrokenPipe() {
    if (isSet_) {
      sigaction(SIGPIPE, &former_, nullptr);
    }
  }

 private:
  struct sigaction former_ {};
  bool isSet_;
};

}  // namespace QELO
