#pragma once

#include <chrono>
#include <cstddef>

namespace QELO {

/// What a server spends at most. Beyond it a connection is refused.
struct ServerLimits {
  unsigned atOnce = 32;     ///< processes that serve a request
  unsigned queued = 256;    ///< connections that wait for such a process
  unsigned arriving = 256;  ///< connections whose request is on its way, or whose refusal is
  std::chrono::seconds arrival{10};   ///< from a connection to its whole header
  std::chrono::seconds turn{30};      ///< from there to a process
  std::chrono::seconds request{300};  ///< life of a process; then it is killed, with its children
};

}  // namespace QELO
