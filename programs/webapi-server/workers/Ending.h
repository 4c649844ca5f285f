#pragma once

#include "programs/server/metrics/Metrics.h"

namespace QELO {

/// Why a process that stays ends, as its exit status tells.
enum class Ending : int {
  kTold = 0,    ///< nobody needs it
  kFailed = 1,  ///< it could not be set up
  kIdle = 2,
  kCalls = 3,
  kMemory = 4,
  kRemains = 64,   ///< and above: what a call has left is added
  kCrash = 256,    ///< beyond any exit status
  kTimeOut = 257,  ///< the same
};

/// Counts one that has ended.
void CountEnding(Metrics::Staying& kind, Ending ending);

/// @param status  as waitpid(2) gives it
Ending EndingOf(int status);

}  // namespace QELO
