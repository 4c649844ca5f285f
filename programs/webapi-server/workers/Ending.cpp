#include "programs/webapi-server/workers/Ending.h"

#include <sys/wait.h>

#include "programs/webapi-server/worker/Remains.h"

namespace QELO {

void CountEnding(Metrics::Staying& kind, Ending ending) {
  --kind.now;
  switch (ending) {
    case Ending::kIdle:
      ++kind.idle;
      break;
    case Ending::kCalls:
      ++kind.calls;
      break;
    case Ending::kMemory:
      ++kind.memory;
      break;
    case Ending::kRemains:
      ++kind.remains;
      break;
    case Ending::kCrash:
      ++kind.crash;
      break;
    case Ending::kTimeOut:
      ++kind.timeOut;
      break;
    case Ending::kTold:
    case Ending::kFailed:
      ++kind.other;
      break;
  }
}

Ending EndingOf(int status) {
  constexpr int kBase = static_cast<int>(Ending::kRemains);
  if (!WIFEXITED(status)) {
    return Ending::kCrash;
  }
  const int code = WEXITSTATUS(status);
  if (code == kBase + static_cast<int>(Remains::Left::kMemory)) {
    return Ending::kMemory;
  }
  if (Remains::TextOf(static_cast<Remains::Left>(code - kBase)) != nullptr) {
    return Ending::kRemains;
  }
  return code >= 0 && code <= static_cast<int>(Ending::kMemory) ? static_cast<Ending>(code)
                                                                : Ending::kCrash;
}

}  // namespace QELO
