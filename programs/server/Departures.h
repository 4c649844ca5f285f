#pragma once

#include <cstddef>
#include <memory>
#include <string>
#include <unordered_map>

#include "programs/server/Connection.h"
#include "programs/server/Events.h"

namespace QELO {

/// Connections that the server itself has told something, as a refusal. They stay open for a while,
/// and what still comes by them is dropped: closed with something unread, the other side might lose
/// what it was told.
class Departures {
 public:
  /// @param most  connections that are kept so; further ones are closed at once
  Departures(Events& events, size_t most) : events_(events), most_(most) {}

  /// Tells it its answer, as far as that goes without waiting, and lets it go.
  void Tell(std::unique_ptr<Connection> connection);
  /// Something has come by a descriptor. @return false when it is none of these
  bool Hear(int descriptor);
  /// Closes those whose time is over.
  void Sweep(ServerClock::time_point now);
  bool IsEmpty() const { return connections_.empty(); }

 private:
  Events& events_;
  const size_t most_;
  std::unordered_map<int, std::unique_ptr<Connection>> connections_;  ///< by descriptor
};

}  // namespace QELO
