#pragma once

#include <ctime>

namespace QELO {

/// The clock of the day as a made-up host has it; other clocks are the real ones.
struct Clock {
  /// The time at which it stands; 0: it goes.
  static time_t& Stopped();
};

}  // namespace QELO
