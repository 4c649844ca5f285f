#pragma once

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <ctime>

#include "programs/server/Limits.h"
#include "programs/server/Service.h"

namespace QELO {

/// What a server has done since its start, and what it does at present, in figures. There is a
/// fixed number of them, whatever clients send.
struct Metrics {
  /// How long something took, each time.
  struct Times {
    /// Upper bounds, in seconds; what takes longer than all counts as one more.
    static constexpr std::array<double, 13> kBounds{0.0003, 0.001, 0.003, 0.01, 0.03, 0.1, 0.3,
                                                    1,      3,     10,    30,   100,  300};

    void Add(std::chrono::microseconds time);
    uint64_t Count() const;

    std::array<uint64_t, kBounds.size() + 1>
        counts{};  ///< up to each bound, and above the one before
    std::chrono::microseconds sum{};
  };

  /// Of one kind of processes that stay: how many there are and were, and why they have ended.
  struct Staying {
    size_t now = 0;
    uint64_t started = 0;
    uint64_t idle = 0;     ///< nobody called for long
    uint64_t calls = 0;    ///< it has served as many as it may
    uint64_t memory = 0;   ///< it has taken too much
    uint64_t crash = 0;    ///< a signal, or the end of the process within a call
    uint64_t timeOut = 0;  ///< its call took too long
    uint64_t remains = 0;  ///< a call has left something else that cannot be put back
    uint64_t other = 0;    ///< nobody needs it any more, or it could not be set up
  };

  void CountRefusal(Service::Refusal reason);

  std::time_t startedAt = 0;
  ServerLimits limits;

  uint64_t served = 0;   ///< requests whose process ended by itself
  uint64_t crashed = 0;  ///< by a signal
  uint64_t killed = 0;   ///< by the server, for their time or because it stops

  uint64_t busy = 0;       ///< refused, as there is no room or it waited for too long
  uint64_t slow = 0;       ///< refused, as the header did not come in time
  uint64_t malformed = 0;  ///< refused, as the header is none, or ended early
  uint64_t tooLarge = 0;   ///< refused, for the header's length
  uint64_t gone = 0;       ///< the client had gone before its turn
  uint64_t denied = 0;     ///< connections of accounts that may not connect

  Staying fronts;
  Staying workers;
  uint64_t byFronts = 0;  ///< requests that a front has seen to, and no process of their own

  Times arriving;                         ///< from the connection to the whole header
  Times waiting;                          ///< from there to the turn
  Times forking;                          ///< making a process
  Times serving;                          ///< the process's life
  std::chrono::microseconds processor{};  ///< that processes took which have ended

  size_t runningNow = 0;
  size_t waitingNow = 0;
  size_t arrivingNow = 0;
};

}  // namespace QELO
