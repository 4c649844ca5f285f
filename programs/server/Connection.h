#pragma once

#include <chrono>
#include <cstddef>
#include <cstring>
#include <string>

#include "webapi/base/UniqueFd.h"

namespace QELO {

using ServerClock = std::chrono::steady_clock;

/// One accepted connection on its way to the process that serves it. What the client has sent is
/// wiped when it is needed no more: processes that are forked later are other clients'.
struct Connection {
  Connection() = default;
  Connection(const Connection&) = delete;
  Connection& operator=(const Connection&) = delete;
  ~Connection() { Forget(); }

  void Forget() {
    explicit_bzero(header.data(), header.size());
    header = std::string();
  }

  UniqueFd socket;
  std::string listener;  ///< the path of the socket that it came by; "" for another kind
  std::string header;    ///< what has come of the request's front
  size_t wanted = 0;     ///< bytes that the header has, once that is known; 0: not yet
  std::string answer;    ///< what the server itself says, when nothing has to be started for it
  bool isQuiet = false;  ///< told nothing when it is refused, and not counted
  ServerClock::time_point accepted;
  ServerClock::time_point arrived;   ///< its header was whole
  ServerClock::time_point deadline;  ///< of what is waited for at present
};

}  // namespace QELO
