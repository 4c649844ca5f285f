#include "webapi/runner/Callbacks.h"

#include <unistd.h>

#include <cstdio>

#include "webapi/APIResponse.h"
#include "webapi/platform/Core.h"
#include "webapi/runner/execution/Fence.h"

namespace QELO {
namespace {

/// The answer goes first: callbacks may restart the server that carries it.
constexpr unsigned kDelaySeconds = 1;

}  // namespace

bool RunCallbacks(APIResponse& response) {
  if (response.GetCallbackFuncs() == nullptr || response.GetCallbackFuncs()->empty()) {
    return false;
  }
  const pid_t child = QLIBCProcFork();
  if (child != 0) {
    return child > 0;
  }
  setsid();
  for (unsigned left = kDelaySeconds; left > 0;) {
    left = sleep(left);  // shortened by signals
  }
  for (const auto& [function, argument] : *response.GetCallbackFuncs()) {
    Fence("callback", [call = function, value = argument] { call(value); });
  }
  // Not exit(): what the parent registered to do at its end is the parent's.
  fflush(nullptr);
  _exit(0);
}

}  // namespace QELO
