#pragma once

#include <chrono>
#include <string>

#include "webapi/base/UniqueFd.h"
#include "webapi/platform/Daemon.h"

namespace QELO {

/// A front's connection to one worker. The worker says that it is ready by an empty message, at the
/// start and after each call; it answers a call with the response's record, or with an empty
/// message when it has not begun it.
class WorkerLink : public qelodaemon::SockConnection {
 public:
  enum class Coming {
    kWhole,
    kLater,
    kGone,
    kUntaken  ///< gone, and had not read the whole of what was sent
  };

  /// @param limits  "receive": for who waits to the end
  WorkerLink(UniqueFd socket, const qelodaemon::Limits& limits);

  /// Waits for a message for so long, and not for one that cannot be in the socket as a whole.
  /// @return kWhole: it is here, so that Recv() does not wait for it
  Coming Await(std::chrono::milliseconds patience) const;
  /// Whether the worker has said that it is ready, or says so in time.
  Coming AwaitReady(std::chrono::milliseconds patience);
};

}  // namespace QELO
