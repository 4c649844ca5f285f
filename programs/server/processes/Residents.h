#pragma once

#include <sys/types.h>

#include <chrono>
#include <memory>

#include "programs/server/Connection.h"

namespace QELO {

/// Processes of a service that stay, beside those that serve one connection each. The server's one
/// thread calls all of it, so nothing here may wait.
class Residents {
 public:
  virtual ~Residents() = default;

  /// Takes over a connection whose header is whole, or leaves it to a process of its own.
  /// @return whether it was taken
  virtual bool TakeOver(std::unique_ptr<Connection>& connection) = 0;
  /// Something has come by a descriptor. @return false when it is none of theirs
  virtual bool Hear(int descriptor) = 0;
  /// A process has ended that serves no connection. @param status  as waitpid(2) gives it
  virtual void Ended(pid_t pid, int status) = 0;
  /// Looks after what is waited for in vain; several times a second.
  virtual void Sweep(ServerClock::time_point now) = 0;
  /// How long the server may wait for something to happen.
  virtual std::chrono::milliseconds Patience() const = 0;
  /// Whether nothing is under way; once told to stop, also that nobody is left.
  virtual bool IsIdle() const = 0;
  /// Finishes what is under way, and ends.
  virtual void Stop() = 0;
  virtual void KillAll() = 0;
};

}  // namespace QELO
