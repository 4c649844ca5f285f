#pragma once

#include <signal.h>

#include "webapi/base/UniqueFd.h"

namespace QELO {

/// The signals that a server lives by, as something to wait for beside its sockets.
class SignalQueue {
 public:
  /// From now on they wait to be taken. A broken connection ends no process either.
  /// @return false, with errno, when that cannot be had
  bool Open();
  int Descriptor() const { return queue_.Get(); }
  /// The next signal that has come; 0: none.
  int Take();
  /// For a forked child: signals do what they do in a program that was just started.
  static void Reset();

 private:
  UniqueFd queue_;
};

}  // namespace QELO
