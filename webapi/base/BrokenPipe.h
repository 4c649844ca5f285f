#pragma once

#include <csignal>

namespace QELO {

/// While it lives, writing to a client that has gone away fails instead of ending the process:
/// work that was registered for after the answer must still run.
class BrokenPipe {
 public:
  BrokenPipe() : former_(signal(SIGPIPE, SIG_IGN)) {}
  BrokenPipe(const BrokenPipe&) = delete;
  BrokenPipe& operator=(const BrokenPipe&) = delete;
  ~BrokenPipe() {
    if (former_ != SIG_ERR) {
      signal(SIGPIPE, former_);
    }
  }

 private:
  void (*former_)(int);
};

}  // namespace QELO
